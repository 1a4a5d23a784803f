#include "tests/sweeps/projector_trace.h"

#include "contract/message_format.h"
#include "contract/unit.h"
#include "tests/support/run_transcript.h"

#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kDomain = "QZCapturePlugInErrorDomain code ";
constexpr std::string_view kReadCounters = "stream get ErrorCounters";

bool isIntakeError(FrameKind kind) {
  return kind != FrameKind::kLit && kind != FrameKind::kUnlit && kind != FrameKind::kUnlitForSafety;
}

// The error with which a frame ends the run; empty for a lit one.
std::string errorOf(FrameKind kind, const std::string& number) {
  const std::string domain(kDomain);
  switch (kind) {
    case FrameKind::kLit: return "";
    case FrameKind::kUnlit: return domain + "206: Frame " + number + " is not illuminated for unknown reason!";
    case FrameKind::kUnlitForSafety: return domain + "213: Frame " + number + " is not illuminated for safety reason!";
    case FrameKind::kWithoutMetadata: return domain + "206: Frame metadata is missing!";
    case FrameKind::kWithWrongMetadata: return domain + "206: Frame metadata is not a dictionary!";
    case FrameKind::kWithIncompleteMetadata:
      return domain + "206: Could not create a frame description of frame " + number + "!";
  }
  return "an unknown kind";
}

// Checks the lines from the first to the last.
class Follower {
 public:
  Follower(const ProjectorPlan& plan, const ProjectorRun& run) : plan_(plan), run_(run) {}

  std::string problem() {
    while (problem_.empty() && at_ < run_.lines.size()) follow(run_.lines[at_++]);
    if (problem_.empty()) judgeEnd();
    if (problem_.empty()) judgeBuffers();
    if (problem_.empty()) judgeOutcome();
    return problem_;
  }

 private:
  void follow(const std::string& line) {
    if (line == "log debug: Received frame " + std::to_string(counted_ + 1) + ".") return count();
    if (line.starts_with("frame ")) return read(line);
    if (line == "log debug: Processing frame " + std::to_string(examined_ + 1) + ".") return examine();
    if (line.starts_with("log default: Received frame that won't be counted")) return pass(line);
    if (line.starts_with("log debug: Processing event ")) return takeEvent(line);
    if (line == "log error: Timeout has been reached.") {
      ++timeouts_;
      return end("");
    }
    if (line == "stream stop" || line == "stream stop -> failed") return finishStop(line);
    if (line == "host release") {
      expect(signalled_, "the host got its run back before the signal");
      hostIsGone_ = true;
      return;
    }
    expect(false, "line " + std::to_string(at_) + " is out of place: " + line);
  }

  // The next delivery is received.
  std::size_t takeIn(bool isEvent) {
    expect(!isAlone(), "something was taken in by an experiment that should be gone");
    expect(taken_ < run_.delivered.size(), "more was taken in than was delivered");
    if (!problem_.empty()) return 0;
    const std::size_t number = run_.delivered[taken_++];
    expect(plan_.deliveries[number].isEvent == isEvent, "something was taken in out of its order");
    return number;
  }

  void count() {
    expect(!stopping_, "a frame was counted after the stop");
    expect(!reading_, "two frames were taken in at once");
    const std::size_t number = takeIn(false);
    ++counted_;
    reading_ = number;
  }

  void read(const std::string& line) {
    expect(reading_ && line == "frame " + std::to_string(*reading_) + " attachment MetadataDictionary",
           "not the frame that was counted was read: " + line);
    if (!problem_.empty()) return;
    const FrameKind kind = plan_.deliveries[*reading_].kind;
    if (isIntakeError(kind)) {
      end(errorOf(kind, std::to_string(counted_)));
    } else {
      handedOn_.push_back({*reading_, counted_});
    }
    reading_.reset();
  }

  void examine() {
    expect(examined_ < handedOn_.size(), "a frame was examined that was not handed on");
    if (!problem_.empty()) return;
    const auto& [delivery, number] = handedOn_[examined_++];
    const FrameKind kind = plan_.deliveries[delivery].kind;
    const std::string text = std::to_string(number);
    if (kind != FrameKind::kLit) {
      expectNext("log debug: Frame,Date,MediaTime(s),", true);
      expectNext("");
      expectNext(text + ',', true);
      expectNext("");
      expectNext("log error: Frame " + text + " failed projection validation.");
      end(errorOf(kind, text));
    } else if (number >= plan_.stopCount) {
      expectNext("log debug: Frame " + text + " is the last frame.");
      end("");
    }
  }

  void pass(const std::string& line) {
    expect(stopping_, "a frame was not counted before the stop");
    const std::size_t number = takeIn(false);
    expect(line.ends_with(" at time: " + std::to_string(number)), "another frame's time was told: " + line);
  }

  void takeEvent(const std::string& line) {
    const std::string number = std::to_string(takeIn(true));
    expect(line == "log debug: Processing event " + number + " at " + number + ".000000.", "not this event: " + line);
  }

