// The hidraw devices of this machine, as the kernel lists them.
#pragma once

#include "backends/linux/hid/hid_report_descriptor.h"
#include "contract/value.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// The directories of the kernel's devices; tests use their own.
struct HidrawRoots {
  std::filesystem::path sysfs = "/sys";
  std::filesystem::path devices = "/dev";
};

// A hidraw device, found without opening it.
struct HidrawNode {
  std::filesystem::path path;    // for example "/dev/hidraw0"; the number changes when the device is reconnected
  std::string name;              // the name that the device reports; empty if unknown
  std::filesystem::path device;  // its directory in sysfs, which changes when the device is reconnected
  Bytes rawDescriptor;
  HidReportDescriptor descriptor;  // empty if there is a problem
  std::string problem;             // why the report descriptor is invalid; empty if it is valid
  std::string noAccess;            // why this user cannot open it; empty if possible
  bool isForbidden = false;        // it could be opened with other permissions
};

// True if the kernel supports hidraw.
bool hasHidraw(const HidrawRoots& roots = {});
// All of them, sorted by number. Skips devices that are removed in the meantime.
std::vector<HidrawNode> hidrawNodes(const HidrawRoots& roots = {});
// The directory in sysfs of the device that currently has that path; empty if there is none.
std::filesystem::path hidrawDevice(const HidrawRoots& roots, const std::filesystem::path& path);

}  // namespace quazor
