// Finds the devices of this machine that a binding can name.
#pragma once

#include "backends/linux/counters/counter_system.h"
#include "backends/linux/hid/hidraw_nodes.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Where to search.
struct ProbeSources {
  std::shared_ptr<V4l2Api> kernel;
  DeviceRoots devices;
  HidrawRoots hid;
  std::shared_ptr<CounterSystem> counters;
  std::filesystem::path sysfs;  // for the displays
};
ProbeSources sourcesOfRunningSystem();

struct MachineProbe {
  // User-readable lines about cameras, HID devices, displays and counters: whether each fits, why, and what to do. They
  // may contain any character that a device reports.
  std::vector<std::string> lines;
  // A binding for everything that fits, as text that readBinding() accepts.
  std::string binding;
};

// Opens each video node briefly, which does not disturb streams, and no other device. Never fails: the lines include
// what cannot be examined.
MachineProbe probeMachine(const ProbeSources& sources);

}  // namespace quazor
