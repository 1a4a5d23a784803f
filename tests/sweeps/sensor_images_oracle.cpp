#include "tests/sweeps/sensor_images_oracle.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>
#include <map>
#include <numbers>
#include <optional>
#include <string_view>

namespace quazor::sensor_oracle {

namespace {

using Time = std::int64_t;

constexpr Time kSecond = 1'000'000'000;
constexpr Time kNever = std::numeric_limits<Time>::max();
constexpr std::string_view kFailed = " -> failed";
constexpr std::string_view kNeverReturned = "never returned: The simulated phone waits for ever: ";

// Thrown if a run breaks a rule, after which it cannot be parsed further.
struct Broken {
  std::string rule;
};
// Thrown if the trace says that the run never returned.
struct NeverReturned {
  std::string why;
};
// Thrown if the run can only throw.
struct Raises {};

// A line of the trace; for a call, without its time.
struct Line {
  std::string text;
  std::optional<Time> at;
  bool failed = false;
};

Line lineOf(std::string_view text) {
  Line line;
  line.failed = text.ends_with(kFailed);
  if (line.failed) text.remove_suffix(kFailed.size());
  if (const std::size_t at = text.rfind(" at "); at != std::string_view::npos) {
    Time time = 0;
    const char* const end = text.data() + text.size();
    const auto [last, problem] = std::from_chars(text.data() + at + 4, end, time);
    if (problem == std::errc() && last == end) {
      line.at = time;
      text = text.substr(0, at);
    }
  }
  line.text = text;
  return line;
}

std::vector<Line> linesOf(std::string_view text) {
  std::vector<Line> lines;
  while (!text.empty()) {
    const std::size_t end = std::min(text.find('\n'), text.size() - 1);
    lines.push_back(lineOf(text.substr(0, end)));
    text.remove_prefix(end + 1);
  }
  return lines;
}

// Removes the number at the beginning of the text.
std::uint64_t takeNumber(std::string_view& text) {
  std::uint64_t number = 0;
  const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (problem != std::errc()) throw Broken{"there is no number where one is due: " + std::string(text.substr(0, 40))};
  text.remove_prefix(static_cast<std::size_t>(end - text.data()));
  return number;
}

void takeWord(std::string_view& text, std::string_view word) {
  if (!text.starts_with(word)) {
    throw Broken{"'" + std::string(word) + "' is due at '" + std::string(text.substr(0, word.size())) + "'"};
  }
  text.remove_prefix(word.size());
}

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

// Reads a run line by line; the results of earlier calls determine which line must be next.
class Reader {
 public:
  Reader(const Known& known, const std::string& told) : known_(known), lines_(linesOf(told)) {}

  void read() {
    try {
      known_.receiver == Receiver::kExperiment ? readExperiment() : readStream();
    } catch (const Raises&) {
      expect("raised No HID Manager available?!");
      readOutcome(true);
    } catch (const NeverReturned& end) {
      returned_ = false;
      readOutcome(errorIsUntouched_);
      const bool isEndless = known_.timeout > static_cast<std::uint64_t>(kNever / kSecond);
      if (!end.why.ends_with(" hangs") && !isEndless) throw Broken{"the run waits for ever, and nothing hangs"};
    }
    expect("ended");
    if (next_ < lines_.size()) readAfterwards();
    if (next_ < lines_.size()) throw Broken{"the run goes on after its end: " + lines_[next_].text};
  }

 private:
  // The next line, whose time must not precede that of the previous line.
  const Line& peek() const {
    static const Line kNothing{"", std::nullopt, false};
    return next_ < lines_.size() ? lines_[next_] : kNothing;
  }
  bool comes(std::string_view beginning) const { return peek().text.starts_with(beginning); }
  const Line& take() {
    if (next_ >= lines_.size()) throw Broken{"the run ends early"};
    const Line& line = lines_[next_++];
    if (line.at && *line.at < now_) throw Broken{"the time goes backwards at: " + line.text};
    now_ = line.at.value_or(now_);
    return line;
  }
  const Line& expect(const std::string& text) {
    if (peek().text != text) throw Broken{"'" + text + "' is due at '" + peek().text + "'"};
    return take();
  }

