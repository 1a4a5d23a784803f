#include "tests/sweeps/sensor_images_oracle.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <deque>
#include <limits>
#include <map>
#include <numbers>
#include <string_view>
#include <utility>

namespace quazor::sensor_oracle {

namespace {

constexpr Time kSecond = 1'000'000'000;
constexpr Time kNever = std::numeric_limits<Time>::max();
constexpr std::string_view kDevice = "display-sensor";
constexpr std::size_t kWaitingReports = 64;  // as many as the phone keeps for a receiver that is busy

// Thrown by what never returns.
struct Stall {
  std::string what;
};
// Thrown where no HID manager can be made.
struct NoManager {};

struct Input {
  std::uint64_t number = 0;
  Time sent = 0;
  Report report;
};

std::string samples(std::uint64_t number, double offset, double (*wave)(double)) {
  std::string text;
  for (int sample = 0; sample < 48; ++sample) {
    const double degrees = static_cast<double>(number) * kPhaseStepPerImage + sample * kPhaseStep;
    const double value = offset + kAmplitude * wave(degrees * std::numbers::pi / 180);
    text += (sample == 0 ? "" : ", ") + std::to_string(std::lround(value));
  }
  return '(' + text + ')';
}

const std::string& scans(std::uint64_t number) {
  static std::map<std::uint64_t, std::string> texts;
  std::string& text = texts[number];
  if (text.empty()) {
    const std::string inPhase = samples(number, kOffsetI, [](double angle) { return std::cos(angle); });
    const std::string quadrature = samples(number, kOffsetQ, [](double angle) { return std::sin(angle); });
    text = "dScanI = " + inPhase + "; dScanQ = " + quadrature;
  }
  return text;
}

// The first sensor of the phone: it streams while one of its two users, the run and the bench, has it open and both of
// its modes are as they should be.
class SensorModel {
 public:
  explicit SensorModel(const Sensor& sensor) : sensor_(sensor) {}

  bool isGone() const { return gone_; }
  bool isOpen(std::size_t user) const { return open_[user]; }
  void setOpen(std::size_t user, bool open, Time now) {
    open_[user] = open;
    update(now);
  }
  void setActive(Time now) {
    active_ = true;
    update(now);
  }
  void setImagesOnly(Time now) {
    imagesOnly_ = true;
    update(now);
  }

  Time due() const {
    if (!streaming_ || (sensor_.count && number_ >= *sensor_.count)) return kNever;
    return start_ + ((sent_ + 1) * kSecond + sensor_.rate - 1) / sensor_.rate;
  }
  Input send(Time now) {
    Input input{number_++, now, sensor_.every};
    ++sent_;
    if (input.number == sensor_.removedAfter) {
      gone_ = true;
      input.report.error = "SimulatedHidErrorDomain code 4: display-sensor has been removed.";
    } else if (const auto single = sensor_.single.find(input.number); single != sensor_.single.end()) {
      input.report = single->second;
    }
    update(now);
    return input;
  }

 private:
  void update(Time now) {
    const bool streams = !gone_ && (open_[0] || open_[1]) && active_ && imagesOnly_;
    if (streams && !streaming_) {
      start_ = now;
      sent_ = 0;
    }
    streaming_ = streams;
  }

  const Sensor& sensor_;
  std::array<bool, 2> open_{};
  bool active_ = false;
  bool imagesOnly_ = false;
  bool gone_ = false;
  bool streaming_ = false;
  Time start_ = 0;
  std::int64_t sent_ = 0;  // since start_
  std::uint64_t number_ = 0;
};

class Run {
 public:
  Run(const Phone& phone, const Request& request, const std::vector<Failure>& failures, bool reportsAreInTime)
      : phone_(phone),
        request_(request),
        failures_(failures),
        taken_(failures.size()),
        fired_(failures.size()),
        reportsAreInTime_(reportsAreInTime),
        sensor_(phone.sensors.empty() ? kNoSensor : phone.sensors.front()) {}

  Prediction predict(bool hasPlaceForError) {
    hasPlaceForError_ = hasPlaceForError;
    bool returned = true;
    try {
      request_.receiver ? watchStream() : runExperiment();
    } catch (const Stall& stall) {
      say("never returned: The simulated phone waits for ever: " + stall.what);
      sayError(error_.empty());
      returned = false;
    } catch (const NoManager&) {
      say("raised No HID Manager available?!");
      sayError(true);
    }
    say("ended" + at());
    if (std::ranges::all_of(fired_, [](std::uint64_t times) { return times == 1; }) &&
        std::ranges::all_of(failures_, [](const Failure& failure) { return failure.occurrence.has_value(); })) {
      lookAfterwards(returned);
    }
    return {told_, calls_, fired_};
  }
  // Whether anybody has slept until the very moment of a report.
  bool metATie() const { return metATie_; }

