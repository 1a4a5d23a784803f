#include "backends/faults/intercepted_hid.h"

#include "backends/faults/hid_report_name.h"
#include "backends/faults/operations.h"
#include "backends/faults/wrapper_cache.h"

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using HidDevices = std::vector<std::shared_ptr<HidDevice>>;

// Thread: as the device that it wraps.
class InterceptedHidDevice final : public HidDevice {
 public:
  InterceptedHidDevice(std::shared_ptr<HidDevice> device, std::shared_ptr<CallInterceptor> calls, std::string name)
      : device_(std::move(device)), calls_(std::move(calls)), name_(std::move(name)) {}

  std::string description() const override { return device_->description(); }

  bool open(DiagnosticErrorPtr* error) override {
    return calls_->perform(site(sensor_operation::kOpen), error, [&] { return device_->open(error); });
  }
  void setInputReportCallback(InputReportCallback callback) override {
    const char* const detail = callback ? "receiver" : "(null)";
    calls_->perform(
        site(sensor_operation::kSetCallback), nullptr, [&] { return std::string(detail); },
        [&] {
          device_->setInputReportCallback(std::move(callback));
          return true;
        });
  }
  bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                              DiagnosticErrorPtr* error) override {
    const std::string_view report = hidReportName(reportID);
    return calls_->perform(
        {sensor_operation::kSetFeature, name_, report}, error,
        [&] { return std::string(report) + " = " + defaultText(Bytes(payload.begin(), payload.end())); },
        [&] { return device_->setFeatureReportWithID(reportID, payload, error); });
  }
  void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) override {
    calls_->perform(
        site(sensor_operation::kSchedule), nullptr, [&] { return std::string(mode); },
        [&] {
          device_->scheduleWithRunLoop(runLoop, mode);
          return true;
        });
  }
  void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) override {
    calls_->perform(
        site(sensor_operation::kUnschedule), nullptr, [&] { return std::string(mode); },
        [&] {
          device_->unscheduleFromRunLoop(runLoop, mode);
          return true;
        });
  }
  void close(std::uint32_t options) override {
    calls_->perform(
        site(sensor_operation::kClose), nullptr, [&] { return std::to_string(options); },
        [&] {
          device_->close(options);
          return true;
        });
  }

 private:
  CallSite site(std::string_view operation) const { return {operation, name_, {}}; }

  const std::shared_ptr<HidDevice> device_;
  const std::shared_ptr<CallInterceptor> calls_;
  const std::string name_;
};

// Shared by the managers of a service. Thread: any.
struct HidContext {
  std::shared_ptr<CallInterceptor> calls;
  std::shared_ptr<const ObjectNames> names;
  WrapperCache<HidDevice, InterceptedHidDevice> devices;

  std::string nameOf(const HidDevice& device) const {
    return names->hidDevice ? names->hidDevice(device) : device.description();
  }
};

// Thread: as the manager that it wraps.
class InterceptedHidManager final : public HidManager {
 public:
  InterceptedHidManager(std::shared_ptr<HidManager> manager, std::shared_ptr<HidContext> context)
      : manager_(std::move(manager)), context_(std::move(context)) {}

  std::string description() const override { return manager_->description(); }

  void enumerateDevicesMatching(const std::vector<Dictionary>& matching) override {
    context_->calls->perform(
        {sensor_operation::kEnumerate, {}, {}}, nullptr,
        [&] { return defaultText(Array(matching.begin(), matching.end())); },
        [&] {
          manager_->enumerateDevicesMatching(matching);
          return true;
        });
  }
  HidDevices devices() override {
    // The observer is notified of the number of devices even if a fault hides them.
    return context_->calls
        ->perform(
            {sensor_operation::kDevices, {}, {}}, nullptr, [&] { return std::to_string(manager_->devices().size()); },
            [&] { return std::optional(wrapped(manager_->devices())); })
        .value_or(HidDevices{});
  }

 private:
  HidDevices wrapped(const HidDevices& devices) const {
    HidDevices wrappers;
    for (const std::shared_ptr<HidDevice>& device : devices) {
      wrappers.push_back(context_->devices.wrapperOf(device, [&] {
        return std::make_shared<InterceptedHidDevice>(device, context_->calls, context_->nameOf(*device));
      }));
    }
    return wrappers;
  }

  const std::shared_ptr<HidManager> manager_;
  const std::shared_ptr<HidContext> context_;
};

// Thread: any.
class InterceptedHid final : public HidService {
 public:
  InterceptedHid(std::shared_ptr<HidService> hid, std::shared_ptr<CallInterceptor> calls,
                 std::shared_ptr<const ObjectNames> names)
      : hid_(std::move(hid)), context_(std::make_shared<HidContext>()) {
    context_->calls = std::move(calls);
    context_->names = std::move(names);
  }

  std::shared_ptr<HidManager> createManager() override {
    return context_->calls->perform({sensor_operation::kCreateManager, {}, {}}, nullptr,
                                    [&]() -> std::shared_ptr<HidManager> {
                                      std::shared_ptr<HidManager> manager = hid_->createManager();
                                      if (manager == nullptr) return nullptr;
                                      return std::make_shared<InterceptedHidManager>(std::move(manager), context_);
                                    });
  }

 private:
  const std::shared_ptr<HidService> hid_;
  const std::shared_ptr<HidContext> context_;
};

}  // namespace

std::shared_ptr<HidService> interceptedHid(std::shared_ptr<HidService> hid, std::shared_ptr<CallInterceptor> calls,
                                           std::shared_ptr<const ObjectNames> names) {
  return std::make_shared<InterceptedHid>(std::move(hid), std::move(calls), std::move(names));
}

}  // namespace quazor
