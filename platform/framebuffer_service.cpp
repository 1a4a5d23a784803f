#include "platform/framebuffer_service.h"

namespace QUAZOR_CONTRACT {

RegistryService::~RegistryService() = default;
Display::~Display() = default;
FramebufferService::~FramebufferService() = default;

}  // namespace QUAZOR_CONTRACT
