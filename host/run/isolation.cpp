#include "host/run/isolation.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/plugin/plugin_loader.h"
#include "host/record/run_event_json.h"
#include "host/run/child_connection.h"
#include "host/run/event_order.h"
#include "host/run/frame_teller.h"
#include "host/run/log_limit.h"
#include "host/system/identity.h"
#include "host/system/shared_counter.h"
#include "host/system/supervision.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;
using Moment = Supervision::Moment;
using SteadyClock = std::chrono::steady_clock;
using namespace std::chrono_literals;

// Limits, in lines and bytes, on the standard output of a plug-in that becomes log lines.
constexpr std::size_t kMaxOutputLines = 10'000;
constexpr std::size_t kMaxOutput = 4'000'000;

class EventsToConnection final : public RunEventSink {
 public:
  explicit EventsToConnection(const ConnectionWriter& connection) : connection_(connection) {}

  void onEvent(const RunEvent& event) override { connection_.say(eventJson(event)); }

 private:
  const ConnectionWriter& connection_;
};

// The parent's side of one run in a separate process.
class IsolatedRun {
 public:
  IsolatedRun(const Diagnostic& diagnostic, const Deadlines& deadlines, const IsolationOptions& options,
              std::string token, SharedRunState& shared, Progress& progress, RunEventSink& events)
      : diagnostic_(diagnostic),
        deadlines_(deadlines),
        grace_(options.grace),
        heartbeat_(options.heartbeat),
        onInterrupt_(options.onInterrupt),
        token_(std::move(token)),
        interrupted_(shared.interrupted),
        progress_(progress),
        events_(events) {
    if (shared.frames != nullptr) frames_.emplace(*shared.frames, events);
    restartDeadline();
  }

  Supervision supervision(const WatchedSignals& signals) {
    Supervision supervision;
    supervision.takeLine = [this](std::string_view line) { return take(line); };
    supervision.takeOutput = [this](std::string_view line) { takeOutput(line); };
    supervision.deadline = [this] { return deadline_; };
    // A process that is about to end may do so before an interrupt ends it.
    supervision.isDone = [this, &signals] { return order_.isCompleted() && signals.requestsToEnd() > 0; };
    supervision.mayFinish = [this] { return interrupt(); };
    supervision.tick = [this] {
      progress_.update();
      beat();
      areFramesUrgent_ = frames_ && order_.hasBegun() && frames_->update();
    };
    supervision.isUrgent = [this] { return areFramesUrgent_; };
    return supervision;
  }

  bool isCompleted() const { return order_.isCompleted(); }

  // `leftOut` is the number of log lines that the process did not send.
  void conclude(const Supervised& end, std::uint64_t leftOut) {
    if (frames_ && order_.hasBegun()) frames_->end();
    if (leftOut > 0) events_.onEvent(leftOutLine(leftOut, time_));
    if (droppedLines_ > 0) log(formatMessage("%@ more lines of output were dropped", droppedLines_));
    if (isInterrupted()) {  // the failure was told at once
      if (!order_.isCompleted()) tellAboutTeardown();
      if (order_.isCompleted() && endedWell({SupervisionEnd::kEnded, end.end})) events_.onEvent(DiagnosticCompleted{});
      return;
    }
    if (order_.isCompleted() && endedWell(end)) {
      events_.onEvent(DiagnosticCompleted{});
      return;
    }
    const std::string what = order_.isCompleted() ? diagnostic_.name + ", after its results," : during();
    events_.onEvent(Failed{order_.stage(), errorOf(end, what, deadlines_.of(order_.stage()))});
  }

 private:
  bool take(std::string_view line) {
    std::optional<RunEvent> event;
    try {
      event = eventFrom(documentIn(line, token_));
    } catch (const Json::exception&) {
    } catch (const InputError&) {
    }
    if (!event || !order_.accepts(*event)) return false;
    if (const auto* const logged = std::get_if<Logged>(&*event)) {
      time_ = logged->line.time;
    } else if (std::holds_alternative<StageStarted>(*event) || order_.isBetweenStages()) {
      // Between two stages each event extends the deadline, because their number is finite. Log lines do not: they may
      // never end.
      restartDeadline();
    }
    if (!order_.isCompleted()) events_.onEvent(*event);  // conclude() decides about the completion
    return true;
  }

