// The capture service of an intercepted platform.
#pragma once

#include "backends/faults/intercepted_platform.h"

#include <memory>

namespace quazor {

// Wraps the service as interceptedPlatform() describes. Neither pointer may be null.
std::shared_ptr<CaptureService> interceptedCapture(std::shared_ptr<CaptureService> capture,
                                                   std::shared_ptr<CallInterceptor> calls,
                                                   std::shared_ptr<const ObjectNames> names);

}  // namespace quazor
