// interceptedPlatform: a platform on which faults act and whose calls an observer is told of.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "platform/platform.h"

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// What faults and observers call the objects of which a platform has several. An object without a name here is called
// by its description.
struct ObjectNames {
  std::vector<std::string> streams;                          // in the device's order
  std::vector<std::string> groups;                           // in the device's order
  std::function<std::string(const HidDevice&)> hidDevice{};  // any thread; may be empty
};

// The same services, each call of which passes `calls`; where `platform` has none, there is none. What they hand out is
// intercepted too, keeps alive what it comes from, and is the same object whenever the platform gives the same.
// Objects of one platform are not to be handed to another.
Platform interceptedPlatform(const Platform& platform, const std::shared_ptr<CallInterceptor>& calls,
                             ObjectNames names);

}  // namespace quazor
