// interceptedPlatform: a platform with faults, whose calls can be observed.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "platform/platform.h"

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// The names that faults and observers use for objects of which a platform has several. An object without a name here is
// identified by its description.
struct ObjectNames {
  std::vector<std::string> streams;                          // in the device's order
  std::vector<std::string> groups;                           // in the device's order
  std::function<std::string(const HidDevice&)> hidDevice{};  // any thread; may be empty
};

// Wraps the services so that each call passes through `calls`; a service that `platform` lacks stays null. Returned
// objects are also wrapped. A wrapper keeps its object alive, and equal objects have the same wrapper. Objects of one
// platform must not be passed to another.
Platform interceptedPlatform(const Platform& platform, const std::shared_ptr<CallInterceptor>& calls,
                             ObjectNames names);

}  // namespace quazor
