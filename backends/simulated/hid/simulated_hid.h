// The HID service of the simulated phone.
#pragma once

#include "backends/simulated/hid/hid_sensor.h"
#include "backends/simulated/scenario/hid_config.h"
#include "platform/clock.h"
#include "platform/concurrency.h"
#include "platform/hid.h"

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// The scenario's devices, in its order. Every enumeration makes device objects of its own; what they are set to, and
// the count of the reports, is the device's and common to all.
//
// Thread: any; a device object as platform/hid.h says. Device objects may be closed, unscheduled and destroyed at any
// moment, by their receivers too.
class SimulatedHidService final : public HidService {
 public:
  SimulatedHidService(const std::vector<HidDeviceConfig>& devices, const std::shared_ptr<Clock>& clock,
                      Concurrency& concurrency);

  std::shared_ptr<HidManager> createManager() override;
  // The scenario's name of a device of such a service; empty for any other device.
  static std::string nameOf(const HidDevice& device);

 private:
  class Device;
  class Manager;
  using Sensors = std::vector<std::shared_ptr<HidSensor>>;

  const std::shared_ptr<const Sensors> sensors_;
};

}  // namespace quazor
