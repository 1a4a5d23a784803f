#include "backends/simulated/display/simulated_framebuffer.h"

#include <optional>
#include <string>
#include <utility>

namespace quazor {

class SimulatedFramebufferService::Registry final : public RegistryService {
 public:
  explicit Registry(std::shared_ptr<const DisplayConfig> display) : display_(std::move(display)) {}

  std::string description() const override { return "registry entry of the main display's framebuffer"; }

  std::optional<Value> registryProperty(std::string_view name) override {
    const Value* const value = display_->properties.find(name);
    return value == nullptr ? std::nullopt : std::optional(*value);
  }

 private:
  const std::shared_ptr<const DisplayConfig> display_;
};

class SimulatedFramebufferService::MainDisplay final : public Display {
 public:
  explicit MainDisplay(std::shared_ptr<const DisplayConfig> display) : display_(std::move(display)) {}

  std::string description() const override { return "main display"; }

  std::shared_ptr<RegistryService> registryService() override {
    return display_->registryService ? std::make_shared<Registry>(display_) : nullptr;
  }

 private:
  const std::shared_ptr<const DisplayConfig> display_;
};

SimulatedFramebufferService::SimulatedFramebufferService(const DisplayConfig& display)
    : display_(std::make_shared<const DisplayConfig>(display)) {}

std::shared_ptr<Display> SimulatedFramebufferService::mainDisplay() {
  return display_->present ? std::make_shared<MainDisplay>(display_) : nullptr;
}

}  // namespace quazor
