// The framebuffer driver of the phone's displays, as far as diagnostics ask it: what the driver publishes about itself.
//
// Thread: every call is synchronous on the caller's thread.
// Ownership: objects are shared; what a call returns stays valid for as long as the caller holds it.
// Errors: null or nothing; nothing is thrown.
#pragma once

#include "contract/contract.h"
#include "contract/value.h"

#include <memory>
#include <optional>
#include <string_view>

namespace QUAZOR_CONTRACT {

// A driver's entry in the system's registry of devices.
// Thread: one at a time.
class QUAZOR_EXPORT RegistryService : public Object {
 public:
  ~RegistryService() override;

  // A copy of the property as it is now, or nothing when there is none of that name.
  virtual std::optional<Value> registryProperty(std::string_view name) = 0;
};

// Thread: one at a time.
class QUAZOR_EXPORT Display : public Object {
 public:
  ~Display() override;

  // The registry entry of the display's framebuffer driver, or null.
  virtual std::shared_ptr<RegistryService> registryService() = 0;
};

// Thread: any.
class QUAZOR_EXPORT FramebufferService {
 public:
  FramebufferService() = default;
  FramebufferService(const FramebufferService&) = delete;
  FramebufferService& operator=(const FramebufferService&) = delete;
  virtual ~FramebufferService();

  // The main display, or null.
  virtual std::shared_ptr<Display> mainDisplay() = 0;
};

}  // namespace QUAZOR_CONTRACT