  void takeOutput(std::string_view line) {
    const bool isTooMuch = outputLines_ == kMaxOutputLines || line.size() > kMaxOutput - output_;
    if (isTooMuch || droppedLines_ > 0) {
      ++droppedLines_;
      return;
    }
    ++outputLines_;
    output_ += line.size();
    log("output: " + std::string(line));
  }

  void log(std::string text) { events_.onEvent(Logged{{time_, LogLevel::kDefault, std::move(text), dateNow()}, true}); }

  void beat() {
    const Moment now = SteadyClock::now();
    if (heartbeat_.count() == 0 || now - lastBeat_ < heartbeat_) return;
    lastBeat_ = now;
    events_.onEvent(Heartbeat{order_.stage(), now - begin_, dateNow()});
  }

  std::string during() const { return formatMessage("the stage %@ of %@", nameOf(order_.stage()), diagnostic_.name); }

  bool isInterrupted() const { return isInterrupted_; }

  // True from the beginning of the setup, which may change the hardware, to that of the teardown, which restores it.
  bool isBeforeTeardown() const { return order_.stage() == Stage::kSetup || order_.stage() == Stage::kRun; }

  // Returns true if the child may go on.
  bool interrupt() {
    isInterrupted_ = true;
    interrupted_.set(1);
    events_.onEvent(Failed{order_.stage(), errorOf({SupervisionEnd::kInterrupted, ProcessEnd()}, during(), {})});
    if (isBeforeTeardown()) {
      graceEnd_ = SteadyClock::now() + grace_;
      deadline_ = std::min(deadline_, graceEnd_);
    }
    const bool mayGoOn = isBeforeTeardown() || order_.stage() == Stage::kTeardown;
    if (mayGoOn && onInterrupt_) onInterrupt_(order_.stage());
    return mayGoOn;
  }

  // After an interrupt and an early end of the child.
  void tellAboutTeardown() {
    if (!isBeforeTeardown() && order_.stage() != Stage::kTeardown) return;
    const std::string_view what = isBeforeTeardown() ? "was not reached" : "did not end";
    const std::string sentence = formatMessage("the teardown of %@ %@", diagnostic_.name, what);
    events_.onEvent(Logged{{time_, LogLevel::kError, sentence, dateNow()}});
  }

  void restartDeadline() {
    deadline_ = SteadyClock::now() + deadlines_.of(order_.stage());
    const bool beganTooLate = isInterrupted() && !order_.isBetweenStages() && order_.stage() != Stage::kTeardown;
    // The child began the stage before it saw the interrupt.
    if (beganTooLate) deadline_ = isBeforeTeardown() ? graceEnd_ : SteadyClock::now();
  }

  const Diagnostic& diagnostic_;
  const Deadlines& deadlines_;
  const std::chrono::nanoseconds grace_;
  const std::chrono::nanoseconds heartbeat_;
  const std::function<void(Stage)> onInterrupt_;
  const std::string token_;
  SharedCounter& interrupted_;  // 1 after an interrupt; for the process, which may write anything to it
  Progress& progress_;
  RunEventSink& events_;
  EventOrder order_;
  std::optional<FrameTeller> frames_;  // nothing: frames are not told
  bool areFramesUrgent_ = false;
  bool isInterrupted_ = false;
  const Moment begin_ = SteadyClock::now();
  Moment lastBeat_ = begin_;
  Moment deadline_;
  Moment graceEnd_;                  // of the setup or run that was interrupted
  std::chrono::nanoseconds time_{};  // time of the last log line
  std::size_t outputLines_ = 0;      // lines kept
  std::size_t output_ = 0;           // bytes kept
  std::size_t droppedLines_ = 0;
};

// An interrupt ends a process that has sent its results but does not end.
Supervised withInterrupt(Supervised end, bool isInterrupted) {
  if (isInterrupted && !endedWell(end)) end.how = SupervisionEnd::kInterrupted;
  return end;
}

// The plug-ins that the diagnostic needs. Any other plug-in could end the process.
std::vector<std::filesystem::path> pluginsFor(const Diagnostic& diagnostic,
                                              std::vector<std::filesystem::path> plugins) {
  if (diagnostic.plugins.empty()) return plugins;
  std::erase_if(plugins, [&needed = diagnostic.plugins](const std::filesystem::path& file) {
    return std::find(needed.begin(), needed.end(), file) == needed.end();
  });
  return plugins;
}