  void readIfNeverReturned() {
    if (comes(kNeverReturned)) throw NeverReturned{take().text};
  }
  // Requires that the next call is this one, and returns whether it succeeded.
  bool call(const std::string& text) {
    readIfNeverReturned();
    return !expect(text).failed;
  }

  // The state of the error variable after an outcome.
  void readOutcome(bool isUntouched) {
    if (!known_.hasPlaceForError) {
      expect("no place for an error");
    } else if (isUntouched) {
      expect("error untouched");
    } else {
      readError();
    }
  }
  void readError() {
    const std::string text = take().text;
    if (due_.ownText.empty()) {
      if (!text.starts_with("error ") || !known_.errors.contains(text.substr(6))) {
        throw Broken{"no report gave the error: " + text};
      }
      return;
    }
    const std::string own = "error QZNimbeImageExperimentErrorDomain code " + due_.ownText;
    if (text == own && (!due_.hasCause || known_.mayFailSilently)) return;
    const std::string before = own + ", caused by ";
    if (!due_.hasCause || !text.starts_with(before) || !known_.errors.contains(text.substr(before.size()))) {
      throw Broken{"'" + own + (due_.hasCause ? ", caused by ...'" : "'") + " is due at '" + text + "'"};
    }
  }
  bool fail(int code, const std::string& message, bool hasCause = false) {
    due_ = {std::to_string(code) + ": " + message, hasCause};
    return false;
  }

  bool readSetUp() {
    if (!call("FramebufferService mainDisplay")) {
      return fail(2, "Could not get the main display to determine device power state.");
    }
    if (!call("Display registryService")) {
      return fail(2, "Could not get the frame buffer to determine device power state.");
    }
    if (!call("RegistryService registryProperty DSPLY Debug Info")) {
      return fail(2, "Could not find the display power state.");
    }
    if (!known_.displayProblem.empty()) return fail(2, known_.displayProblem);
    return call("RunLoops currentRunLoop") || fail(1, "Nimbe is a HID device that requires a current run loop.");
  }

  bool readOpening() {
    if (!call("HidService createManager")) throw Raises{};
    call("HidManager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})");
    readIfNeverReturned();
    const Line devices = take();
    std::string_view found = devices.text;
    takeWord(found, "HidManager devices ");
    if (takeNumber(found) != 1 || devices.failed) return fail(3, "Nimbe device match was ambiguous!");
    hasDevice_ = true;
    isOpen_ = call("display-sensor open");
    if (!isOpen_) return fail(3, "Could not open Nimbe device.", true);
    call("display-sensor setInputReportCallback receiver");
    if (!call("display-sensor setFeatureReportWithID 0xAB = ab01")) {
      return fail(4, "Failed to override power mode to active!", true);
    }
    if (!call("display-sensor setFeatureReportWithID 0xAC = ac01")) {
      return fail(5, "Failed to set streaming mode to images only!", true);
    }
    isScheduled_ = call("display-sensor scheduleWithRunLoop default");
    wasScheduled_ = isScheduled_;
    return true;
  }

  void readClosing() {
    if (!hasDevice_) return;
    if (call("display-sensor setInputReportCallback (null)")) isSilent_ = true;
    if (call("display-sensor unscheduleFromRunLoop default")) {
      isSilent_ = true;
      isScheduled_ = false;
    }
    if (call("display-sensor close 0")) {
      isSilent_ = true;
      isOpen_ = false;
    }
  }
  // Checks that inputs of the sensor may arrive.
  void hear() const {
    if (isSilent_) throw Broken{"something is heard of a sensor that has been closed"};
    if (!isScheduled_) throw Broken{"something is heard of a sensor that is not on the loop"};
  }