 private:
  static constexpr std::size_t kRun = 0;
  static constexpr std::size_t kBench = 1;
  static const Sensor kNoSensor;
  enum class End { kTimedOut, kStopped, kFinished };

  // What is told.
  void say(const std::string& line) { told_ += line + '\n'; }
  std::string at() const { return " at " + std::to_string(now_); }
  void sayError(bool isUntouched) {
    if (!hasPlaceForError_) return say("no place for an error");
    say(isUntouched ? "error untouched" : "error " + error_);
  }
  bool fail(int code, const std::string& message, const std::string& cause = "") {
    error_ = "QZNimbeImageExperimentErrorDomain code " + std::to_string(code) + ": " + message +
             (cause.empty() ? "" : ", caused by " + cause);
    return false;
  }

  // The next call: whether it has its effect. Leaves the text of the call's error in cause_.
  bool call(const std::string& operation, const std::string& detail = "", const std::string& refusal = "",
            const std::string& property = "") {
    const bool isOfDevice = operation.starts_with("HidDevice.");
    const std::size_t point = operation.find('.');
    const std::string object = isOfDevice ? std::string(kDevice) : operation.substr(0, point);
    const Failure* ending = nullptr;
    Time delay = 0;
    for (std::size_t i = 0; i < failures_.size(); ++i) {
      const Failure& failure = failures_[i];
      if (failure.operation != "*" && failure.operation != operation) continue;
      ++taken_[i];
      if (failure.occurrence && failure.occurrence != taken_[i]) continue;
      if (failure.action == Action::kDelay) {
        delay += failure.delay;
      } else if (ending == nullptr) {
        ending = &failure;
      } else {
        continue;
      }
      ++fired_[i];
    }
    sleepUntil(now_ + delay);
    if (ending != nullptr && ending->action == Action::kHang) {
      throw Stall{operation + (isOfDevice ? " of " + object : "") + (property.empty() ? "" : " for " + property) +
                  " hangs"};
    }
    cause_ = ending != nullptr ? ending->error : refusal;
    const bool succeeds = ending == nullptr && refusal.empty();
    ++calls_;
    say(object + ' ' + operation.substr(point + 1) + (detail.empty() ? "" : ' ' + detail) + at() +
        (succeeds ? "" : " -> failed"));
    return succeeds;
  }
  void sayOfLoop(const std::string& what) { say("RunLoop " + what + at()); }

  // Time passes. Who sleeps until the very moment of a report may wake before it or after it.
  Time nextEvent() const {
    return std::min(sensor_.due(), request_.others.stop && !stopDone_ ? *request_.others.stop : kNever);
  }
  bool comesBy(Time end) {
    if (nextEvent() == end && end != kNever) metATie_ = true;
    return nextEvent() < end || (nextEvent() == end && end != kNever && reportsAreInTime_);
  }
  void happen() {
    now_ = std::max(now_, nextEvent());
    if (sensor_.due() > now_) {
      stopDone_ = true;
      if (loopRuns_) stopped_ = true;
      return;
    }
    const bool runHasOpen = sensor_.isOpen(kRun);
    const bool benchHasOpen = sensor_.isOpen(kBench);
    const Input input = sensor_.send(now_);
    if (benchHasOpen && !benchSees_) benchSees_ = input;
    if (!runHasOpen || !scheduled_ || (waiting_.size() >= kWaitingReports && input.report.error.empty())) return;
    waiting_.push_back(input);
    signalled_ = true;
  }
  void sleepUntil(Time end) {
    if (end <= now_) return;
    while (comesBy(end)) happen();
    now_ = end;
  }

  // The loop.
  void stopLoop() {
    sayOfLoop("stop");
    stopped_ = true;
  }
  End runLoop(Time limit) {
    sayOfLoop("runInMode default " + std::to_string(limit) + " ns");
    const Time deadline = limit >= kNever - now_ ? kNever : now_ + limit;
    loopRuns_ = true;
    for (;;) {
      if (std::exchange(otherIsSignalled_, false)) sleepUntil(now_ + *request_.others.source);
      if (std::exchange(signalled_, false)) deliver();
      if (deadline != kNever && now_ >= deadline) return End::kTimedOut;
      if (stopped_) return End::kStopped;
      if (!scheduled_ && !request_.others.source) return End::kFinished;
      waitUntil(deadline);
    }
  }
  void waitUntil(Time deadline) {
    while (!signalled_ && !stopped_) {
      if (comesBy(deadline)) {
        happen();
        continue;
      }
      if (deadline == kNever) throw Stall{"a run loop waits for what nothing will signal or stop"};
      now_ = deadline;
      return;
    }
  }
  void sayEndOfLoop(End end) {
    loopRuns_ = false;
    sayOfLoop(end == End::kTimedOut ? "run timed out" : end == End::kStopped ? "run stopped" : "run finished");
  }

