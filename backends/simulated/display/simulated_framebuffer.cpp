#include "backends/simulated/display/simulated_framebuffer.h"

#include "backends/simulated/scenario/sensor_operations.h"

#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

std::string nothing() { return {}; }

}  // namespace

class SimulatedFramebufferService::Registry final : public RegistryService {
 public:
  Registry(std::shared_ptr<const DisplayConfig> display, std::shared_ptr<CallInterceptor> calls)
      : display_(std::move(display)), calls_(std::move(calls)) {}

  std::string description() const override { return "registry entry of the main display's framebuffer"; }

  std::optional<Value> registryProperty(std::string_view name) override {
    return calls_->perform(
        {sensor_operation::kRegistryProperty, {}, name}, nullptr, [&] { return std::string(name); },
        [&]() -> std::optional<Value> {
          const Value* const value = display_->properties.find(name);
          return value == nullptr ? std::nullopt : std::optional(*value);
        });
  }

 private:
  const std::shared_ptr<const DisplayConfig> display_;
  const std::shared_ptr<CallInterceptor> calls_;
};

class SimulatedFramebufferService::MainDisplay final : public Display {
 public:
  MainDisplay(std::shared_ptr<const DisplayConfig> display, std::shared_ptr<CallInterceptor> calls)
      : display_(std::move(display)), calls_(std::move(calls)) {}

  std::string description() const override { return "main display"; }

  std::shared_ptr<RegistryService> registryService() override {
    return calls_->perform({sensor_operation::kRegistryService, {}, {}}, nullptr, nothing,
                           [&]() -> std::shared_ptr<RegistryService> {
                             if (!display_->registryService) return nullptr;
                             return std::make_shared<Registry>(display_, calls_);
                           });
  }

 private:
  const std::shared_ptr<const DisplayConfig> display_;
  const std::shared_ptr<CallInterceptor> calls_;
};

SimulatedFramebufferService::SimulatedFramebufferService(const DisplayConfig& display,
                                                         std::shared_ptr<CallInterceptor> calls)
    : display_(std::make_shared<const DisplayConfig>(display)), calls_(std::move(calls)) {}

std::shared_ptr<Display> SimulatedFramebufferService::mainDisplay() {
  return calls_->perform({sensor_operation::kMainDisplay, {}, {}}, nullptr, nothing, [&]() -> std::shared_ptr<Display> {
    if (!display_->present) return nullptr;
    return std::make_shared<MainDisplay>(display_, calls_);
  });
}

}  // namespace quazor
