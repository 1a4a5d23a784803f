#include "backends/linux/display/linux_framebuffer.h"

#include "backends/linux/display/display_connectors.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr std::string_view kDebugInfo = "DSPLY Debug Info";
constexpr const char* kPowerInfo = "DSPLY power info";
constexpr const char* kPanel = "DSPLY power info panel";

// The current state of the connector; nothing if it does not exist.
std::optional<DisplayConnector> connectorNamed(const std::string& name, const std::filesystem::path& sysfs) {
  for (DisplayConnector& connector : displayConnectors(sysfs)) {
    if (connector.name == name && !connector.status.empty()) return std::move(connector);
  }
  return std::nullopt;
}

class Registry final : public RegistryService {
 public:
  Registry(std::string connector, bool isNamed, std::filesystem::path sysfs)
      : connector_(std::move(connector)), isNamed_(isNamed), sysfs_(std::move(sysfs)) {}

  std::string description() const override { return "DRM connector " + connector_; }

  std::optional<Value> registryProperty(std::string_view name) override {
    if (name != kDebugInfo) return std::nullopt;
    const std::optional<DisplayConnector> connector = connectorNamed(connector_, sysfs_);
    if (!connector) return std::nullopt;
    // A driver that cannot detect a display reports "unknown". The binding then knows better.
    const bool isConnected = connector->isConnected() || (isNamed_ && connector->status == "unknown");
    return Value(Dictionary{{kPowerInfo, Dictionary{{kPanel, isConnected && connector->isLit()}}}});
  }

 private:
  const std::string connector_;
  const bool isNamed_;  // in the binding
  const std::filesystem::path sysfs_;
};

class ConnectedDisplay final : public Display {
 public:
  explicit ConnectedDisplay(std::shared_ptr<Registry> registry) : registry_(std::move(registry)) {}

  std::string description() const override { return "display at " + registry_->description(); }
  std::shared_ptr<RegistryService> registryService() override { return registry_; }

 private:
  const std::shared_ptr<Registry> registry_;
};

class LinuxFramebuffer final : public FramebufferService {
 public:
  LinuxFramebuffer(std::optional<DisplayBinding> display, std::filesystem::path sysfs)
      : display_(std::move(display)), sysfs_(std::move(sysfs)) {}

  std::shared_ptr<Display> mainDisplay() override {
    const std::optional<std::string> connector = mainConnector();
    if (!connector) return nullptr;
    return std::make_shared<ConnectedDisplay>(std::make_shared<Registry>(*connector, display_.has_value(), sysfs_));
  }

 private:
  std::optional<std::string> mainConnector() const {
    if (display_) {
      const std::optional<DisplayConnector> named = connectorNamed(display_->connector, sysfs_);
      return named ? std::optional(named->name) : std::nullopt;
    }
    const std::vector<DisplayConnector> all = displayConnectors(sysfs_);
    const auto first = std::ranges::find_if(all, &DisplayConnector::isConnected);
    return first == all.end() ? std::nullopt : std::optional(first->name);
  }

  const std::optional<DisplayBinding> display_;
  const std::filesystem::path sysfs_;
};

}  // namespace

std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding) {
  return makeLinuxFramebuffer(binding, "/sys");
}

std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding, const std::filesystem::path& sysfs) {
  return std::make_shared<LinuxFramebuffer>(binding.display, sysfs);
}

}  // namespace quazor
