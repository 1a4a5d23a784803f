#include "tests/sweeps/sensor_images_bench.h"

#include "backends/simulated/simulated_phone.h"
#include "backends/simulated/time/simulation_stall.h"
#include "contract/message_format.h"
#include "diagnostics/sensor_images/nimbe_image_experiment.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>
#include <memory>
#include <set>
#include <span>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

using sensor_oracle::Receiver;

std::string_view nameOf(RunLoopResult result) {
  switch (result) {
    case RunLoopResult::kHandledSource: return "run handled a source";
    case RunLoopResult::kTimedOut: return "run timed out";
    case RunLoopResult::kStopped: return "run stopped";
    case RunLoopResult::kFinished: return "run finished";
  }
  return "run ended for no known reason";
}

// The phone's run loop, which records the calls and counts what is added to it.
class WatchedLoop final : public RunLoop {
 public:
  using Tell = std::function<void(std::string_view operation, const std::string& detail)>;

  WatchedLoop(RunLoop& loop, Tell tell) : loop_(loop), tell_(std::move(tell)) {}

  std::size_t sources() const { return sources_.size(); }
  std::size_t observers() const { return observers_.size(); }

  std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) override {
    return loop_.makeSource(std::move(handler));
  }
  void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override {
    sources_.emplace(source.get(), mode);
    loop_.addSource(source, mode);
  }
  void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override {
    sources_.erase({source.get(), std::string(mode)});
    loop_.removeSource(source, mode);
  }

  std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                std::function<void(RunLoopActivities activity)> handler) override {
    tell_("makeObserver", "of " + std::to_string(activities) + (repeats ? ", repeating" : ", once") + ", order " +
                              std::to_string(order));
    return loop_.makeObserver(activities, repeats, order, std::move(handler));
  }
  void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override {
    tell_("addObserver", std::string(mode));
    observers_.emplace(observer.get(), mode);
    loop_.addObserver(observer, mode);
  }
  void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override {
    tell_("removeObserver", std::string(mode));
    observers_.erase({observer.get(), std::string(mode)});
    loop_.removeObserver(observer, mode);
  }

  RunLoopResult runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                          bool returnAfterSourceHandled) override {
    tell_("runInMode", std::string(mode) + ' ' + std::to_string(limit.count()) + " ns" +
                           (returnAfterSourceHandled ? ", until a source is handled" : ""));
    const RunLoopResult result = loop_.runInMode(mode, limit, returnAfterSourceHandled);
    tell_(nameOf(result), "");
    return result;
  }
  void stop() override {
    tell_("stop", "");
    loop_.stop();
  }

 private:
  RunLoop& loop_;
  const Tell tell_;
  std::set<std::pair<const RunLoopSource*, std::string>> sources_;
  std::set<std::pair<const RunLoopObserver*, std::string>> observers_;
};

class WatchedLoops final : public RunLoops {
 public:
  WatchedLoops(std::shared_ptr<RunLoops> loops, WatchedLoop& watched) : loops_(std::move(loops)), watched_(watched) {}

  RunLoop* currentRunLoop() override { return loops_->currentRunLoop() == nullptr ? nullptr : &watched_; }

 private:
  const std::shared_ptr<RunLoops> loops_;
  WatchedLoop& watched_;
};

std::string toldError(ErrorPlace place, const DiagnosticErrorPtr& error) {
  if (place == ErrorPlace::kNone) return "no place for an error";
  if (error == callersOwnError()) return "error untouched";
  if (error == nullptr) return "error emptied";
  return "error " + errorChain(error);
}

std::string entriesOf(const QZNimbeCorvaneImage& image) {
  return "{frameID = " + defaultText(image.frameID()) + "; dScanI = " + defaultText(image.dScanI()) +
         "; dScanQ = " + defaultText(image.dScanQ()) + "; tmonDataInC = " + defaultText(image.tmonDataInC()) +
         "; timestampInMilliseconds = " + defaultText(image.timestampInMilliseconds()) + "}";
}

// Receives the images of a stream without an experiment.
class Listener final : public QZNimbeImageStreamDelegate {
 public:
  Listener(std::function<void(const std::string& line)> tell, std::function<void()> close)
      : tell_(std::move(tell)), close_(std::move(close)) {}

