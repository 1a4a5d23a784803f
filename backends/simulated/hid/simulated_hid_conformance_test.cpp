#include "backends/hid/hid_conformance.h"
#include "backends/simulated/hid/sensor_user_for_tests.h"
#include "backends/simulated/simulated_phone.h"

#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Sensors that send 100 reports per second while they are open, in virtual time.
class SimulatedHidUnderTest {
 public:
  SimulatedHidUnderTest() { connect({}, {}); }

  void connect(const std::vector<ConformanceDevice>& devices, const std::map<int, ConformanceEvent>& events) {
    std::vector<HidDeviceConfig> sensors;
    for (const ConformanceDevice& device : devices) {
      HidDeviceConfig sensor;
      sensor.name = "sensor " + std::to_string(sensors.size());
      sensor.usagePage = device.page;
      sensor.usage = device.usage;
      sensor.featureReports = {{0xAB, {}, std::nullopt}};
      sensor.rate = 100;
      for (const auto& [number, event] : events) {
        const auto index = static_cast<std::uint64_t>(number - 1);
        if (event == ConformanceEvent::kError) {
          sensor.single[index].error = FaultError{"Sensor", 1, "The report was damaged."};
        } else {
          sensor.removedAfter = index;
        }
      }
      sensors.push_back(sensor);
    }
    phone_.emplace(sensorScenario(std::move(sensors)), PhoneTime::kVirtual, 1);
  }
  std::shared_ptr<HidManager> manager() { return phone_->platform().hid->createManager(); }
  // Waits slightly longer than the reports need.
  void arrive(int count) {
    phone_->platform().clock->sleep(count * std::chrono::milliseconds(10) + std::chrono::microseconds(1));
  }
  RunLoops& runLoops() { return *phone_->platform().runLoops; }
  Concurrency& concurrency() { return *phone_->platform().concurrency; }

 private:
  std::optional<SimulatedPhone> phone_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Simulated, HidConformance, SimulatedHidUnderTest);

}  // namespace
}  // namespace quazor
