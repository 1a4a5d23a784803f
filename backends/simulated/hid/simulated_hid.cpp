#include "backends/simulated/hid/simulated_hid.h"

#include "backends/simulated/scenario/sensor_operations.h"
#include "contract/message_format.h"

#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

std::string nothing() { return {}; }

}  // namespace

class SimulatedHidService::Device final : public HidDevice {
 public:
  Device(std::shared_ptr<HidSensor> sensor, std::shared_ptr<CallInterceptor> calls)
      : sensor_(std::move(sensor)), calls_(std::move(calls)) {}
  ~Device() override {
    sensor_->close(inbox_);
    inbox_->retire();
  }

  std::string description() const override {
    return formatMessage("HID device %@ (usage page %@, usage %@)", sensor_->traits().name, sensor_->traits().usagePage,
                         sensor_->traits().usage);
  }

  bool open(DiagnosticErrorPtr* error) override {
    return calls_->perform(site(sensor_operation::kOpen), error, nothing, [&] { return sensor_->open(inbox_, error); });
  }

  void setInputReportCallback(InputReportCallback callback) override {
    const char* const detail = callback ? "receiver" : "(null)";
    calls_->perform(
        site(sensor_operation::kSetCallback), nullptr, [&] { return std::string(detail); },
        [&] {
          inbox_->setReceiver(std::move(callback));
          return true;
        });
  }

  bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                              DiagnosticErrorPtr* error) override {
    const std::string_view name = hidReportName(reportID);
    return calls_->perform(
        {sensor_operation::kSetFeature, sensor_->traits().name, name}, error,
        [&] { return std::string(name) + " = " + defaultText(Bytes(payload.begin(), payload.end())); },
        [&] { return sensor_->setFeature(inbox_, reportID, payload, error); });
  }

  void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) override {
    calls_->perform(
        site(sensor_operation::kSchedule), nullptr, [&] { return std::string(mode); },
        [&] {
          inbox_->schedule(runLoop, mode);
          return true;
        });
  }

  void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) override {
    calls_->perform(
        site(sensor_operation::kUnschedule), nullptr, [&] { return std::string(mode); },
        [&] {
          inbox_->unschedule(runLoop, mode);
          return true;
        });
  }

  void close(std::uint32_t options) override {
    calls_->perform(
        site(sensor_operation::kClose), nullptr, [&] { return std::to_string(options); },
        [&] {
          sensor_->close(inbox_);
          return true;
        });
  }

 private:
  CallSite site(std::string_view operation) const { return {operation, sensor_->traits().name, {}}; }

  const std::shared_ptr<HidSensor> sensor_;
  const std::shared_ptr<CallInterceptor> calls_;
  const std::shared_ptr<HidInbox> inbox_ = std::make_shared<HidInbox>();
};

class SimulatedHidService::Manager final : public HidManager {
 public:
  Manager(std::shared_ptr<const Sensors> sensors, std::shared_ptr<CallInterceptor> calls)
      : sensors_(std::move(sensors)), calls_(std::move(calls)) {}

  std::string description() const override { return "HID manager"; }

  void enumerateDevicesMatching(const std::vector<Dictionary>& matching) override {
    calls_->perform(
        {sensor_operation::kEnumerate, {}, {}}, nullptr,
        [&] { return defaultText(Array(matching.begin(), matching.end())); },
        [&] {
          find(matching);
          return true;
        });
  }

  std::vector<std::shared_ptr<HidDevice>> devices() override {
    using Devices = std::optional<std::vector<std::shared_ptr<HidDevice>>>;
    return calls_
        ->perform(
            {sensor_operation::kDevices, {}, {}}, nullptr, [this] { return std::to_string(found_.size()); },
            [this] { return Devices(found_); })
        .value_or(std::vector<std::shared_ptr<HidDevice>>{});
  }

 private:
  void find(const std::vector<Dictionary>& matching) {
    found_.clear();
    for (const std::shared_ptr<HidSensor>& sensor : *sensors_) {
      if (sensor->matches(matching)) found_.push_back(std::make_shared<Device>(sensor, calls_));
    }
  }

  const std::shared_ptr<const Sensors> sensors_;
  const std::shared_ptr<CallInterceptor> calls_;
  std::vector<std::shared_ptr<HidDevice>> found_;
};

SimulatedHidService::SimulatedHidService(const std::vector<HidDeviceConfig>& devices,
                                         const std::shared_ptr<Clock>& clock, Concurrency& concurrency,
                                         std::shared_ptr<CallInterceptor> calls)
    : sensors_([&] {
        auto sensors = std::make_shared<Sensors>();
        for (const HidDeviceConfig& device : devices) {
          sensors->push_back(std::make_shared<HidSensor>(device, clock, concurrency));
        }
        return sensors;
      }()),
      calls_(std::move(calls)) {}

std::shared_ptr<HidManager> SimulatedHidService::createManager() {
  return calls_->perform({sensor_operation::kCreateManager, {}, {}}, nullptr, nothing,
                         [&]() -> std::shared_ptr<HidManager> { return std::make_shared<Manager>(sensors_, calls_); });
}

}  // namespace quazor