  void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) override {
    tell_("handleImage " + entriesOf(*image));
    if (close_) close_();
  }
  void streamDidError(DiagnosticErrorPtr error) override { tell_("streamDidError " + errorChain(error)); }

 private:
  const std::function<void(const std::string& line)> tell_;
  const std::function<void()> close_;  // empty if the listener does not close the stream
};

class Bench {
 public:
  Bench(const Scenario& scenario, const SensorRequest& request, ErrorPlace place, std::uint64_t seed)
      : request_(request),
        place_(place),
        phone_(scenario, PhoneTime::kVirtual, seed),
        scheduler_(*phone_.scheduler()),
        rawLoop_(*phone_.platform().runLoops->currentRunLoop()),
        loop_(rawLoop_, [this](std::string_view operation, const std::string& detail) {
          transcript_.addCall("RunLoop." + std::string(operation), "", withTime(detail), true);
        }) {
    phone_.observeCalls([this](const PlatformCall& call) {
      ++run_.calls;
      transcript_.addCall(call.operation, call.object, withTime(call.detail), call.succeeded);
    });
  }

  SensorRun run(const std::vector<Fault>& faults) {
    for (const Fault& fault : faults) phone_.addFault(fault);
    letOthersIn();
    bool returned = true;
    try {
      request_.receiver == Receiver::kExperiment ? runExperiment() : watchStream();
    } catch (const SimulationStall& stall) {
      const std::string_view what = stall.what();
      say("never returned: " + std::string(what.substr(0, what.rfind(", at "))));
      say(toldError(place_, error_));
      returned = false;
    } catch (const std::logic_error& raised) {
      say("raised " + std::string(raised.what()));
      say(toldError(place_, error_));
    }
    run_.ended = scheduler_.now();
    say(withTime("ended"));
    stopper_.reset();
    if (otherSource_ != nullptr) rawLoop_.removeSource(otherSource_, kRunLoopDefaultMode);
    bool eachHappenedOnce = true;
    for (const FaultStatus& status : phone_.faultStatus()) {
      run_.fired.push_back(status.fired);
      eachHappenedOnce = eachHappenedOnce && status.fired == 1 && status.fault.occurrence;
    }
    if (eachHappenedOnce) lookAfterwards(returned);
    return run_;
  }

 private:
  // Adds the calls and log lines since the last time to the trace.
  void tellCalls() {
    const std::string called = transcript_.text();
    run_.told += called.substr(std::exchange(seen_, called.size()));
  }
  void say(const std::string& line) {
    tellCalls();
    run_.told += line + '\n';
  }
  std::string withTime(const std::string& detail) const {
    return detail + (detail.empty() ? "" : " ") + "at " + std::to_string(scheduler_.now().count());
  }
  DiagnosticErrorPtr* placeForError() {
    error_ = callersOwnError();
    return place_ == ErrorPlace::kGiven ? &error_ : nullptr;
  }

  void letOthersIn() {
    if (const auto time = request_.others.source) {
      otherSource_ = rawLoop_.makeSource(
          [this, time] { scheduler_.blockUntil(scheduler_.after(*time), "another source is handled"); });
      rawLoop_.addSource(otherSource_, kRunLoopDefaultMode);
      otherSource_->signal();
    }
    if (const auto time = request_.others.stop) {
      stopper_ = phone_.platform().concurrency->makeSerialQueue("stopper", QualityOfService::kBackground);
      stopper_->asyncAfter(*time, [this] { rawLoop_.stop(); });
    }
  }

  Platform platform() {
    Platform platform = phone_.platform();
    platform.runLoops = std::make_shared<WatchedLoops>(platform.runLoops, loop_);
    return platform;
  }

  void runExperiment() {
    experiment_ = std::make_shared<QZNimbeImageExperiment>(platform());
    QZDiagnosticHost host;
    const bool isSetUp = experiment_->setupWithParameters(request_.parameters, &host, placeForError());
    say(isSetUp ? "set up" : "not set up");
    say(toldError(place_, error_));
    if (!isSetUp) return;
    const auto result = experiment_->run(placeForError());
    say(result != nullptr ? "returned a result" : "returned nothing");
    say(toldError(place_, error_));
    if (result == nullptr) return;
    for (const auto& [key, measurement] : result->measurements()) say("measurement " + key);
    for (const auto& [key, value] : result->auxiliaryData()) say(key + " = " + defaultText(value));
  }

