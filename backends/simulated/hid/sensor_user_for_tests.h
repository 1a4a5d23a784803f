// A phone with a HID sensor and a user who records its inputs, for the tests of this folder.
#pragma once

#include "backends/faults/hid_report_name.h"
#include "backends/simulated/errors/hid_error.h"
#include "backends/simulated/scenario/hid_config.h"
#include "backends/simulated/scenario/scenario.h"
#include "contract/message_format.h"
#include "platform/platform.h"

#include <array>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

inline constexpr std::uint16_t kTestUsagePage = 0xFF00;
inline constexpr std::uint16_t kTestUsage = 0x24;

// "sensor", which sends 100 reports per second while feature report 0xAB has the value 1 and 0xAC the value 2. 0xAB
// accepts 0 and 1; 0xAC accepts anything, and so does 0xAD, which has no effect.
inline HidDeviceConfig testSensor() {
  HidDeviceConfig sensor;
  sensor.name = "sensor";
  sensor.usagePage = kTestUsagePage;
  sensor.usage = kTestUsage;
  sensor.featureReports = {{0xAB, {0, 1}, 1}, {0xAC, {}, 2}, {0xAD, {}, std::nullopt}};
  sensor.rate = 100;
  return sensor;
}

// A phone with only these sensors.
inline Scenario sensorScenario(std::vector<HidDeviceConfig> sensors) {
  Scenario scenario;
  scenario.title = "A phone with sensors";
  scenario.hidDevices = std::move(sensors);
  return scenario;
}

inline Dictionary matchingUsage(Value page, Value usage) {
  return {{std::string(kHidPrimaryUsagePage), std::move(page)}, {std::string(kHidPrimaryUsage), std::move(usage)}};
}

// An error of the devices as formatted by defaultText().
inline std::string refusal(HidErrorCode code, std::string_view message) {
  return formatMessage("%@ code %@: %@", SimulatedHidErrorDomain, static_cast<std::int64_t>(code), message);
}

// A user of a device. The recorded inputs can be read on any thread.
class SensorUser {
 public:
  explicit SensorUser(Platform platform, std::size_t index = 0)
      : platform_(std::move(platform)), loop_(*platform_.runLoops->currentRunLoop()) {
    const std::shared_ptr<HidManager> manager = platform_.hid->createManager();
    manager->enumerateDevicesMatching({Dictionary{}});
    device = manager->devices().at(index);
    device->setInputReportCallback([this](std::uint8_t id, std::span<const std::uint8_t> data,
                                          const DiagnosticErrorPtr& error) { write(id, data, error); });
  }
  ~SensorUser() {
    if (device == nullptr) return;
    device->setInputReportCallback(nullptr);
    unschedule();
    device->close(0);
  }

  bool set(std::uint8_t id, std::uint8_t value) {
    const std::array payload{id, value};
    return device->setFeatureReportWithID(id, payload, nullptr);
  }
  void schedule() { device->scheduleWithRunLoop(loop_, kRunLoopDefaultMode); }
  void unschedule() { device->unscheduleFromRunLoop(loop_, kRunLoopDefaultMode); }
  // Performs all steps that are required to receive images.
  bool start() {
    const bool started = device->open(nullptr) && set(0xAB, 1) && set(0xAC, 2);
    schedule();
    return started;
  }
  RunLoopResult run(std::chrono::nanoseconds limit) { return loop_.runInMode(kRunLoopDefaultMode, limit, false); }
  RunLoop& loop() { return loop_; }

  // "0x76 frame 1, 792 bytes"; "0x76, 3 bytes" if the report is too short for a frame ID; or an error's text.
  std::vector<std::string> seen() const {
    const std::lock_guard lock(mutex_);
    return seen_;
  }
  // The arrival time of each input, on the phone's clock.
  std::vector<std::chrono::nanoseconds> times() const {
    const std::lock_guard lock(mutex_);
    return times_;
  }

  std::shared_ptr<HidDevice> device;
  std::function<void()> onInput;  // an additional action of the receiver

 private:
  void write(std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
    {
      const std::lock_guard lock(mutex_);
      seen_.push_back(error != nullptr ? defaultText(error) : described(id, data));
      times_.push_back(platform_.clock->now());
    }
    if (onInput) onInput();
  }
  static std::string described(std::uint8_t id, std::span<const std::uint8_t> data) {
    std::string text(hidReportName(id));
    if (data.size() >= 8) {
      std::uint32_t frame = 0;
      for (std::size_t i = 8; i-- > 4;) frame = frame << 8U | data[i];
      text += " frame " + std::to_string(frame);
    }
    const bool hasItsID = !data.empty() && data[0] == id;
    return text + ", " + std::to_string(data.size()) + " bytes" + (hasItsID ? "" : ", of another ID");
  }

  const Platform platform_;
  RunLoop& loop_;
  mutable std::mutex mutex_;  // guards the members below
  std::vector<std::string> seen_;
  std::vector<std::chrono::nanoseconds> times_;
};

}  // namespace quazor
