#include "backends/simulated/display/simulated_framebuffer.h"

#include "backends/faults/operations.h"
#include "backends/simulated/hid/sensor_user_for_tests.h"
#include "backends/simulated/simulated_phone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

class SimulatedFramebufferTest : public ::testing::Test {
 protected:
  void make(const DisplayConfig& display) {
    Scenario scenario = sensorScenario({});
    scenario.display = display;
    phone_.emplace(scenario, PhoneTime::kVirtual, 1);
  }
  std::shared_ptr<Display> display() { return phone_->platform().framebuffer->mainDisplay(); }

  std::optional<SimulatedPhone> phone_;
};

TEST_F(SimulatedFramebufferTest, PropertiesAreReadThroughTheDisplay) {
  DisplayConfig traits;
  traits.properties = {{"Power", Dictionary{{"Panel", 1}}}, {"Name", "main"}};
  make(traits);
  const std::shared_ptr<RegistryService> service = display()->registryService();
  EXPECT_EQ(display()->description(), "main display");
  EXPECT_EQ(service->description(), "registry entry of the main display's framebuffer");
  EXPECT_EQ(service->registryProperty("Power"), Value(Dictionary{{"Panel", 1}}));
  EXPECT_EQ(service->registryProperty("Name"), Value("main"));
  EXPECT_EQ(service->registryProperty("Panel"), std::nullopt);
}

TEST_F(SimulatedFramebufferTest, WhatIsMissingIsNull) {
  DisplayConfig traits;
  traits.registryService = false;
  make(traits);
  EXPECT_EQ(display()->registryService(), nullptr);
  traits.present = false;
  make(traits);
  EXPECT_EQ(display(), nullptr);
}

TEST_F(SimulatedFramebufferTest, WhatWasAnsweredOutlivesThePhone) {
  DisplayConfig traits;
  traits.properties = {{"Name", "main"}};
  make(traits);
  const std::shared_ptr<RegistryService> service = display()->registryService();
  phone_.reset();
  EXPECT_EQ(service->registryProperty("Name"), Value("main"));
}

TEST_F(SimulatedFramebufferTest, FaultsAndObserversReachEveryOperation) {
  DisplayConfig traits;
  traits.properties = {{"Name", "main"}, {"Power", 1}};
  make(traits);
  std::vector<std::string> calls;
  phone_->observeCalls([&](const PlatformCall& call) {
    calls.push_back(call.operation + "|" + call.detail + "|" + (call.succeeded ? "+" : "-"));
  });
  const auto answerNothing = [&](std::string_view operation, std::optional<std::string> property) {
    Fault fault;
    fault.operation = operation;
    fault.property = std::move(property);
    fault.action = FaultAction::kNothing;
    phone_->addFault(fault);
  };
  const std::shared_ptr<Display> shown = display();
  const std::shared_ptr<RegistryService> service = shown->registryService();
  answerNothing(sensor_operation::kRegistryProperty, "Name");
  EXPECT_EQ(service->registryProperty("Name"), std::nullopt);
  EXPECT_EQ(service->registryProperty("Power"), Value(1));
  answerNothing(sensor_operation::kRegistryService, std::nullopt);
  EXPECT_EQ(shown->registryService(), nullptr);
  answerNothing(sensor_operation::kMainDisplay, std::nullopt);
  EXPECT_EQ(display(), nullptr);
  for (const FaultStatus& status : phone_->faultStatus()) EXPECT_EQ(status.fired, 1U) << status.fault.operation;
  EXPECT_THAT(
      calls, testing::ElementsAre("FramebufferService.mainDisplay||+", "Display.registryService||+",
                                  "RegistryService.registryProperty|Name|-", "RegistryService.registryProperty|Power|+",
                                  "Display.registryService||-", "FramebufferService.mainDisplay||-"));
}

}  // namespace
}  // namespace quazor
