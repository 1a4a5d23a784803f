#include "tests/support/fake_sensor.h"

#include "contract/message_format.h"

#include <algorithm>
#include <bit>
#include <cstddef>

namespace quazor {

namespace {

std::string hexadecimal(std::span<const std::uint8_t> bytes) { return defaultText(Bytes(bytes.begin(), bytes.end())); }

std::string_view nameOf(RunLoopResult result) {
  switch (result) {
    case RunLoopResult::kHandledSource: return "a source was handled";
    case RunLoopResult::kTimedOut: return "timed out";
    case RunLoopResult::kStopped: return "stopped";
    case RunLoopResult::kFinished: return "finished";
  }
  return "for no known reason";
}

bool takesPartIn(std::string_view runMode, std::string_view addedMode) {
  return addedMode == runMode || (addedMode == kRunLoopCommonModes && runMode == kRunLoopDefaultMode);
}

template <class List, class T>
bool isAdded(const List& list, const std::shared_ptr<T>& item) {
  return std::any_of(list.begin(), list.end(), [&](const auto& added) { return added.first == item; });
}

template <class List, class T>
void addTo(List& list, const std::shared_ptr<T>& item, std::string_view mode) {
  if (!isAdded(list, item)) list.emplace_back(item, mode);
}

template <class List, class T>
void removeFrom(List& list, const std::shared_ptr<T>& item, std::string_view mode) {
  std::erase_if(list, [&](const auto& added) { return added.first == item && added.second == mode; });
}

}  // namespace

class FakeRunLoop::Source final : public RunLoopSource {
 public:
  explicit Source(std::function<void()> handler) : handler_(std::move(handler)) {}

  void signal() override { signalled_ = true; }
  bool isSignalled() const { return signalled_; }
  // Calls the handler if the source was signalled.
  bool handle() {
    if (!std::exchange(signalled_, false)) return false;
    handler_();
    return true;
  }

 private:
  std::function<void()> handler_;
  bool signalled_ = false;
};

class FakeRunLoop::Observer final : public RunLoopObserver {
 public:
  Observer(RunLoopActivities mask, bool isRepeating, std::int64_t place, std::function<void(RunLoopActivities)> called)
      : activities(mask), repeats(isRepeating), order(place), handler(std::move(called)) {}

  const RunLoopActivities activities;
  const bool repeats;
  const std::int64_t order;
  const std::function<void(RunLoopActivities)> handler;
};

std::shared_ptr<RunLoopSource> FakeRunLoop::makeSource(std::function<void()> handler) {
  return std::make_shared<Source>(std::move(handler));
}

void FakeRunLoop::addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
  addTo(sources_, source, mode);
}

void FakeRunLoop::removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
  removeFrom(sources_, source, mode);
}

std::shared_ptr<RunLoopObserver> FakeRunLoop::makeObserver(RunLoopActivities activities, bool repeats,
                                                           std::int64_t order,
                                                           std::function<void(RunLoopActivities)> handler) {
  auto observer = std::make_shared<Observer>(activities, repeats, order, std::move(handler));
  lastObserver_ = observer;
  if (record_) {
    record_(
        "RunLoop.makeObserver", "loop",
        "of " + std::to_string(activities) + (repeats ? ", repeating" : ", once") + ", order " + std::to_string(order),
        true);
  }
  return observer;
}

void FakeRunLoop::addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) {
  if (record_) record_("RunLoop.addObserver", "loop", mode, true);
  addTo(observers_, observer, mode);
  std::stable_sort(observers_.begin(), observers_.end(), [](const auto& a, const auto& b) {
    return static_cast<const Observer&>(*a.first).order < static_cast<const Observer&>(*b.first).order;
  });
}

void FakeRunLoop::removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) {
  if (record_) record_("RunLoop.removeObserver", "loop", mode, isAdded(observers_, observer));
  removeFrom(observers_, observer, mode);
}

RunLoopResult FakeRunLoop::runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                                     bool returnAfterSourceHandled) {
  if (record_) {
    record_("RunLoop.runInMode", "loop",
            std::string(mode) + ' ' + std::to_string(limit.count()) + " ns" +
                (returnAfterSourceHandled ? ", for one source" : ""),
            true);
  }
  constexpr auto kEndOfTime = std::chrono::nanoseconds::max();
  const std::chrono::nanoseconds deadline = limit >= kEndOfTime - now_ ? kEndOfTime : now_ + limit;
  const bool outerStopped = std::exchange(stopped_, false);
  tell(kRunLoopEntry, mode);
  const RunLoopResult result = runRounds(mode, deadline, returnAfterSourceHandled);
  tell(kRunLoopExit, mode);
  stopped_ = outerStopped;
  if (record_) record_("RunLoop.run", "loop", nameOf(result), true);
  return result;
}

