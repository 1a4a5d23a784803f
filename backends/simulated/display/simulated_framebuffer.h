// The framebuffer service of the simulated phone.
#pragma once

#include "backends/simulated/scenario/display_config.h"
#include "platform/framebuffer_service.h"

#include <memory>

namespace quazor {

// The scenario's main display. Its state never changes.
// Thread: any.
class SimulatedFramebufferService final : public FramebufferService {
 public:
  explicit SimulatedFramebufferService(const DisplayConfig& display);

  std::shared_ptr<Display> mainDisplay() override;

 private:
  class MainDisplay;
  class Registry;

  const std::shared_ptr<const DisplayConfig> display_;
};

}  // namespace quazor
