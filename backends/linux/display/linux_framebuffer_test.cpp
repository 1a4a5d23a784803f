#include "backends/linux/display/linux_framebuffer.h"

#include "backends/linux/display/display_connectors.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>

namespace quazor {
namespace {

namespace fs = std::filesystem;

class LinuxFramebufferTest : public ::testing::Test {
 protected:
  LinuxFramebufferTest()
      : sysfs_(fs::path(::testing::TempDir()) /
               ("quazor-drm-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()))) {}
  ~LinuxFramebufferTest() override { fs::remove_all(sysfs_); }

  void connector(const std::string& name, const std::string& status, const std::string& enabled = "enabled",
                 const std::string& dpms = "On") const {
    const fs::path directory = sysfs_ / "class/drm" / name;
    fs::create_directories(directory);
    std::ofstream(directory / "status") << status << '\n';
    std::ofstream(directory / "enabled") << enabled << '\n';
    std::ofstream(directory / "dpms") << dpms << '\n';
  }
  std::shared_ptr<Display> displayOf(const std::string& connectorName) const {
    Binding binding;
    if (!connectorName.empty()) binding.display = DisplayBinding{connectorName};
    return makeLinuxFramebuffer(binding, sysfs_)->mainDisplay();
  }
  static std::optional<Value> stateOf(const std::shared_ptr<Display>& display) {
    return display->registryService()->registryProperty("DSPLY Debug Info");
  }

  const fs::path sysfs_;
};

Value powered(bool on) { return Value(Dictionary{{"DSPLY power info", Dictionary{{"DSPLY power info panel", on}}}}); }

TEST_F(LinuxFramebufferTest, IsPoweredOnlyWhenConnectedAndEnabledAndOn) {
  const struct {
    const char* status;
    const char* enabled;
    const char* dpms;
    bool isPowered;
  } kRows[] = {
      {"connected", "enabled", "On", true},       {"disconnected", "enabled", "On", false},
      {"unknown", "disabled", "On", false},       {"connected", "disabled", "On", false},
      {"connected", "enabled", "Off", false},     {"connected", "enabled", "Standby", false},
      {"connected", "enabled", "Suspend", false}, {"disconnected", "disabled", "On", false},
  };
  for (const auto& row : kRows) {
    connector("card0-Virtual-1", row.status, row.enabled, row.dpms);
    const std::shared_ptr<Display> display = displayOf("Virtual-1");
    ASSERT_NE(display, nullptr);
    EXPECT_EQ(stateOf(display), powered(row.isPowered)) << row.status << row.enabled << row.dpms;
  }
}

TEST_F(LinuxFramebufferTest, AConnectorOfUnknownStatusCountsAsConnectedIfTheBindingNamesIt) {
  connector("card0-LVDS-1", "unknown");
  EXPECT_EQ(displayOf(""), nullptr);
  EXPECT_EQ(stateOf(displayOf("LVDS-1")), powered(true));
  connector("card0-LVDS-1", "unknown", "enabled", "Off");
  EXPECT_EQ(stateOf(displayOf("LVDS-1")), powered(false));
}

TEST_F(LinuxFramebufferTest, ReadsTheStateAnewEachTime) {
  connector("card0-DSI-1", "connected");
  const std::shared_ptr<Display> display = displayOf("DSI-1");
  EXPECT_EQ(stateOf(display), powered(true));
  connector("card0-DSI-1", "connected", "enabled", "Off");
  EXPECT_EQ(stateOf(display), powered(false));
  fs::remove_all(sysfs_);
  EXPECT_EQ(stateOf(display), std::nullopt);
}

TEST_F(LinuxFramebufferTest, HasNoOtherProperty) {
  connector("card0-DSI-1", "connected");
  EXPECT_EQ(displayOf("DSI-1")->registryService()->registryProperty("DSPLY"), std::nullopt);
}

TEST_F(LinuxFramebufferTest, TheMainDisplayIsTheFirstThatIsConnected) {
  fs::create_directories(sysfs_ / "class/drm/card0");
  fs::create_directories(sysfs_ / "class/drm/renderD128");
  connector("card1-eDP-1", "connected");
  connector("card0-HDMI-A-2", "connected");
  connector("card0-HDMI-A-1", "disconnected");
  const std::shared_ptr<Display> display = displayOf("");
  ASSERT_NE(display, nullptr);
  EXPECT_EQ(display->description(), "display at DRM connector HDMI-A-2");
  EXPECT_EQ(displayOf("eDP-1")->description(), "display at DRM connector eDP-1");
  EXPECT_NE(displayOf("HDMI-A-1"), nullptr);
}

TEST_F(LinuxFramebufferTest, ThereIsNoMainDisplayWithoutOne) {
  EXPECT_EQ(displayOf(""), nullptr);
  EXPECT_EQ(displayOf("DSI-1"), nullptr);
  connector("card0-HDMI-A-1", "disconnected");
  EXPECT_EQ(displayOf(""), nullptr);
  EXPECT_EQ(displayOf("DSI-1"), nullptr);
}

TEST_F(LinuxFramebufferTest, ConnectorsAreThereWithWhatTheKernelSays) {
  connector("card10-DP-1", "connected", "disabled", "Off");
  connector("card0-Virtual-1", "unknown");
  const std::vector<DisplayConnector> connectors = displayConnectors(sysfs_);
  ASSERT_EQ(connectors.size(), 2U);
  EXPECT_EQ(connectors[0].name, "Virtual-1");
  EXPECT_EQ(connectors[0].status, "unknown");
  EXPECT_EQ(connectors[1].card, "card10");
  EXPECT_EQ(connectors[1].name, "DP-1");
  EXPECT_EQ(connectors[1].enabled, "disabled");
  EXPECT_EQ(connectors[1].dpms, "Off");
}

TEST(LinuxFramebuffer, OfTheRunningSystemCanBeAsked) {
  Binding binding;
  binding.display = DisplayBinding{"a connector that no system has"};
  EXPECT_EQ(makeLinuxFramebuffer(binding)->mainDisplay(), nullptr);
}

}  // namespace
}  // namespace quazor
