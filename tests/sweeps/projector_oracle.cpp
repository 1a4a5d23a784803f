#include "tests/sweeps/projector_oracle.h"

#include <charconv>
#include <utility>

namespace quazor::projector_oracle {

namespace {

constexpr const char* kInfraredPort = "FrontFacingInfraredCamera";

std::string captureError(int code, const std::string& message) {
  return "QZCapturePlugInErrorDomain code " + std::to_string(code) + ": " + message;
}
std::string reportError(const std::string& message) { return "QZTelemonErrorDomain code 100: " + message; }

// The shortest text that parses to the same number.
std::string shortest(double number) {
  char text[40];
  return {text, std::to_chars(text, text + sizeof text, number).ptr};
}

bool contains(const std::string& text, const char* part) { return text.find(part) != std::string::npos; }

// Counts the calls of a run and writes their trace.
class Calls {
 public:
  explicit Calls(const Failures& failures) : failures_(failures) {}

  // The next call; returns whether it succeeds. cause() is then the continuation of the run's error.
  bool make(const std::string& line) {
    const auto failure = failures_.find(++count_);
    const bool fails = failure != failures_.end();
    cause_ = fails && failure->second ? ", caused by " + *failure->second : "";
    lines_ += line + (fails ? " -> failed\n" : "\n");
    return !fails;
  }
  void tell(const std::string& line) { lines_ += line + '\n'; }

  const std::string& cause() const { return cause_; }
  std::size_t count() const { return count_; }
  std::string takeLines() { return std::exchange(lines_, ""); }

 private:
  const Failures& failures_;
  std::size_t count_ = 0;
  std::string lines_;
  std::string cause_;
};

std::string errorLine(bool hasPlace, const std::string& error) {
  if (!hasPlace) return "no place for an error\n";
  return error.empty() ? "error untouched\n" : "error " + error + '\n';
}

// Measurements in the order of their first assignment.
class Measurements {
 public:
  void set(const std::string& name, const std::string& text) {
    for (auto& [known, old] : entries_) {
      if (known == name) {
        old = text;
        return;
      }
    }
    entries_.emplace_back(name, text);
  }
  std::string text() const {
    std::string text;
    for (const auto& [name, value] : entries_) text += name + " = " + value + '\n';
    return text;
  }

 private:
  std::vector<std::pair<std::string, std::string>> entries_;
};

// A run of the fault experiment, step by step. Each step returns whether the run continues.
class FaultRun {
 public:
  FaultRun(const Phone& phone, const Request& request, const Failures& failures)
      : phone_(phone), request_(request), calls_(failures) {}

  Prediction predict(bool hasPlace) {
    const bool succeeded = open() && configure() && subscribe() && stream() && subtract();
    Prediction prediction;
    prediction.told = calls_.takeLines() + (succeeded ? "returned a result\n" : "returned nothing\n");
    prediction.told += errorLine(hasPlace, error_);
    if (succeeded) prediction.told += measurements();
    if (started_) passTimeUntil(nanoseconds(request_.watched));
    prediction.told += "afterwards\n" + calls_.takeLines();
    prediction.told += teardown(hasPlace);
    prediction.told += "buffers held: " + (held_.empty() ? "none" : held_) + '\n';
    prediction.calls = calls_.count();
    return prediction;
  }

