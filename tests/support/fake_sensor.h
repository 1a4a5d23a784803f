// A fake display, its sensor and a run loop: a test says what is there, what is refused and what comes when.
#pragma once

#include "platform/platform.h"

#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// Is told of every platform call in the words of RunTranscript::addCall; one that is empty is told nothing.
using CallRecorder =
    std::function<void(std::string_view operation, std::string_view object, std::string_view detail, bool succeeded)>;

// A loop with a time of its own, which passes only while the loop waits. What it waits for is told to it beforehand.
class FakeRunLoop final : public RunLoop {
 public:
  explicit FakeRunLoop(CallRecorder record) : record_(std::move(record)) {}

  // Does something when the loop waits at that time or later; equal times in the order of the calls.
  void at(std::chrono::nanoseconds time, std::function<void()> action) { actions_.emplace(time, std::move(action)); }
  std::chrono::nanoseconds now() const { return now_; }
  // How many are added.
  std::size_t sources() const { return sources_.size(); }
  std::size_t observers() const { return observers_.size(); }
  // The observer that was made last, as long as somebody holds it.
  const std::weak_ptr<RunLoopObserver>& lastObserver() const { return lastObserver_; }

  std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) override;
  void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                std::function<void(RunLoopActivities)> handler) override;
  void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  RunLoopResult runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                          bool returnAfterSourceHandled) override;
  void stop() override;

 private:
  class Source;
  class Observer;
  template <class T>
  using Added = std::vector<std::pair<std::shared_ptr<T>, std::string>>;  // with the mode

  RunLoopResult runRounds(std::string_view mode, std::chrono::nanoseconds deadline, bool returnAfterSourceHandled);
  bool handleSources(std::string_view mode);
  void tell(RunLoopActivities activity, std::string_view mode);
  void waitUntil(std::chrono::nanoseconds deadline);

  CallRecorder record_;
  std::chrono::nanoseconds now_{0};
  std::multimap<std::chrono::nanoseconds, std::function<void()>> actions_;
  Added<RunLoopSource> sources_;
  Added<RunLoopObserver> observers_;
  std::weak_ptr<RunLoopObserver> lastObserver_;
  bool stopped_ = false;
};

// A device that takes everything but what it is told to refuse.
class FakeHidDevice final : public HidDevice {
 public:
  explicit FakeHidDevice(CallRecorder record) : record_(std::move(record)) {}

  // Before it is used: what it answers.
  bool opens = true;
  std::set<std::uint8_t> refusedReports;  // IDs of feature reports
  DiagnosticErrorPtr ownError;            // what a refused call gives; null for nothing
  // A careless device calls its receiver for as long as there is one, scheduled and open or not.
  bool careless = false;
  // Called, unless it is empty, when a feature report has been taken.
  std::function<void(std::uint8_t reportID)> onFeatureReport;

  bool isOpen() const { return open_; }
  bool isScheduled() const { return loop_ != nullptr; }
  bool hasReceiver() const { return receiver_ != nullptr; }

  // A report that waits for the loop, and one that comes at once; an error in place of a report.
  void send(std::uint8_t reportID, Bytes data) { enqueue({reportID, std::move(data), nullptr}); }
  void sendError(DiagnosticErrorPtr error) { enqueue({0, {}, std::move(error)}); }
  void deliver(std::uint8_t reportID, std::span<const std::uint8_t> data);
  void deliverError(DiagnosticErrorPtr error);

  std::string description() const override { return "sensor"; }
  bool open(DiagnosticErrorPtr* error) override;
  void setInputReportCallback(InputReportCallback callback) override;
  bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                              DiagnosticErrorPtr* error) override;
  void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) override;
  void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) override;
  void close(std::uint32_t options) override;

 private:
  struct Event {
    std::uint8_t reportID;
    Bytes data;
    DiagnosticErrorPtr error;
  };

  bool listens() const { return receiver_ != nullptr && (careless || (open_ && loop_ != nullptr)); }
  void enqueue(Event event);
  void deliverAll();
  bool answer(bool succeeded, DiagnosticErrorPtr* error) const;
  void record(std::string_view operation, std::string_view detail, bool succeeded) const;

  CallRecorder record_;
  bool open_ = false;
  std::shared_ptr<InputReportCallback> receiver_;  // shared, so that it outlives its own removal
  RunLoop* loop_ = nullptr;
  std::shared_ptr<RunLoopSource> source_;
  std::deque<Event> events_;
  DiagnosticErrorPtr currentError_;  // that is being delivered; given up when the device is closed
};

// All the services that the sensor image experiment uses. What is changed here counts for the calls after it.
class FakeSensor {
 public:
  explicit FakeSensor(CallRecorder record);

  // Its services borrow the sensor, which must outlive them.
  Platform platform();

  bool hasDisplay = true;
  bool hasRegistryService = true;
  std::optional<Value> displayProperty;  // "DSPLY Debug Info"; at first that of a powered display
  bool hasHidManager = true;
  bool hasRunLoop = true;
  FakeRunLoop loop;
  std::shared_ptr<FakeHidDevice> device;
  std::vector<std::shared_ptr<HidDevice>> matchingDevices;  // at first the one device
  std::vector<Dictionary> matching;                         // what was last looked for

 private:
  class Services;

  CallRecorder record_;
};

// What the framebuffer's driver publishes when the panel's power is `power`.
Value displayPropertyOf(Value power);

// An image report of that frame ID: sample i of channel I is i - 24, of channel Q 1000 i, the temperature 36.6 and the
// timestamp 33 times the frame ID. What is not read is 0xEE.
Bytes imageReport(std::uint32_t frameID);

}  // namespace quazor
