#include "backends/faults/intercepted_platform.h"

#include "backends/faults/intercepted_capture.h"
#include "backends/faults/intercepted_hid.h"
#include "backends/faults/intercepted_reports.h"
#include "backends/faults/operations.h"

#include <chrono>
#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

// Sleeping cannot fail, so faults do not apply, but observers are notified. Thread: any.
class InterceptedClock final : public Clock {
 public:
  InterceptedClock(std::shared_ptr<Clock> clock, std::shared_ptr<CallInterceptor> calls)
      : clock_(std::move(clock)), calls_(std::move(calls)) {}

  std::chrono::nanoseconds now() const override { return clock_->now(); }
  Date date() const override { return clock_->date(); }
  void sleep(std::chrono::nanoseconds duration) override {
    clock_->sleep(duration);
    calls_->report(
        {kClockSleep, {}, {}}, [&] { return defaultText(std::chrono::duration<double>(duration).count()); }, true);
  }

 private:
  const std::shared_ptr<Clock> clock_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// A fault may hide the run loop of a thread. Thread: any.
class InterceptedRunLoops final : public RunLoops {
 public:
  InterceptedRunLoops(std::shared_ptr<RunLoops> runLoops, std::shared_ptr<CallInterceptor> calls)
      : runLoops_(std::move(runLoops)), calls_(std::move(calls)) {}

  RunLoop* currentRunLoop() override {
    return calls_->perform({sensor_operation::kCurrentRunLoop, {}, {}}, nullptr,
                           [this] { return runLoops_->currentRunLoop(); });
  }

 private:
  const std::shared_ptr<RunLoops> runLoops_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// Thread: as the entry that it wraps.
class InterceptedRegistryService final : public RegistryService {
 public:
  InterceptedRegistryService(std::shared_ptr<RegistryService> registry, std::shared_ptr<CallInterceptor> calls)
      : registry_(std::move(registry)), calls_(std::move(calls)) {}

  std::string description() const override { return registry_->description(); }

  std::optional<Value> registryProperty(std::string_view name) override {
    return calls_->perform(
        {sensor_operation::kRegistryProperty, {}, name}, nullptr, [&] { return std::string(name); },
        [&] { return registry_->registryProperty(name); });
  }

 private:
  const std::shared_ptr<RegistryService> registry_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// Thread: as the display that it wraps.
class InterceptedDisplay final : public Display {
 public:
  InterceptedDisplay(std::shared_ptr<Display> display, std::shared_ptr<CallInterceptor> calls)
      : display_(std::move(display)), calls_(std::move(calls)) {}

  std::string description() const override { return display_->description(); }

  std::shared_ptr<RegistryService> registryService() override {
    return calls_->perform({sensor_operation::kRegistryService, {}, {}}, nullptr,
                           [&]() -> std::shared_ptr<RegistryService> {
                             std::shared_ptr<RegistryService> registry = display_->registryService();
                             if (registry == nullptr) return nullptr;
                             return std::make_shared<InterceptedRegistryService>(std::move(registry), calls_);
                           });
  }

 private:
  const std::shared_ptr<Display> display_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// Thread: as the service that it wraps.
class InterceptedFramebuffer final : public FramebufferService {
 public:
  InterceptedFramebuffer(std::shared_ptr<FramebufferService> framebuffer, std::shared_ptr<CallInterceptor> calls)
      : framebuffer_(std::move(framebuffer)), calls_(std::move(calls)) {}

  std::shared_ptr<Display> mainDisplay() override {
    return calls_->perform({sensor_operation::kMainDisplay, {}, {}}, nullptr, [&]() -> std::shared_ptr<Display> {
      std::shared_ptr<Display> display = framebuffer_->mainDisplay();
      return display == nullptr ? nullptr : std::make_shared<InterceptedDisplay>(std::move(display), calls_);
    });
  }

 private:
  const std::shared_ptr<FramebufferService> framebuffer_;
  const std::shared_ptr<CallInterceptor> calls_;
};

}  // namespace

Platform interceptedPlatform(const Platform& platform, const std::shared_ptr<CallInterceptor>& calls,
                             ObjectNames names) {
  const auto shared = std::make_shared<const ObjectNames>(std::move(names));
  Platform intercepted = platform;
  if (platform.capture != nullptr) intercepted.capture = interceptedCapture(platform.capture, calls, shared);
  if (platform.clock != nullptr) intercepted.clock = std::make_shared<InterceptedClock>(platform.clock, calls);
  if (platform.reports != nullptr) intercepted.reports = interceptedReports(platform.reports, calls);
  if (platform.hid != nullptr) intercepted.hid = interceptedHid(platform.hid, calls, shared);
  if (platform.framebuffer != nullptr) {
    intercepted.framebuffer = std::make_shared<InterceptedFramebuffer>(platform.framebuffer, calls);
  }
  if (platform.runLoops != nullptr) {
    intercepted.runLoops = std::make_shared<InterceptedRunLoops>(platform.runLoops, calls);
  }
  return intercepted;
}

}  // namespace quazor
