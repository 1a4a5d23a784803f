#include "host/run/isolation.h"

#include "base/json/json_limits.h"
#include "base/json/json_line.h"
#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/plugin/plugin_loader.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"
#include "host/run/log_limit.h"
#include "host/system/shared_counter.h"
#include "host/system/supervision.h"
#include "host/text/timestamp.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdlib>
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

// The exit code of a child whose connection was closed.
constexpr int kNoConnection = 113;
// Limits, in lines and bytes, on the standard output of a plug-in that becomes log lines.
constexpr std::size_t kMaxOutputLines = 10'000;
constexpr std::size_t kMaxOutput = 4'000'000;

// The child's end of the connection, which carries one JSON document per line.
class Connection {
 public:
  explicit Connection(int descriptor) : descriptor_(descriptor), owner_(::getpid()) {}

  void say(const Json& json) const {
    if (::getpid() != owner_) ::_exit(EXIT_FAILURE);  // a copy of the process, made by the plug-in
    const std::string line = json.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
    std::string_view left = line;
    while (!left.empty()) {
      const ssize_t written = ::write(descriptor_, left.data(), left.size());
      if (written < 0 && errno != EINTR) ::_exit(kNoConnection);
      if (written > 0) left.remove_prefix(static_cast<std::size_t>(written));
    }
  }

 private:
  const int descriptor_;
  const pid_t owner_;
};

class EventsToConnection final : public RunEventSink {
 public:
  explicit EventsToConnection(const Connection& connection) : connection_(connection) {}

  void onEvent(const RunEvent& event) override { connection_.say(eventJson(event)); }

 private:
  const Connection& connection_;
};

std::string secondsText(std::chrono::nanoseconds time) {
  return defaultText(std::chrono::duration<double>(time).count()) + " s";
}

// The error for a process that ended early while it was doing `during`.
DiagnosticErrorPtr errorOf(const Supervised& supervised, const std::string& during, std::chrono::nanoseconds deadline) {
  const std::string stuck = supervised.end ? std::string() : "; its process could not be killed";
  switch (supervised.how) {
    case SupervisionEnd::kDeadline:
      return hostError(HostErrorCode::kDeadline, during + " exceeded its deadline of " + secondsText(deadline) + stuck);
    case SupervisionEnd::kInterrupted:
      return hostError(HostErrorCode::kInterrupted, during + " was interrupted" + stuck);
    case SupervisionEnd::kLineTooLong:
      return hostError(HostErrorCode::kConnectionLost, during + " wrote more than " + std::to_string(kMaxLine >> 20U) +
                                                           " MiB in one line on its process's connection to quazor" +
                                                           stuck);
    case SupervisionEnd::kConnectionLost: break;
    case SupervisionEnd::kEnded: {
      const ProcessEnd& end = *supervised.end;
      if (end.bySignal) {
        return hostError(HostErrorCode::kCrashed, during + " crashed: its process was terminated by " + textOf(end));
      }
      if (end.number == kNoConnection) break;
      return hostError(HostErrorCode::kExited, during + " ended its own process with " + textOf(end));
    }
  }
  return hostError(HostErrorCode::kConnectionLost,
                   during + " closed or overwrote its process's connection to quazor" + stuck);
}

// The files that register the diagnostic, its experiment and its analysis.
std::vector<std::filesystem::path> pluginsOf(const Diagnostic& one, const std::vector<LoadedPlugin>& loaded) {
  const auto isPart = [&one](const QZLab::Registration& registration) {
    switch (registration.kind) {
      case QZLab::Kind::kDiagnostic: return !one.experimentOnly && registration.name == one.name;
      case QZLab::Kind::kExperiment: return registration.name == one.experimentName;
      case QZLab::Kind::kAnalysis: break;
    }
    return !one.experimentOnly && registration.name == one.analysisName;
  };
  const std::vector<QZLab::Registration>& registrations = QZLab::defaultLab().registrations();
  std::vector<std::filesystem::path> files;
  auto first = registrations.begin();
  for (const LoadedPlugin& plugin : loaded) {
    const auto last = registrations.begin() + static_cast<std::ptrdiff_t>(plugin.last);
    if (std::any_of(first, last, isPart)) files.push_back(plugin.file);
    first = last;
  }
  return files;
}

