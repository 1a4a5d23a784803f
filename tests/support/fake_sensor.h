// A hand-written display, its sensor and a run loop: a test determines what exists, which calls fail, and all events.
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

// Called for every platform call, with the arguments of RunTranscript::addCall; may be empty.
using CallRecorder =
    std::function<void(std::string_view operation, std::string_view object, std::string_view detail, bool succeeded)>;

// A loop with its own time, which advances only while the loop waits. Tests schedule the events in advance.
class FakeRunLoop final : public RunLoop {
 public:
  explicit FakeRunLoop(CallRecorder record) : record_(std::move(record)) {}

  // Calls `action` when the loop waits at that time or later; actions for equal times run in the order of the calls.
  void at(std::chrono::nanoseconds time, std::function<void()> action) { actions_.emplace(time, std::move(action)); }
  std::chrono::nanoseconds now() const { return now_; }
  // The number of added sources.
  std::size_t sources() const { return sources_.size(); }
  std::size_t observers() const { return observers_.size(); }
  // The observer that was created last, if it still exists.
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
  using Added = std::vector<std::pair<std::shared_ptr<T>, std::string>>;  // with its mode

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

// A device that accepts everything except what it is told to refuse.
class FakeHidDevice final : public HidDevice {
 public:
  explicit FakeHidDevice(CallRecorder record) : record_(std::move(record)) {}

  // Results of its calls; set them before it is used.
  bool opens = true;
  std::set<std::uint8_t> refusedReports;  // IDs of feature reports
  DiagnosticErrorPtr ownError;            // the error of a refused call; null: none
  // A careless device calls its receiver at any time, even if it is not scheduled or not open.
  bool careless = false;
  // Called after a feature report was accepted, unless empty.
  std::function<void(std::uint8_t reportID)> onFeatureReport;

  bool isOpen() const { return open_; }
  bool isScheduled() const { return loop_ != nullptr; }
  bool hasReceiver() const { return receiver_ != nullptr; }

  // Send a report through the loop; deliver a report at once; deliver an error instead of a report.
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
  std::shared_ptr<InputReportCallback> receiver_;  // shared, because it must outlive its own removal
  RunLoop* loop_ = nullptr;
  std::shared_ptr<RunLoopSource> source_;
  std::deque<Event> events_;
  DiagnosticErrorPtr currentError_;  // the error that is being delivered; released when the device is closed
};

// All services for the sensor image experiment. Changes affect later calls.
class FakeSensor {
 public:
  explicit FakeSensor(CallRecorder record);

  // The services borrow the sensor, which must outlive them.
  Platform platform();

  bool hasDisplay = true;
  bool hasRegistryService = true;
  std::optional<Value> displayProperty;  // "DSPLY Debug Info"; initially that of a powered display
  bool hasHidManager = true;
  bool hasRunLoop = true;
  FakeRunLoop loop;
  std::shared_ptr<FakeHidDevice> device;
  std::vector<std::shared_ptr<HidDevice>> matchingDevices;  // initially the one device
  std::vector<Dictionary> matching;                         // the last search

 private:
  class Services;

  CallRecorder record_;
};

// The display property for a panel whose power state is `power`.
Value displayPropertyOf(Value power);

// An image report with that frame ID: sample i is i - 24 for channel I and 1000 i for channel Q, the temperature is
// 36.6 and the timestamp 33 times the frame ID. Unused bytes are 0xEE.
Bytes imageReport(std::uint32_t frameID);

}  // namespace quazor