RunLoopResult FakeRunLoop::runRounds(std::string_view mode, std::chrono::nanoseconds deadline,
                                     bool returnAfterSourceHandled) {
  while (true) {
    const bool signalled = std::any_of(sources_.begin(), sources_.end(), [&](const auto& added) {
      return takesPartIn(mode, added.second) && static_cast<const Source&>(*added.first).isSignalled();
    });
    if (signalled) tell(kRunLoopBeforeSources, mode);
    const bool handled = handleSources(mode);
    if (handled && returnAfterSourceHandled) return RunLoopResult::kHandledSource;
    if (now_ >= deadline) return RunLoopResult::kTimedOut;
    if (stopped_) return RunLoopResult::kStopped;
    const bool waits = std::any_of(sources_.begin(), sources_.end(),
                                   [&](const auto& added) { return takesPartIn(mode, added.second); });
    if (!waits) return RunLoopResult::kFinished;
    tell(kRunLoopBeforeWaiting, mode);
    waitUntil(deadline);
    tell(kRunLoopAfterWaiting, mode);
  }
}

bool FakeRunLoop::handleSources(std::string_view mode) {
  bool handled = false;
  const Added<RunLoopSource> sources = sources_;  // handlers may change the list
  for (const auto& [source, addedMode] : sources) {
    if (!takesPartIn(mode, addedMode) || !isAdded(sources_, source)) continue;
    handled = static_cast<Source&>(*source).handle() || handled;
  }
  return handled;
}

void FakeRunLoop::tell(RunLoopActivities activity, std::string_view mode) {
  const Added<RunLoopObserver> observers = observers_;  // handlers may change the list
  for (const auto& [added, addedMode] : observers) {
    const auto& observer = static_cast<const Observer&>(*added);
    if (!takesPartIn(mode, addedMode) || (observer.activities & activity) == 0 || !isAdded(observers_, added)) continue;
    if (!observer.repeats) removeFrom(observers_, added, addedMode);
    observer.handler(activity);
  }
}

// Performs all actions for one time in one wait, so that their sources are handled in one round.
void FakeRunLoop::waitUntil(std::chrono::nanoseconds deadline) {
  if (actions_.empty() || actions_.begin()->first > deadline) {
    now_ = deadline;
    return;
  }
  const std::chrono::nanoseconds time = actions_.begin()->first;
  now_ = std::max(now_, time);
  while (!actions_.empty() && actions_.begin()->first == time) {
    const auto action = actions_.extract(actions_.begin());
    action.mapped()();
  }
}

void FakeRunLoop::stop() {
  if (record_) record_("RunLoop.stop", "loop", "", true);
  stopped_ = true;
}

void FakeHidDevice::record(std::string_view operation, std::string_view detail, bool succeeded) const {
  if (record_) record_("HidDevice." + std::string(operation), "sensor", detail, succeeded);
}

bool FakeHidDevice::answer(bool succeeded, DiagnosticErrorPtr* error) const {
  if (!succeeded && ownError != nullptr) storeError(error, ownError);
  return succeeded;
}

bool FakeHidDevice::open(DiagnosticErrorPtr* error) {
  record("open", "", opens);
  open_ = opens;
  return answer(opens, error);
}

void FakeHidDevice::setInputReportCallback(InputReportCallback callback) {
  record(callback ? "setInputReportCallback" : "removeInputReportCallback", "", true);
  receiver_ = callback ? std::make_shared<InputReportCallback>(std::move(callback)) : nullptr;
}

bool FakeHidDevice::setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                                           DiagnosticErrorPtr* error) {
  const bool taken = !refusedReports.contains(reportID);
  if (record_) record("setFeatureReport", std::to_string(reportID) + " = " + hexadecimal(payload), taken);
  if (taken && onFeatureReport) onFeatureReport(reportID);
  return answer(taken, error);
}

void FakeHidDevice::scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) {
  record("schedule", mode, true);
  loop_ = &runLoop;
  source_ = runLoop.makeSource([this] { deliverAll(); });
  runLoop.addSource(source_, mode);
}

void FakeHidDevice::unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) {
  record("unschedule", mode, true);
  if (loop_ != &runLoop) return;
  runLoop.removeSource(source_, mode);
  loop_ = nullptr;
}

void FakeHidDevice::close(std::uint32_t options) {
  if (record_) record("close", std::to_string(options), true);
  open_ = false;
  currentError_ = nullptr;
}

void FakeHidDevice::enqueue(Event event) {
  if (!listens()) return;
  events_.push_back(std::move(event));
  if (source_ != nullptr) source_->signal();
}

void FakeHidDevice::deliverAll() {
  while (!events_.empty()) {
    const Event event = std::move(events_.front());
    events_.pop_front();
    if (event.error != nullptr) {
      deliverError(event.error);
    } else {
      deliver(event.reportID, event.data);
    }
  }
}

void FakeHidDevice::deliver(std::uint8_t reportID, std::span<const std::uint8_t> data) {
  if (!listens()) return;
  const std::shared_ptr<InputReportCallback> receiver = receiver_;
  (*receiver)(reportID, data, nullptr);
}

void FakeHidDevice::deliverError(DiagnosticErrorPtr error) {
  if (!listens()) return;
  const std::shared_ptr<InputReportCallback> receiver = receiver_;
  currentError_ = std::move(error);
  (*receiver)(0, {}, currentError_);
}