  // The result of the run of the loop.
  enum class End { kTimedOut, kStopped, kFinished };
  End readEndOfLoop(Time deadline) {
    const std::string text = take().text;
    if (text == "RunLoop run timed out") {
      if (now_ < deadline) throw Broken{"the loop has timed out before its time"};
      return End::kTimedOut;
    }
    if (text == "RunLoop run stopped") return End::kStopped;
    if (text != "RunLoop run finished") throw Broken{"the loop ends in: " + text};
    if (isScheduled_) throw Broken{"the loop has finished with the sensor on it"};
    return End::kFinished;
  }
  Time readBeginOfLoop() {
    const Time limit = known_.timeout > static_cast<std::uint64_t>(kNever / kSecond)
                           ? kNever
                           : static_cast<Time>(known_.timeout) * kSecond;
    expect("RunLoop runInMode default " + std::to_string(limit) + " ns");
    return limit > kNever - now_ ? kNever : now_ + limit;
  }

  // The run of the experiment; returns whether it has a result.
  bool readCapture() {
    if (!readOpening()) return false;
    expect("RunLoop makeObserver of 268435455, repeating, order 0");
    expect("RunLoop addObserver common");
    const Time deadline = readBeginOfLoop();
    readReports();
    const End end = readEndOfLoop(deadline);
    expect("RunLoop removeObserver common");
    if (end == End::kTimedOut) return fail(6, "Timed out after " + std::to_string(known_.timeout) + " seconds.");
    due_ = {};
    if (end == End::kStopped && stops_ == 0 && !known_.othersUseTheLoop) throw Broken{"nobody stopped the loop"};
    return errors_ == 0;
  }
  // Up to the end of the loop, including the actions at its exit.
  void readReports() {
    for (;;) {
      if (comes("RunLoop stop")) {
        hear();
        take();
        ++stops_;
        continue;
      }
      if (comes("RunLoop removeObserver common")) readStall();
      const bool heard = !isSilent_;
      readClosingInLoop();
      if (!comes("RunLoop stop")) return;
      if (!heard) throw Broken{"an error of a sensor that has been closed"};
      take();
      ++stops_;
      ++errors_;
    }
  }
  void readClosingInLoop() {
    try {
      readClosing();
    } catch (const Broken&) {
      if (comes("RunLoop removeObserver common")) readStall();
      throw;
    }
  }
  // A run that never returns leaves no observer behind.
  [[noreturn]] void readStall() {
    take();
    if (!comes(kNeverReturned)) throw Broken{"the observer goes before the loop has ended"};
    throw NeverReturned{take().text};
  }

  void readExperiment() {
    const bool isSetUp = readSetUp();
    expect(isSetUp ? "set up" : "not set up");
    readOutcome(isSetUp);
    if (!isSetUp) return;
    const bool captured = readCapture();
    expect(captured ? "returned a result" : "returned nothing");
    readOutcome(captured);
    if (captured) readResult();
  }
  void readResult() {
    const std::string text = take().text;
    std::string_view list = text;
    takeWord(list, "images = (");
    std::uint64_t count = 0;
    while (!list.starts_with(")")) {
      if (count++ > 0) takeWord(list, ", ");
      takeImage(list);
    }
    takeWord(list, ")");
    // The last requested image and every later one stop the loop.
    const std::uint64_t wanted = std::max<std::uint64_t>(known_.images, 1);
    if (stops_ != (count < wanted ? 0 : count - wanted + 1)) {
      throw Broken{std::to_string(count) + " images stopped the loop " + std::to_string(stops_) + " times"};
    }
    if (count < wanted && wasScheduled_ && !known_.othersUseTheLoop) throw Broken{"there are too few images"};
  }