  void watchStream() {
    stream_ = std::make_shared<QZNimbeImageStream>(platform());
    std::function<void()> close;
    if (request_.receiver == Receiver::kCloses) close = [this] { stream_->close(); };
    listener_ =
        std::make_shared<Listener>([this](const std::string& line) { say("delegate " + withTime(line)); }, close);
    if (request_.receiver != Receiver::kNone) stream_->setDelegate(listener_);
    const bool opened = stream_->openWithRunLoop(loop_, placeForError());
    say(opened ? "opened" : "not opened");
    say(toldError(place_, error_));
    if (opened) (void)loop_.runInMode(kRunLoopDefaultMode, request_.watched, false);
    stream_->close();
    say("closed");
    stream_->close();
  }

  void lookAfterwards(bool returned) {
    phone_.observeCalls({});
    std::string seen = left() + (returned ? probeTwice() : "");
    experiment_.reset();
    stream_.reset();
    // A removed device leaves the loop in the next run.
    (void)rawLoop_.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds(0), false);
    seen += left() + probeTwice();
    tellCalls();
    run_.told += seen;
  }
  std::string left() const {
    return "left on the loop: " + std::to_string(loop_.sources()) + " sources, " + std::to_string(loop_.observers()) +
           " observers\n";
  }
  std::string probeTwice() {
    std::string seen;
    for (int i = 0; i < 2; ++i) {
      scheduler_.blockUntil(scheduler_.after(26 * request_.period / 10), "the bench waits");
      seen += "probe: " + probe() + '\n';
    }
    return seen;
  }
  // The next report or error that the bench receives after it has opened the sensor.
  std::string probe() {
    const std::shared_ptr<HidManager> manager = phone_.platform().hid->createManager();
    manager->enumerateDevicesMatching({Dictionary{}});
    const auto devices = manager->devices();
    if (devices.empty()) return "no device";
    HidDevice& device = *devices.front();
    std::optional<std::string> seen;
    device.setInputReportCallback(
        [&](std::uint8_t, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
          if (!seen) seen = error != nullptr ? defaultText(error) : described(data);
          rawLoop_.stop();
        });
    EXPECT_TRUE(device.open(nullptr));
    for (const auto& setting : {std::array<std::uint8_t, 2>{0xAB, 1}, std::array<std::uint8_t, 2>{0xAC, 1}}) {
      static_cast<void>(device.setFeatureReportWithID(setting.front(), setting, nullptr));
    }
    device.scheduleWithRunLoop(rawLoop_, kRunLoopDefaultMode);
    (void)rawLoop_.runInMode(kRunLoopDefaultMode, 15 * request_.period / 10, false);
    device.setInputReportCallback({});
    device.unscheduleFromRunLoop(rawLoop_, kRunLoopDefaultMode);
    device.close(0);
    return seen.value_or("nothing");
  }
  static std::string described(std::span<const std::uint8_t> data) {
    if (data.size() < 8) return std::to_string(data.size()) + " bytes";
    std::uint32_t frame = 0;
    for (std::size_t i = 8; i-- > 4;) frame = frame << 8U | data[i];
    return "frame " + std::to_string(frame);
  }

  const SensorRequest& request_;
  const ErrorPlace place_;
  RunTranscript transcript_;
  std::size_t seen_ = 0;  // length of the transcript read so far
  SensorRun run_;
  SimulatedPhone phone_;
  VirtualScheduler& scheduler_;
  RunLoop& rawLoop_;
  WatchedLoop loop_;
  std::shared_ptr<RunLoopSource> otherSource_;
  std::shared_ptr<SerialQueue> stopper_;
  DiagnosticErrorPtr error_ = callersOwnError();
  std::shared_ptr<Listener> listener_;
  std::shared_ptr<QZNimbeImageStream> stream_;
  std::shared_ptr<QZNimbeImageExperiment> experiment_;
};

}  // namespace

SensorRun runSensor(const Scenario& scenario, const SensorRequest& request, const std::vector<Fault>& faults,
                    ErrorPlace place, std::uint64_t seed) {
  return Bench(scenario, request, place, seed).run(faults);
}

}  // namespace quazor