 private:
  static std::int64_t nanoseconds(double seconds) { return static_cast<std::int64_t>(seconds * 1e9); }
  // The arrival time of a frame: the end of its thirtieth of a second, rounded up to a nanosecond.
  static std::int64_t timeOf(std::uint64_t frame) {
    return static_cast<std::int64_t>((frame * 1'000'000'000 + 29) / 30);
  }

  bool fail(const std::string& error) {
    error_ = error;
    return false;
  }
  bool require(const std::string& line, int code, const std::string& message) {
    return calls_.make(line) || fail(captureError(code, message) + calls_.cause());
  }

  bool open() {
    if (!require("service defaultPlugIn", 200, "Failed to get the capture plugin!")) {
      return fail(captureError(200, "Failed to get the capture plugin!"));  // the call cannot store an error
    }
    if (!require("plug-in get device", 200, "Failed to get the capture plugin!")) return false;
    hasDevice_ = true;
    if (!require("device get streams", 202, "Failed to get streams!")) return false;
    for (const PhoneStream& candidate : phone_.streams) {
      if (!require(candidate.id + " get PortType", 202, "Failed to get stream port type!")) continue;
      if (candidate.port != kInfraredPort) continue;
      stream_ = candidate.id;
      return require("device request control (" + stream_ + ')', 203, "Failed to request the ferrin stream!");
    }
    return fail(captureError(202, "Failed to find stream!"));
  }

  bool configure() {
    const struct {
      const char* setting;
      int code;
      const char* message;
    } settings[] = {
        {"InfraredLightSourceConfiguration = {Mode = 2; StructuredLightCurrent = 0; StructuredLightPattern = 1}", 212,
         "Failed to configure structured light!"},
        {"MultipleOutputSupportEnabled = 1", 208, "Failed to enable multiple outputs."},
        {"FormatIndex = 0", 209, "Failed to set format index 0."},
        {"MinimumFrameRate = 30", 207, "Failed to set min frame rate."},
        {"MaximumFrameRate = 30", 207, "Failed to set max frame rate."},
        {"VideoOutputConfigurations = {PrimaryScaler = {AttachRaw = 1}}", 208, "Failed to configure primary scalar."},
        {"VideoOutputsEnabled = {PrimaryScaler = 1}", 208, "Failed to enable primary scalar."},
        {"AEEnabled = 0", 211, "Failed to diable AE."},
        {"VideoOutputHandlers = {PrimaryScaler = {PixelBufferHandler = <PixelBufferHandler>; "
         "EventHandler = <EventHandler>}}",
         208, "Failed to set callback handlers."},
    };
    for (const auto& [setting, code, message] : settings) {
      if (!require(stream_ + " set " + setting, code, message)) return false;
    }
    return true;
  }

  bool subscribe() {
    const std::string message = "Cannot get Telemon before streaming.";
    if (!calls_.make("ReportFacility reportWithOnlySimpleChannels")) return fail(reportError(message) + calls_.cause());
    std::size_t kept = 0;
    for (const PhoneChannel& channel : phone_.channels) kept += isWatched(channel) ? 1 : 0;
    calls_.tell("ReportChannelSet reportByFilteringChannels " + std::to_string(kept));
    return calls_.make("ReportChannelSet snapshot") || fail(reportError(message) + calls_.cause());
  }
  static bool isWatched(const PhoneChannel& channel) { return channel.subGroup == "K42ISP Events"; }

  // From the start to the end of the wait.
  bool stream() {
    if (!require(stream_ + " start", 204, "Failed to start streaming ferrin.")) return false;
    started_ = true;
    running_ = true;
    while (!stopped_) passOneMoment();
    if (streamError_.empty()) return true;
    return fail(streamError_);
  }

  // The next event: a frame, the camera's event or the timeout.
  void passOneMoment() {
    now_ = nextMoment();
    if (now_ == kEventTime && running_ && phone_.eventAfterTenMilliseconds) {
      calls_.tell("log debug: Processing event " + std::to_string(*phone_.eventAfterTenMilliseconds) + " at 0.010000.");
    }
    if (now_ == timeOf(nextFrame_)) {
      if (running_ && phone_.sendsFrames) takeFrame(nextFrame_);
      ++nextFrame_;
    }
    if (now_ == nanoseconds(request_.timeout)) {
      calls_.tell("log error: Timeout has been reached.");
      stop("");
    }
  }
  std::int64_t nextMoment() const {
    std::int64_t next = timeOf(nextFrame_);
    for (const std::int64_t moment : {kEventTime, nanoseconds(request_.timeout)}) {
      if (moment > now_ && moment < next) next = moment;
    }
    return next;
  }
  void passTimeUntil(std::int64_t end) {
    while (nextMoment() <= end) passOneMoment();
  }

  // A buffer is released only if its frame was passed on to be examined.
  void takeFrame(std::uint64_t comes) {
    if (stopped_) {
      calls_.tell("log default: Received frame that won't be counted at time: " +
                  shortest(static_cast<double>(timeOf(comes)) / 1e9));
      return hold(comes);
    }
    const std::string number = std::to_string(++counted_);
    calls_.tell("log debug: Received frame " + number + '.');
    const auto bad = phone_.frames.find(comes);
    if (bad != phone_.frames.end()) return takeBadFrame(comes, bad->second, number);
    calls_.tell("log debug: Processing frame " + number + '.');
    if (counted_ < request_.frameCount) return;
    calls_.tell("log debug: Frame " + number + " is the last frame.");
    stop("");
  }
  void takeBadFrame(std::uint64_t comes, const PhoneFrame& frame, const std::string& number) {
    switch (frame.fault) {
      case FrameFault::kNoMetadata: hold(comes); return stop(captureError(206, "Frame metadata is missing!"));
      case FrameFault::kNoDictionary:
        hold(comes);
        return stop(captureError(206, "Frame metadata is not a dictionary!"));
      case FrameFault::kIncomplete:
        hold(comes);
        return stop(captureError(206, "Could not create a frame description of frame " + number + '!'));
      case FrameFault::kDark: return findDark(comes, frame, number, 206, "unknown");
      case FrameFault::kDarkForSafety: return findDark(comes, frame, number, 213, "safety");
    }
  }
  void findDark(std::uint64_t comes, const PhoneFrame& frame, const std::string& number, int code, const char* reason) {
    calls_.tell("log debug: Processing frame " + number + '.');
    const std::uint64_t microseconds = (static_cast<std::uint64_t>(timeOf(comes)) + 500) / 1000;
    std::string fraction = std::to_string(microseconds % 1'000'000);
    fraction.insert(0, 6 - fraction.size(), '0');
    calls_.tell(
        "log debug: Frame,Date,MediaTime(s),MetaDataProjectorMode,InfraredLightSource,MetaDataProjectorIndex,"
        "MetaDataProjectorPowerLow,MetaDataProjectorPowerHigh,MetaDataProjectorPowerFlood,MetaDataProjectorProbeMode,"
        "MetaDataProjectorPowerProbeA,MetaDataProjectorPowerProbeB,MetaDataProjectorPulseWidth,FloodActiveTemperature,"
        "NTCTemperatureIdle,NTCTemperatureStandby,NTCTemperatureActive,DIETemperatureIdle,DIETemperatureStandby,"
        "DIETemperatureActive\n\n" +
        number + ",2026-01-01 00:00:00 +0000," + std::to_string(microseconds / 1'000'000) + '.' + fraction + ',' +
        frame.csvFields + '\n');
    calls_.tell("log error: Frame " + number + " failed projection validation.");
    stop(captureError(code, "Frame " + number + " is not illuminated for " + reason + " reason!"));
  }
  void hold(std::uint64_t frame) { held_ += (held_.empty() ? stream_ + ' ' : ", ") + std::to_string(frame); }

  void stop(const std::string& error) {
    if (stopped_) return;
    stopped_ = true;
    const bool read = calls_.make(stream_ + " get ErrorCounters");
    running_ = !calls_.make(stream_ + " stop");
    if (!error.empty()) {
      calls_.tell(
          "log debug: We are stopping because there was an error. If stopping the stream fails, it will be ignored.");
      streamError_ = error;
    } else if (running_) {
      calls_.tell("log debug: There was an error stopping the stream.");
      streamError_ = captureError(205, "Failed to stop stream!");
    } else if (!read) {
      streamError_ = captureError(210, "Failed to get error counters from ferrin.");
    }
  }

  bool subtract() {
    return (calls_.make("ReportChannelSet snapshot") && calls_.make("ReportSnapshot snapshotWithBaseline")) ||
           fail(reportError("Cannot get Telemon delta after streaming.") + calls_.cause());
  }

  std::string measurements() const {
    Measurements measurements;
    measurements.set("FrameCount", std::to_string(counted_) + " frames");
    const char* const names[] = {"I2C", "MIPI", "LPDP", "UART", "SIF", "Projector"};
    for (std::size_t i = 0; i < phone_.errorCounters.size(); ++i) {
      measurements.set(names[i], std::to_string(phone_.errorCounters[i]) + " errors");
    }
    const bool streamed = now_ >= 1'000'000;
    for (const PhoneChannel& channel : phone_.channels) {
      if (!isWatched(channel)) continue;
      const std::uint64_t counted = channel.count && streamed ? channel.countedWhenStreaming : 0;
      measurements.set(channel.name, std::to_string(counted) + " events");
    }
    return measurements.text();
  }

  std::string teardown(bool hasPlace) {
    const bool done = hasDevice_ && calls_.make("device invalidate");
    const std::string error =
        captureError(200, "Failed to invalidate the capture device.") + (hasDevice_ ? calls_.cause() : "");
    return calls_.takeLines() + (done ? "torn down\n" : "not torn down\n") + errorLine(hasPlace, done ? "" : error);
  }

  static constexpr std::int64_t kEventTime = 10'000'000;

  const Phone& phone_;
  const Request& request_;
  Calls calls_;
  std::string error_;  // in the caller's variable; empty if the run stored none

  bool hasDevice_ = false;
  std::string stream_;  // the ID of the selected stream
  bool started_ = false;
  bool running_ = false;
  bool stopped_ = false;
  std::string streamError_;  // the error that ended the stream; empty if there was none
  std::int64_t now_ = -1;    // nanoseconds since the start
  std::uint64_t nextFrame_ = 1;
  std::uint64_t counted_ = 0;
  std::string held_;
};

}  // namespace

Prediction predictFaultRun(const Phone& phone, const Request& request, const Failures& failures,
                           bool hasPlaceForError) {
  return FaultRun(phone, request, failures).predict(hasPlaceForError);
}

Prediction predictPresenceRun(const std::vector<PhoneChannel>& channels, const Failures& failures,
                              bool hasPlaceForError) {
  Calls calls(failures);
  Measurements measurements;
  std::string error;
  std::vector<PhoneChannel> kept;
  for (const PhoneChannel& channel : channels) {
    if (contains(channel.group, "K42ISP") && contains(channel.subGroup, "K42ISP Events")) kept.push_back(channel);
  }
  if (!calls.make("ReportFacility reportWithOnlySimpleChannels")) {
    error = reportError("Could not get simple channels.") + calls.cause();
  } else {
    calls.tell("ReportChannelSet reportByFilteringChannels " + std::to_string(kept.size()));
    if (!calls.make("ReportChannelSet snapshot")) {
      error = reportError("Could not sample the report.") + calls.cause();
      kept.clear();
    }
    for (const PhoneChannel& channel : kept) {
      if (!channel.count) {
        error = reportError("Could not get the count of " + channel.name + '.');
        break;
      }
      measurements.set(channel.name, std::to_string(*channel.count) + " events");
    }
  }
  Prediction prediction;
  prediction.told = calls.takeLines() + (error.empty() ? "returned a result\n" : "returned nothing\n");
  prediction.told += errorLine(hasPlaceForError, error);
  if (error.empty()) prediction.told += measurements.text();
  prediction.calls = calls.count();
  return prediction;
}

}  // namespace quazor::projector_oracle
