#include "backends/capture/frame_trace.h"

namespace quazor {

TracedStream::~TracedStream() = default;

FrameTrace::~FrameTrace() = default;

}  // namespace quazor
