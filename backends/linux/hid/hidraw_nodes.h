// The hidraw devices of this machine, as the kernel lists them.
#pragma once

#include "backends/linux/hid/hid_report_descriptor.h"
#include "contract/value.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// Where the kernel shows its devices; others than these in tests.
struct HidrawRoots {
  std::filesystem::path sysfs = "/sys";
  std::filesystem::path devices = "/dev";
};

// One hidraw device, without it being opened.
struct HidrawNode {
  std::filesystem::path path;    // as "/dev/hidraw0"; the number changes from one connection of the device to the next
  std::string name;              // what the device calls itself; empty when the kernel does not say
  std::filesystem::path device;  // its directory in sysfs, which changes when the device is reconnected
  Bytes rawDescriptor;
  HidReportDescriptor descriptor;  // empty when there is a problem
  std::string problem;             // why its report descriptor says nothing; empty when it does
  std::string noAccess;            // why this user cannot open it; empty when he can
};

// Whether the kernel has the hidraw facility at all.
bool hasHidraw(const HidrawRoots& roots = {});
// All of them, in the order of their numbers. What goes away meanwhile is left out.
std::vector<HidrawNode> hidrawNodes(const HidrawRoots& roots = {});
// The directory in sysfs of the device that now has that path; empty when there is none.
std::filesystem::path hidrawDevice(const HidrawRoots& roots, const std::filesystem::path& path);

}  // namespace quazor
