// What this machine has that a binding can name.
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

// Where to look.
struct ProbeSources {
  std::shared_ptr<V4l2Api> kernel;
  DeviceRoots devices;
  HidrawRoots hid;
  std::shared_ptr<CounterSystem> counters;
  std::filesystem::path sysfs;  // of the displays
};
ProbeSources sourcesOfRunningSystem();

struct MachineProbe {
  // For people, line by line: cameras, HID devices, displays and counters; why each fits or not; what to do about it.
  // May hold any character that a device gives.
  std::vector<std::string> lines;
  // A binding of all that fits, as the text of a file that readBinding() takes.
  std::string binding;
};

// Opens each video node for a moment, which disturbs no stream, and no other device. Never fails: what cannot be looked
// at is told.
MachineProbe probeMachine(const ProbeSources& sources);

}  // namespace quazor