// One attempt at a scan: collects the messages of a process until it ends.
class ScanAttempt {
 public:
  ScanAttempt(const IsolationOptions& options, const std::vector<std::filesystem::path>& plugins, PluginScan& scan,
              const DiagnosticChoice& described)
      : deadlines_({}, options.deadlines),
        memory_(options.memory),
        plugins_(plugins),
        scan_(scan),
        described_(described),
        known_(scan.catalogue.size()) {}

  // Returns true if the scan is complete.
  bool perform(WatchedSignals& signals) {
    beginStage(Stage::kLoad);
    Supervised end;
    {
      ChildProcess child(
          signals, [this](int descriptor) { speak(Connection(descriptor)); }, memory_, isCleanupProcess);
      Supervision supervision;
      supervision.takeLine = [this](std::string_view line) { return take(line); };
      supervision.takeOutput = [](std::string_view /*line*/) {};  // there is no run log to write to
      supervision.deadline = [this] { return deadline_; };
      supervision.isDone = [this] { return done_; };
      end = supervise(child, signals, supervision);
    }
    if (refusal_) throw CommandError(*refusal_);
    if (done_) return true;
    if (end.how == SupervisionEnd::kInterrupted) scan_.interrupted = true;
    blame(end);
    return scan_.interrupted;
  }

  // The plug-in whose loading failed.
  const std::optional<std::filesystem::path>& failedPlugin() const { return failedPlugin_; }

 private:
  // Runs in the child.
  void speak(const Connection& connection) const {
    try {
      const std::vector<LoadedPlugin> loaded = loadPlugins(plugins_, [&connection](const std::filesystem::path& file) {
        connection.say({{"says", "loading"}, {"plugin", losslessText(file.string())}});
      });
      std::vector<Diagnostic> catalogue = catalogueOf(QZLab::defaultLab());
      for (Diagnostic& one : catalogue) one.plugins = pluginsOf(one, loaded);
      Json all = Json::array();
      for (const Diagnostic& one : catalogue) all.push_back(diagnosticJson(one));
      connection.say({{"says", "catalogue"}, {"catalogue", std::move(all)}});
      const std::vector<Diagnostic> wanted = described_(catalogue);
      for (std::size_t i = known_; i < catalogue.size(); ++i) {
        connection.say({{"says", "describing"}});
        connection.say(
            {{"says", "described"}, {"description", descriptionJson(describeIfWanted(catalogue[i], wanted))}});
      }
      connection.say({{"says", "done"}});
    } catch (const CommandError& refusal) {
      connection.say(
          {{"says", "refused"}, {"code", static_cast<int>(refusal.code())}, {"text", losslessText(refusal.what())}});
    }
  }

  bool take(std::string_view line) {
    try {
      const Json said = parseJsonLine(line);
      const std::string what = memberOf(said, "says").get<std::string>();
      if (what == "loading") {
        loading_ = textFrom(memberOf(said, "plugin"));
        beginStage(Stage::kLoad);
      } else if (what == "catalogue") {
        for (const Json& one : memberOf(said, "catalogue")) catalogue_.push_back(diagnosticFrom(one));
        loading_.reset();
      } else if (what == "describing") {
        beginStage(Stage::kDescribe);
      } else if (what == "described") {
        describe(descriptionFrom(memberOf(said, "description")));
      } else if (what == "refused") {
        refusal_ =
            CommandError(static_cast<ExitCode>(memberOf(said, "code").get<int>()), textFrom(memberOf(said, "text")));
        done_ = true;
      } else {
        done_ = what == "done";
        return done_;
      }
      return true;
    } catch (const Json::exception&) {
    } catch (const InputError&) {
    }
    return false;
  }

