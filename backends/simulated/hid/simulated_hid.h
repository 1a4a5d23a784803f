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

// The scenario's devices, in order. Every enumeration creates new device objects; settings and the report count belong
// to the device and are shared by its objects.
//
// Thread: any; device objects have the rules of platform/hid.h. Device objects may be closed, unscheduled and destroyed
// at any time, even by their receivers.
class SimulatedHidService final : public HidService {
 public:
  SimulatedHidService(const std::vector<HidDeviceConfig>& devices, const std::shared_ptr<Clock>& clock,
                      Concurrency& concurrency);

  std::shared_ptr<HidManager> createManager() override;
  // The scenario's name for a device of such a service; empty for any other device.
  static std::string nameOf(const HidDevice& device);

 private:
  class Device;
  class Manager;
  using Sensors = std::vector<std::shared_ptr<HidSensor>>;

  const std::shared_ptr<const Sensors> sensors_;
};

}  // namespace quazor
