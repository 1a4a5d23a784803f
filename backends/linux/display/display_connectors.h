// The display connectors of this machine, from DRM's sysfs.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The kernel's texts; empty if they cannot be read.
struct DisplayConnector {
  std::string card;     // for example "card0"
  std::string name;     // for example "Virtual-1"
  std::string status;   // connected, disconnected or unknown
  std::string enabled;  // enabled or disabled
  std::string dpms;     // On, Standby, Suspend or Off

  bool isConnected() const { return status == "connected"; }
  bool isPowered() const { return isConnected() && isLit(); }
  // True if the display is on, provided that one is connected.
  bool isLit() const { return enabled == "enabled" && dpms == "On"; }
};

// All connectors, sorted by card and name.
std::vector<DisplayConnector> displayConnectors(const std::filesystem::path& sysfs = "/sys");

}  // namespace quazor
