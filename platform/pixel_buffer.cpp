#include "platform/pixel_buffer.h"

namespace QUAZOR_CONTRACT {

PixelBuffer::~PixelBuffer() = default;

PixelBufferHandler::~PixelBufferHandler() = default;
std::string PixelBufferHandler::description() const { return "<PixelBufferHandler>"; }

EventHandler::~EventHandler() = default;
std::string EventHandler::description() const { return "<EventHandler>"; }

}  // namespace QUAZOR_CONTRACT