// Runs in the child: returns the registered diagnostic with its factories, or nothing after reporting a failure.
std::optional<Diagnostic> loadDiagnostic(const IsolationOptions& options, const Diagnostic& wanted,
                                         RunEventSink& events) {
  std::optional<Diagnostic> found;
  events.onEvent(StageStarted{Stage::kLoad, dateNow()});
  std::string problem = "the plug-ins no longer register " + wanted.name;
  try {
    loadSomePlugins(pluginsFor(wanted, options.plugins));
    found = registeredDiagnostic(QZLab::defaultLab(), wanted);
  } catch (const CommandError& refusal) {
    problem = refusal.what();
  }
  if (!found) events.onEvent(Failed{Stage::kLoad, hostError(HostErrorCode::kNothingMade, problem)});
  events.onEvent(StageEnded{Stage::kLoad, std::nullopt, dateNow()});
  return found;
}

// Copies the phone's frame count to shared memory for as long as the phone exists.
void countFrames(const std::weak_ptr<const Phone>& phone, SharedCounter& counter) {
  std::thread([phone, &counter] {
    while (const std::shared_ptr<const Phone> one = phone.lock()) {
      counter.set(one->framesDelivered());
      std::this_thread::sleep_for(50ms);
    }
  }).detach();
}

}  // namespace

bool superviseRun(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                  const ResolvedParameters& parameters, const std::function<void(RunEventSink& toParent)>& body,
                  SharedRunState& shared, Progress& progress, RunEventSink& events) {
  const Deadlines deadlines(parameters, options.deadlines);
  std::string token;
  const auto speak = [&body, &token, &shared](int descriptor) {
    const ConnectionWriter connection(descriptor, token, shared.lost);
    EventsToConnection toParent(connection);
    body(toParent);
  };
  std::optional<ChildProcess> child;
  try {
    token = randomIdentifier();
    child.emplace(signals, speak, options.memory, isCleanupProcess);
  } catch (const std::system_error& problem) {
    events.onEvent(Failed{Stage::kLoad,
                          hostError(HostErrorCode::kNoProcess,
                                    "the process of " + diagnostic.name + " could not be created: " + problem.what())});
    return true;
  }
  IsolatedRun run(diagnostic, deadlines, options, token, shared, progress, events);
  Supervised end = supervise(*child, signals, run.supervision(signals));
  child.reset();  // ends what the process has left behind
  end.lostConnection = shared.lost.get() != 0;
  end = withInterrupt(end, run.isCompleted() && signals.requestsToEnd() > 0);
  run.conclude(end, shared.leftOut.get());
  return end.how != SupervisionEnd::kInterrupted;
}

bool runIsolated(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                 const ResolvedParameters& parameters, const RunOptions& runOptions, const QZExperimentResult* result,
                 Progress& progress, RunEventSink& events) {
  SharedCounter frames;
  SharedRunState shared;
  if (runOptions.trace.isOn && result == nullptr) {
    shared.frames = std::make_shared<FrameRings>(runOptions.trace.framesPerStep);
  }
  if (progress.isShown()) progress.countFrames([&frames] { return frames.get(); });
  const auto body = [&](RunEventSink& everything) {
    LimitedLog toParent(everything, runOptions.logLimit, shared.leftOut);
    const std::optional<Diagnostic> loaded = loadDiagnostic(options, diagnostic, toParent);
    if (!loaded) {
      toParent.onEvent(DiagnosticCompleted{});
    } else if (result != nullptr) {
      analyzeResult(*loaded, parameters, *result, runOptions.logLevel, toParent);
    } else {
      RunOptions watched = runOptions;
      watched.frames = shared.frames;
      watched.isInterrupted = [&shared] { return shared.interrupted.get() != 0; };
      if (progress.isShown()) {
        watched.watchPhone = [&frames](const std::shared_ptr<const Phone>& phone) { countFrames(phone, frames); };
      }
      runDiagnostic(*loaded, parameters, watched, toParent);
    }
  };
  return superviseRun(options, signals, diagnostic, parameters, body, shared, progress, events);
}

}  // namespace quazor
