// The connectors of this machine's displays, as DRM's sysfs shows them.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The words of the kernel; empty what cannot be read.
struct DisplayConnector {
  std::string card;     // as "card0"
  std::string name;     // as "Virtual-1"
  std::string status;   // connected, disconnected or unknown
  std::string enabled;  // enabled or disabled
  std::string dpms;     // On, Standby, Suspend or Off

  bool isConnected() const { return status == "connected"; }
  bool isPowered() const { return isConnected() && enabled == "enabled" && dpms == "On"; }
};

// All of them, by card and name.
std::vector<DisplayConnector> displayConnectors(const std::filesystem::path& sysfs = "/sys");

}  // namespace quazor