  // The stream.
  bool openStream() {
    if (!call("HidService.createManager")) throw NoManager{};
    std::size_t found = 0;
    for (const Sensor& sensor : phone_.sensors) found += sensor.usagePage == 0xFF00 && sensor.usage == 0x24 ? 1U : 0U;
    const bool looked = call("HidManager.enumerateDevicesMatching", "({PrimaryUsagePage = 65280; PrimaryUsage = 36})");
    if (!looked) found = 0;
    if (!call("HidManager.devices", std::to_string(found)) || found != 1) {
      return fail(3, "Nimbe device match was ambiguous!");
    }
    hasDevice_ = true;
    if (!call("HidDevice.open")) return fail(3, "Could not open Nimbe device.", cause_);
    sensor_.setOpen(kRun, true, now_);
    if (call("HidDevice.setInputReportCallback", "receiver")) hasCallback_ = true;
    const Sensor& sensor = phone_.sensors.front();
    if (!call("HidDevice.setFeatureReportWithID", "0xAB = ab01", sensor.powerRefusal, "0xAB")) {
      return fail(4, "Failed to override power mode to active!", cause_);
    }
    sensor_.setActive(now_);
    if (!call("HidDevice.setFeatureReportWithID", "0xAC = ac01", sensor.streamingRefusal, "0xAC")) {
      return fail(5, "Failed to set streaming mode to images only!", cause_);
    }
    sensor_.setImagesOnly(now_);
    if (call("HidDevice.scheduleWithRunLoop", "default")) scheduled_ = true;
    return true;
  }

  void closeStream() {
    if (!hasDevice_) return;
    if (call("HidDevice.setInputReportCallback", "(null)")) hasCallback_ = false;
    if (call("HidDevice.unscheduleFromRunLoop", "default")) leaveLoop();
    if (!call("HidDevice.close", "0")) return;
    sensor_.setOpen(kRun, false, now_);
    waiting_.clear();
  }
  void leaveLoop() {
    scheduled_ = false;
    signalled_ = false;
    waiting_.clear();
  }

  // Those that wait now; what comes meanwhile is for the next round.
  void deliver() {
    for (std::size_t count = waiting_.size(); count > 0 && !waiting_.empty(); --count) {
      const Input input = waiting_.front();
      waiting_.pop_front();
      if (!hasCallback_) continue;
      if (!input.report.error.empty()) {
        closeStream();
        handleError(input.report.error);
      } else if (input.report.id == 0x76 && input.report.length >= 792) {
        handleImage(imageText(input));
      }
    }
  }
  std::string imageText(const Input& input) const {
    const std::uint32_t frame = phone_.sensors.front().firstFrameID + static_cast<std::uint32_t>(input.number);
    return "{frameID = " + std::to_string(frame) + "; " + scans(input.number) + "; tmonDataInC = " + kCelsius +
           "; timestampInMilliseconds = " + std::to_string(input.sent / 1'000'000) + '}';
  }
  void handleImage(const std::string& image) {
    if (!request_.receiver) {
      images_.push_back(image);
      if (images_.size() >= request_.images) stopLoop();
    } else if (*request_.receiver != Receiver::kNone) {
      say("delegate handleImage " + image + at());
      if (*request_.receiver == Receiver::kCloses) closeStream();
    }
  }
  void handleError(const std::string& error) {
    if (!request_.receiver) {
      asyncError_ = error;
      stopLoop();
    } else if (*request_.receiver != Receiver::kNone) {
      say("delegate streamDidError " + error + at());
    }
  }

  // The two kinds of runs.
  void watchStream() {
    const bool opened = openStream();
    say(opened ? "opened" : "not opened");
    sayError(opened);
    if (opened) sayEndOfLoop(runLoop(static_cast<Time>(request_.timeout) * kSecond));
    closeStream();
    say("closed");
    closeStream();
  }

  bool displayIsPowered() {
    const Display& display = phone_.display;
    const std::string absent = "absent";
    if (!call("FramebufferService.mainDisplay", "", display.present ? "" : absent)) {
      return fail(2, "Could not get the main display to determine device power state.");
    }
    if (!call("Display.registryService", "", display.hasRegistryEntry ? "" : absent)) {
      return fail(2, "Could not get the frame buffer to determine device power state.");
    }
    const std::string property = "DSPLY Debug Info";
    if (!call("RegistryService.registryProperty", property, display.hasProperty ? "" : absent, property) ||
        display.power == Power::kUnknown) {
      return fail(2, "Could not find the display power state.");
    }
    return display.power == Power::kOn || fail(2, "The display is not powered.");
  }
  bool setUp() {
    if (!displayIsPowered()) return false;
    return call("RunLoops.currentRunLoop") || fail(1, "Nimbe is a HID device that requires a current run loop.");
  }

