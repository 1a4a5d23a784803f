// The HID service of an intercepted platform.
#pragma once

#include "backends/faults/intercepted_platform.h"

#include <memory>

namespace quazor {

// Wraps the service as interceptedPlatform() describes. No pointer may be null.
std::shared_ptr<HidService> interceptedHid(std::shared_ptr<HidService> hid, std::shared_ptr<CallInterceptor> calls,
                                           std::shared_ptr<const ObjectNames> names);

}  // namespace quazor