  void describe(DiagnosticDescription description) {
    if (scan_.catalogue.size() >= catalogue_.size()) throw InputError("there are more descriptions than diagnostics");
    scan_.catalogue.push_back({catalogue_[scan_.catalogue.size()], std::move(description)});
  }

  void beginStage(Stage stage) {
    stage_ = stage;
    deadline_ = SteadyClock::now() + deadlines_.of(stage);
  }

  // Attributes the end of the process to the plug-in that was being loaded, or to the diagnostic that was being
  // described.
  void blame(const Supervised& end) {
    const std::chrono::nanoseconds deadline = deadlines_.of(stage_);
    if (scan_.catalogue.size() < catalogue_.size()) {
      DiagnosticDescription description;
      description.error = errorOf(end, "describing " + catalogue_[scan_.catalogue.size()].name, deadline);
      describe(std::move(description));
      return;
    }
    const std::filesystem::path file = loading_ ? std::filesystem::path(*loading_) : plugins_.back();
    failedPlugin_ = file;
    scan_.failed.push_back({file, errorOf(end, "loading the plug-in '" + file.string() + "'", deadline)});
  }

  const Deadlines deadlines_;
  const std::optional<std::uint64_t> memory_;
  const std::vector<std::filesystem::path>& plugins_;
  PluginScan& scan_;
  const DiagnosticChoice& described_;
  const std::size_t known_;
  std::vector<Diagnostic> catalogue_;
  std::optional<std::string> loading_;
  std::optional<std::filesystem::path> failedPlugin_;
  std::optional<CommandError> refusal_;
  Stage stage_ = Stage::kLoad;
  Moment deadline_;
  bool done_ = false;
};

// The parent's side of one run in a separate process.
class IsolatedRun {
 public:
  IsolatedRun(const Diagnostic& diagnostic, const Deadlines& deadlines, Progress& progress, RunEventSink& events)
      : diagnostic_(diagnostic), deadlines_(deadlines), progress_(progress), events_(events) {
    beginStage(Stage::kLoad);
  }

  Supervision supervision() {
    Supervision supervision;
    supervision.takeLine = [this](std::string_view line) { return take(line); };
    supervision.takeOutput = [this](std::string_view line) { takeOutput(line); };
    supervision.deadline = [this] { return deadline_; };
    supervision.isDone = [this] { return completed_; };
    supervision.tick = [this] { progress_.update(); };
    return supervision;
  }

  // `leftOut` is the number of log lines that the process did not send.
  void conclude(const Supervised& end, std::uint64_t leftOut) {
    if (leftOut > 0) events_.onEvent(leftOutLine(leftOut, time_));
    if (droppedLines_ > 0) log(formatMessage("%@ more lines of output were dropped", droppedLines_));
    if (completed_) return;
    const std::string during = formatMessage("the stage %@ of %@", nameOf(stage_), diagnostic_.name);
    events_.onEvent(Failed{stage_, errorOf(end, during, deadlines_.of(stage_))});
  }

 private:
  bool take(std::string_view line) {
    std::optional<RunEvent> event;
    try {
      event = eventFrom(parseJsonLine(line));
    } catch (const Json::exception&) {
    } catch (const InputError&) {
    }
    if (!event || completed_ || isOfHost(*event)) return false;
    if (const auto* const began = std::get_if<StageStarted>(&*event)) beginStage(began->stage);
    if (const auto* const logged = std::get_if<Logged>(&*event)) time_ = logged->line.time;
    // Each event between two stages extends the deadline, because their number is finite. Log lines do not: they may
    // never end.
    if (std::holds_alternative<StageEnded>(*event)) between_ = true;
    if (between_ && !std::holds_alternative<Logged>(*event)) deadline_ = SteadyClock::now() + deadlines_.of(stage_);
    completed_ = std::holds_alternative<DiagnosticCompleted>(*event);
    events_.onEvent(*event);
    return true;
  }