  // An event ends the run, with an error or, if that is empty, without one. The first such event stops the stream.
  void end(std::string error) {
    if (stopping_) return;
    stopping_ = true;
    error_ = std::move(error);
    expectNext(kReadCounters);
  }

  void finishStop(const std::string& line) {
    expect(stopping_ && !signalled_, "the stream was stopped twice");
    expect((line == "stream stop") == plan_.stops, "the stream stopped otherwise than planned");
    if (!error_.empty()) {
      expectNext(
          "log debug: We are stopping because there was an error. If stopping the stream fails, it will be ignored.");
    } else if (!plan_.stops) {
      expectNext("log debug: There was an error stopping the stream.");
      error_ = std::string(kDomain) + "205: Failed to stop stream!";
    } else if (!plan_.countersAreRead) {
      error_ = std::string(kDomain) + "210: Failed to get error counters from ferrin.";
    }
    expectNext("semaphore signal");
    signalled_ = true;
  }

  // True if the experiment has no owner: the host, the timeout and all pending frames have released it.
  bool isAlone() const { return hostIsGone_ && timeouts_ == 1 && examined_ == handedOn_.size(); }

  void judgeEnd() {
    expect(signalled_ && hostIsGone_, "the run did not end");
    expect(timeouts_ == 1, "the timeout ran " + std::to_string(timeouts_) + " times");
    expect(examined_ == handedOn_.size(), "a frame that was handed on was not examined");
    expect(taken_ == run_.delivered.size() || isAlone(), "something that was delivered was not taken in");
    expect(run_.experimentIsGone, "somebody still holds the experiment");
  }

  void judgeBuffers() {
    std::vector<int> references(plan_.deliveries.size(), 0);
    for (const std::size_t number : run_.delivered) references[number] = plan_.deliveries[number].isEvent ? 0 : 1;
    for (const auto& frame : handedOn_) references[frame.first] = 0;
    expect(run_.references == references, "the wrong buffers were given back");
  }

  void judgeOutcome() {
    const bool failed = run_.result == nullptr;
    expect(failed != error_.empty(), failed ? "the run failed" : "the run succeeded");
    if (!error_.empty()) {
      expect(run_.error != nullptr && errorChain(run_.error) == error_, "not the first error was told");
      return;
    }
    expect(run_.error == callersOwnError(), "an error was told beside a result");
    if (!problem_.empty()) return;
    OrderedMap<Measurement> measurements;
    measurements.set("FrameCount", Measurement(static_cast<double>(counted_), QZDimensionlessUnit::frames()));
    double counter = 0;
    for (const char* name : {"I2C", "MIPI", "LPDP", "UART", "SIF", "Projector"}) {
      measurements.set(name, Measurement(++counter, QZDimensionlessUnit::errors()));
    }
    measurements.set("Channel 0", Measurement(5, QZDimensionlessUnit::events()));
    expect(run_.result->measurements() == measurements, "the result's measurements are wrong");
    expect(run_.result->auxiliaryData().empty(), "the result has auxiliary data");
  }

  void expectNext(std::string_view text, bool isBeginning = false) {
    if (!problem_.empty()) return;
    const std::string_view next = at_ < run_.lines.size() ? std::string_view(run_.lines[at_]) : "nothing";
    ++at_;
    expect(isBeginning ? next.starts_with(text) : next == text,
           "line " + std::to_string(at_) + " is \"" + std::string(next) + "\" and not \"" + std::string(text) + '"');
  }

  void expect(bool holds, std::string_view problem) {
    if (!holds && problem_.empty()) problem_ = problem;
  }

  const ProjectorPlan& plan_;
  const ProjectorRun& run_;
  std::string problem_;
  std::size_t at_ = 0;     // index of the next line
  std::size_t taken_ = 0;  // deliveries received
  std::uint64_t counted_ = 0;
  std::optional<std::size_t> reading_;                                // the frame that was counted and not yet read
  std::vector<std::pair<std::size_t, std::uint64_t>> handedOn_ = {};  // index of the delivery, and frame number
  std::size_t examined_ = 0;
  int timeouts_ = 0;
  bool stopping_ = false;
  bool signalled_ = false;
  bool hostIsGone_ = false;
  std::string error_;  // the expected error of the run; empty for a result
};

}  // namespace

std::string describe(const ProjectorPlan& plan) {
  std::string text = formatMessage("stop count %lu, timeout %@ s", plan.stopCount, plan.timeout);
  if (plan.timerIsSlow) text += ", slow timer";
  if (plan.cameraIsSlow) text += ", slow camera";
  if (!plan.stops) text += ", stop refused";
  if (!plan.countersAreRead) text += ", no counters";
  for (const Delivery& delivery : plan.deliveries) {
    text += formatMessage("\n  %@ by thread %@ at %@ ns", delivery.isEvent ? "event" : nameOf(delivery.kind),
                          delivery.thread, delivery.at.count());
  }
  return text;
}

std::string problemOf(const ProjectorPlan& plan, const ProjectorRun& run) { return Follower(plan, run).problem(); }

}  // namespace quazor
