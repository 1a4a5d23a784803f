#include "backends/simulated/hid/simulated_hid.h"

#include "contract/message_format.h"

#include <string>
#include <utility>

namespace quazor {

class SimulatedHidService::Device final : public HidDevice {
 public:
  explicit Device(std::shared_ptr<HidSensor> sensor) : sensor_(std::move(sensor)) {}
  ~Device() override {
    sensor_->close(inbox_);
    inbox_->retire();
  }

  const std::string& name() const { return sensor_->config().name; }

  std::string description() const override {
    return formatMessage("HID device %@ (usage page %@, usage %@)", sensor_->config().name, sensor_->config().usagePage,
                         sensor_->config().usage);
  }

  bool open(DiagnosticErrorPtr* error) override { return sensor_->open(inbox_, error); }
  void setInputReportCallback(InputReportCallback callback) override { inbox_->setReceiver(std::move(callback)); }
  bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                              DiagnosticErrorPtr* error) override {
    return sensor_->setFeature(inbox_, reportID, payload, error);
  }
  void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) override { inbox_->schedule(runLoop, mode); }
  void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) override { inbox_->unschedule(runLoop, mode); }
  void close(std::uint32_t /*options*/) override { sensor_->close(inbox_); }

 private:
  const std::shared_ptr<HidSensor> sensor_;
  const std::shared_ptr<HidInbox> inbox_ = std::make_shared<HidInbox>();
};

class SimulatedHidService::Manager final : public HidManager {
 public:
  explicit Manager(std::shared_ptr<const Sensors> sensors) : sensors_(std::move(sensors)) {}

  std::string description() const override { return "HID manager"; }

  void enumerateDevicesMatching(const std::vector<Dictionary>& matching) override {
    found_.clear();
    for (const std::shared_ptr<HidSensor>& sensor : *sensors_) {
      if (sensor->matches(matching)) found_.push_back(std::make_shared<Device>(sensor));
    }
  }
  std::vector<std::shared_ptr<HidDevice>> devices() override { return found_; }

 private:
  const std::shared_ptr<const Sensors> sensors_;
  std::vector<std::shared_ptr<HidDevice>> found_;
};

SimulatedHidService::SimulatedHidService(const std::vector<HidDeviceConfig>& devices,
                                         const std::shared_ptr<Clock>& clock, Concurrency& concurrency)
    : sensors_([&] {
        auto sensors = std::make_shared<Sensors>();
        for (const HidDeviceConfig& device : devices) {
          sensors->push_back(std::make_shared<HidSensor>(device, clock, concurrency));
        }
        return sensors;
      }()) {}

std::shared_ptr<HidManager> SimulatedHidService::createManager() { return std::make_shared<Manager>(sensors_); }

std::string SimulatedHidService::nameOf(const HidDevice& device) {
  const auto* const own = dynamic_cast<const Device*>(&device);
  return own == nullptr ? std::string() : own->name();
}

}  // namespace quazor
