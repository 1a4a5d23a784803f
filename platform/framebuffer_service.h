// The properties that the framebuffer driver of the phone's displays publishes.
//
// Thread: every call is synchronous on the caller's thread.
// Ownership: objects are shared; a returned object stays valid for as long as the caller holds it.
// Errors: a call that fails returns null or nothing and does not throw.
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

  // Returns a copy of the property's current value, or nothing if it does not exist.
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