// One object that implements all services for a sensor.
class FakeSensor::Services final : public HidService, public FramebufferService, public RunLoops, public Concurrency {
 public:
  explicit Services(FakeSensor& sensor) : sensor_(sensor) {}

  std::shared_ptr<HidManager> createManager() override {
    record("HidService.createManager", "hid", "", sensor_.hasHidManager);
    return sensor_.hasHidManager ? std::make_shared<Manager>(sensor_) : nullptr;
  }
  std::shared_ptr<Display> mainDisplay() override {
    record("FramebufferService.mainDisplay", "framebuffer", "", sensor_.hasDisplay);
    return sensor_.hasDisplay ? std::make_shared<MainDisplay>(sensor_) : nullptr;
  }
  RunLoop* currentRunLoop() override {
    record("RunLoops.currentRunLoop", "thread", "", sensor_.hasRunLoop);
    return sensor_.hasRunLoop ? &sensor_.loop : nullptr;
  }
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService) override {
    record("Concurrency.makeSerialQueue", "concurrency", label, false);
    return nullptr;
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override {
    record("Concurrency.makeSemaphore", "concurrency", std::to_string(count), true);
    return std::make_shared<RecordedSemaphore>(sensor_);
  }

 private:
  class Manager final : public HidManager {
   public:
    explicit Manager(FakeSensor& sensor) : sensor_(sensor) {}
    std::string description() const override { return "manager"; }
    void enumerateDevicesMatching(const std::vector<Dictionary>& wanted) override {
      sensor_.matching = wanted;
      sensor_.record_("HidManager.enumerateDevicesMatching", "manager",
                      defaultText(Array(wanted.begin(), wanted.end())), true);
    }
    std::vector<std::shared_ptr<HidDevice>> devices() override {
      sensor_.record_("HidManager.devices", "manager", std::to_string(sensor_.matchingDevices.size()), true);
      return sensor_.matchingDevices;
    }

   private:
    FakeSensor& sensor_;
  };

  class Registry final : public RegistryService {
   public:
    explicit Registry(FakeSensor& sensor) : sensor_(sensor) {}
    std::string description() const override { return "registry"; }
    std::optional<Value> registryProperty(std::string_view name) override {
      const bool isThere = name == "DSPLY Debug Info" && sensor_.displayProperty;
      sensor_.record_("RegistryService.registryProperty", "registry", name, isThere);
      return isThere ? sensor_.displayProperty : std::nullopt;
    }

   private:
    FakeSensor& sensor_;
  };

  class MainDisplay final : public Display {
   public:
    explicit MainDisplay(FakeSensor& sensor) : sensor_(sensor) {}
    std::string description() const override { return "display"; }
    std::shared_ptr<RegistryService> registryService() override {
      sensor_.record_("Display.registryService", "display", "", sensor_.hasRegistryService);
      return sensor_.hasRegistryService ? std::make_shared<Registry>(sensor_) : nullptr;
    }

   private:
    FakeSensor& sensor_;
  };

  class RecordedSemaphore final : public Semaphore {
   public:
    explicit RecordedSemaphore(FakeSensor& sensor) : sensor_(sensor) {}
    void signal() override { sensor_.record_("Semaphore.signal", "semaphore", "", true); }
    void wait() override { sensor_.record_("Semaphore.wait", "semaphore", "", true); }

   private:
    FakeSensor& sensor_;
  };

  void record(std::string_view operation, std::string_view object, std::string_view detail, bool succeeded) const {
    sensor_.record_(operation, object, detail, succeeded);
  }

  FakeSensor& sensor_;
};

FakeSensor::FakeSensor(CallRecorder record)
    : displayProperty(displayPropertyOf(1)),
      loop(record),
      device(std::make_shared<FakeHidDevice>(record)),
      matchingDevices{device},
      record_(record ? std::move(record) : [](std::string_view, std::string_view, std::string_view, bool) {}) {}

Platform FakeSensor::platform() {
  const auto services = std::make_shared<Services>(*this);
  return Platform{nullptr, nullptr, services, nullptr, services, services, services};
}

Value displayPropertyOf(Value power) {
  return Dictionary{{"DSPLY power info", Dictionary{{"DSPLY power info panel", std::move(power)}}}};
}

Bytes imageReport(std::uint32_t frameID) {
  Bytes report(792, 0xEE);
  const auto write = [&](std::size_t offset, std::uint32_t number) {
    for (std::size_t i = 0; i < 4; ++i) report[offset + i] = static_cast<std::uint8_t>(number >> (8 * i));
  };
  report[0] = 0x76;
  write(4, frameID);
  write(12, frameID * 33);
  for (std::uint32_t i = 0; i < 48; ++i) {
    write(16 + 4 * i, i - 24);
    write(208 + 4 * i, i * 1000);
  }
  write(788, std::bit_cast<std::uint32_t>(36.6F));
  return report;
}

}  // namespace quazor