  static bool isOfHost(const RunEvent& event) {
    const auto* const failed = std::get_if<Failed>(&event);
    return std::holds_alternative<RunStarted>(event) || std::holds_alternative<DiagnosticStarted>(event) ||
           std::holds_alternative<DiagnosticEnded>(event) || std::holds_alternative<RunEnded>(event) ||
           (failed != nullptr && !failed->stage);
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

  void beginStage(Stage stage) {
    stage_ = stage;
    between_ = false;
    deadline_ = SteadyClock::now() + deadlines_.of(stage);
  }

  const Diagnostic& diagnostic_;
  const Deadlines& deadlines_;
  Progress& progress_;
  RunEventSink& events_;
  Stage stage_ = Stage::kLoad;
  Moment deadline_;
  std::chrono::nanoseconds time_{};  // time of the last log line
  std::size_t outputLines_ = 0;      // lines kept
  std::size_t output_ = 0;           // bytes kept
  std::size_t droppedLines_ = 0;
  bool between_ = false;
  bool completed_ = false;
};

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
    for (const Diagnostic& one : catalogueOf(QZLab::defaultLab())) {
      if (one.name == wanted.name && one.experimentOnly == wanted.experimentOnly) found = one;
    }
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

IsolationOptions withoutFailed(IsolationOptions options, const std::vector<FailedPlugin>& failed) {
  for (const FailedPlugin& plugin : failed) std::erase(options.plugins, plugin.file);
  return options;
}

PluginScan scanPlugins(const IsolationOptions& options, WatchedSignals& signals, const DiagnosticChoice& described) {
  PluginScan scan;
  std::vector<std::filesystem::path> plugins = options.plugins;
  while (!plugins.empty()) {
    ScanAttempt attempt(options, plugins, scan, described);
    if (attempt.perform(signals)) break;
    if (!attempt.failedPlugin()) continue;
    scan.catalogue.clear();  // an earlier attempt may have found the diagnostics of that plug-in
    // If the child reports a plug-in that was not in the list, its messages cannot be trusted.
    if (std::erase(plugins, *attempt.failedPlugin()) == 0) plugins.clear();
  }
  return scan;
}

bool runIsolated(const IsolationOptions& options, WatchedSignals& signals, const Diagnostic& diagnostic,
                 const ResolvedParameters& parameters, const RunOptions& runOptions, const QZExperimentResult* result,
                 Progress& progress, RunEventSink& events) {
  const Deadlines deadlines(parameters, options.deadlines);
  SharedCounter frames;
  SharedCounter leftOut;
  if (progress.isShown()) progress.countFrames([&frames] { return frames.get(); });
  const auto body = [&](int descriptor) {
    const Connection connection(descriptor);
    EventsToConnection everything(connection);
    LimitedLog toParent(everything, runOptions.logLimit, leftOut);
    const std::optional<Diagnostic> loaded = loadDiagnostic(options, diagnostic, toParent);
    if (!loaded) {
      toParent.onEvent(DiagnosticCompleted{});
    } else if (result != nullptr) {
      analyzeResult(*loaded, parameters, *result, runOptions.logLevel, toParent);
    } else {
      RunOptions watched = runOptions;
      if (progress.isShown()) {
        watched.watchPhone = [&frames](const std::shared_ptr<const Phone>& phone) { countFrames(phone, frames); };
      }
      runDiagnostic(*loaded, parameters, watched, toParent);
    }
  };
  IsolatedRun run(diagnostic, deadlines, progress, events);
  Supervised end;
  try {
    ChildProcess child(signals, body, options.memory, isCleanupProcess);
    end = supervise(child, signals, run.supervision());
  } catch (const std::system_error& problem) {
    events.onEvent(Failed{Stage::kLoad,
                          hostError(HostErrorCode::kNoProcess,
                                    "the process of " + diagnostic.name + " could not be created: " + problem.what())});
    return true;
  }
  run.conclude(end, leftOut.get());
  return end.how != SupervisionEnd::kInterrupted;
}

}  // namespace quazor