  // An image must have the content that the sensor sent, and no report may be missing since the previous one.
  void takeImage(std::string_view& text) {
    takeWord(text, "{frameID = ");
    const std::uint64_t frame = takeNumber(text);
    const std::uint64_t number = static_cast<std::uint32_t>(frame - known_.firstFrameID);
    takeWord(text, "; " + scans(number) + "; tmonDataInC = " + kCelsius + "; timestampInMilliseconds = ");
    const std::uint64_t milliseconds = takeNumber(text);
    takeWord(text, "}");
    if (milliseconds < lastMilliseconds_ || milliseconds > static_cast<std::uint64_t>(now_ / 1'000'000)) {
      throw Broken{"an image of a time when it was not sent"};
    }
    lastMilliseconds_ = milliseconds;
    if (known_.noImages.contains(number)) throw Broken{"an image of a report that holds none"};
    if (!nextReport_ && !known_.startsInTime) nextReport_ = number;
    std::uint64_t due = nextReport_.value_or(0);
    while (known_.noImages.contains(due)) ++due;
    if (number != due) throw Broken{"report " + std::to_string(due) + " is due at " + std::to_string(number)};
    nextReport_ = number + 1;
  }

  void readStream() {
    const bool opened = readOpening();
    expect(opened ? "opened" : "not opened");
    readOutcome(opened);
    if (opened) {
      errorIsUntouched_ = true;
      const Time deadline = readBeginOfLoop();
      while (!comes("RunLoop run")) readDelivery();
      readEndOfLoop(deadline);
    } else {
      errorIsUntouched_ = false;
    }
    readClosing();
    expect("closed");
    readClosing();
  }
  void readDelivery() {
    readIfNeverReturned();
    if (comes("display-sensor setInputReportCallback (null)")) {
      hear();
      readClosing();
      if (known_.receiver == Receiver::kNone) return;
      std::string_view error = take().text;
      takeWord(error, "delegate streamDidError ");
      if (!known_.errors.contains(std::string(error))) throw Broken{"no report gave the error: " + std::string(error)};
      return;
    }
    hear();
    std::string_view image = take().text;
    takeWord(image, "delegate handleImage ");
    takeImage(image);
    if (known_.receiver == Receiver::kNone) throw Broken{"an image without a receiver"};
    if (known_.receiver == Receiver::kCloses) readClosing();
  }

  // The remains of the run before and after the experiment is released.
  void readAfterwards() {
    expect("left on the loop: " + std::to_string(isScheduled_ ? 1 : 0) + " sources, 0 observers");
    if (returned_) readProbes(isOpen_);
    expect("left on the loop: 0 sources, 0 observers");
    readProbes(false);
  }
  // A sensor that is not open sends nothing between two probes.
  void readProbes(bool isOpen) {
    std::optional<std::uint64_t> last;
    for (int i = 0; i < 2; ++i) {
      std::string_view seen = take().text;
      takeWord(seen, "probe: ");
      if (!seen.starts_with("frame ")) {
        last.reset();
        continue;
      }
      takeWord(seen, "frame ");
      const std::uint64_t frame = takeNumber(seen);
      if (last && !isOpen && static_cast<std::uint32_t>(frame) != static_cast<std::uint32_t>(*last + 1)) {
        throw Broken{"the sensor goes on sending after its end"};
      }
      last = frame;
    }
  }

  struct DueError {
    std::string ownText;  // "CODE: MESSAGE"; empty: the error of a report
    bool hasCause = false;
  };

  const Known& known_;
  const std::vector<Line> lines_;
  std::size_t next_ = 0;
  Time now_ = 0;

  DueError due_;
  bool errorIsUntouched_ = true;  // for a run that never returns
  bool returned_ = true;
  bool hasDevice_ = false;
  bool isOpen_ = false;
  bool isScheduled_ = false;
  bool wasScheduled_ = false;
  bool isSilent_ = false;
  std::uint64_t stops_ = 0;   // calls of stop() on the loop by the experiment
  std::uint64_t errors_ = 0;  // errors received instead of reports
  std::optional<std::uint64_t> nextReport_;
  std::uint64_t lastMilliseconds_ = 0;
};

}  // namespace

std::string brokenRule(const Known& known, const std::string& told) {
  try {
    Reader(known, told).read();
  } catch (const Broken& broken) {
    return broken.rule;
  }
  return {};
}

}  // namespace quazor::sensor_oracle