  bool capture() {
    if (!openStream()) return false;
    sayOfLoop("makeObserver of 268435455, repeating, order 0");
    sayOfLoop("addObserver common");
    const Time limit = request_.timeout > static_cast<std::uint64_t>(kNever / kSecond)
                           ? kNever
                           : static_cast<Time>(request_.timeout) * kSecond;
    End end = End::kFinished;
    try {
      end = runLoop(limit);
      closeStream();
    } catch (const Stall&) {
      sayOfLoop("removeObserver common");
      throw;
    }
    sayEndOfLoop(end);
    sayOfLoop("removeObserver common");
    if (end == End::kTimedOut) return fail(6, "Timed out after " + std::to_string(request_.timeout) + " seconds.");
    error_ = asyncError_;
    return asyncError_.empty();
  }
  void runExperiment() {
    const bool isSetUp = setUp();
    say(isSetUp ? "set up" : "not set up");
    sayError(isSetUp);
    if (!isSetUp) return;
    const bool captured = capture();
    say(captured ? "returned a result" : "returned nothing");
    sayError(captured);
    if (!captured) return;
    std::string list;
    for (const std::string& image : images_) list += (list.empty() ? "" : ", ") + image;
    say("images = (" + list + ')');
  }

  // What the run has left behind: what stands on the loop, and whether the sensor goes on sending while the bench does
  // not have it open.
  void lookAfterwards(bool returned) {
    stopDone_ = true;
    loopRuns_ = false;
    sayLeft();
    if (returned) probeTwice();
    sensor_.setOpen(kRun, false, now_);
    leaveLoop();
    sayLeft();
    probeTwice();
  }
  void sayLeft() { say("left on the loop: " + std::to_string(scheduled_ ? 1 : 0) + " sources, 0 observers"); }
  void probeTwice() {
    for (int i = 0; i < 2; ++i) {
      sleepUntil(now_ + 26 * period() / 10);
      probe();
    }
  }
  Time period() const { return kSecond / sensorTraits().rate; }
  const Sensor& sensorTraits() const { return phone_.sensors.empty() ? kNoSensor : phone_.sensors.front(); }
  void probe() {
    if (phone_.sensors.empty() || sensor_.isGone()) return say("probe: no device");
    benchSees_.reset();
    sensor_.setOpen(kBench, true, now_);
    if (sensorTraits().powerRefusal.empty()) sensor_.setActive(now_);
    if (sensorTraits().streamingRefusal.empty()) sensor_.setImagesOnly(now_);
    const Time deadline = now_ + 15 * period() / 10;
    while (!benchSees_ && comesBy(deadline)) happen();
    if (!benchSees_) now_ = deadline;
    sensor_.setOpen(kBench, false, now_);
    say("probe: " + (benchSees_ ? describe(*benchSees_) : "nothing"));
  }
  std::string describe(const Input& input) const {
    if (!input.report.error.empty()) return input.report.error;
    if (input.report.length < 8) return std::to_string(input.report.length) + " bytes";
    return "frame " + std::to_string(sensorTraits().firstFrameID + static_cast<std::uint32_t>(input.number));
  }

  const Phone& phone_;
  const Request& request_;
  const std::vector<Failure>& failures_;
  std::vector<std::uint64_t> taken_;
  std::vector<std::uint64_t> fired_;
  const bool reportsAreInTime_;
  bool metATie_ = false;
  bool hasPlaceForError_ = true;

  std::string told_;
  std::size_t calls_ = 0;
  std::string cause_;  // of the last call
  std::string error_;  // of the setup or the run

  Time now_ = 0;
  SensorModel sensor_;
  bool hasDevice_ = false;
  bool hasCallback_ = false;
  bool scheduled_ = false;
  std::deque<Input> waiting_;
  bool signalled_ = false;
  bool otherIsSignalled_ = request_.others.source.has_value();
  bool stopDone_ = false;
  bool loopRuns_ = false;
  bool stopped_ = false;
  std::optional<Input> benchSees_;

  std::vector<std::string> images_;
  std::string asyncError_;
};

const Sensor Run::kNoSensor{};

}  // namespace

std::vector<Prediction> predict(const Phone& phone, const Request& request, const std::vector<Failure>& failures,
                                bool hasPlaceForError) {
  Run inTime(phone, request, failures, true);
  std::vector<Prediction> all{inTime.predict(hasPlaceForError)};
  if (inTime.metATie()) {
    const Prediction tooLate = Run(phone, request, failures, false).predict(hasPlaceForError);
    if (tooLate != all.front()) all.push_back(tooLate);
  }
  return all;
}

}  // namespace quazor::sensor_oracle
