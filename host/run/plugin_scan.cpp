#include "host/run/plugin_scan.h"

#include "base/text/input_error.h"
#include "contract/lab.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/plugin/plugin_loader.h"
#include "host/plugin/plugin_trust.h"
#include "host/plugin/shared_object.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"
#include "host/run/child_connection.h"
#include "host/system/identity.h"
#include "host/system/supervision.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;
using Moment = Supervision::Moment;
using SteadyClock = std::chrono::steady_clock;

// One side of the messages between a process of the scan and quazor.
struct Conversation {
  std::function<void(const ConnectionWriter& connection)> speak;          // in the process
  std::function<void(const std::string& what, const Json& said)> listen;  // throws InputError
  std::function<Moment()> deadline;
};

// Throws std::system_error if the process cannot be created.
Supervised converse(const IsolationOptions& options, WatchedSignals& signals, const Conversation& conversation) {
  const std::string token = randomIdentifier();
  SharedCounter lost;
  const auto speak = [&](int descriptor) { conversation.speak(ConnectionWriter(descriptor, token, lost)); };
  ChildProcess child(signals, speak, options.memory, isCleanupProcess);
  Supervision supervision;
  supervision.takeLine = [&](std::string_view line) {
    try {
      const Json said = documentIn(line, token);
      conversation.listen(textFrom(memberOf(said, "says")), said);
      return true;
    } catch (const Json::exception&) {
    } catch (const InputError&) {
    }
    return false;
  };
  supervision.takeOutput = [](std::string_view /*line*/) {};  // there is no run log to write to
  supervision.deadline = conversation.deadline;
  supervision.isDone = [] { return false; };  // what it said counts if it ends well
  Supervised end = supervise(child, signals, supervision);
  end.lostConnection = lost.get() != 0;
  return end;
}

// The memory of this process that is in use, in bytes; 0 if that is unknown.
std::uint64_t memoryInUse() {
  std::ifstream status("/proc/self/statm");  // in pages: the address space, and what of it is resident
  std::uint64_t whole = 0;
  std::uint64_t resident = 0;
  status >> whole >> resident;
  return status ? resident * static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE)) : 0;
}

// Measures what happens from its construction on.
// Thread: the one that made it.
class CostMeter {
 public:
  nlohmann::ordered_json cost() const {
    const std::uint64_t bytes = memoryInUse();
    return {{"nanoseconds", std::chrono::nanoseconds(SteadyClock::now() - begin_).count()},
            {"bytes", bytes > before_ ? bytes - before_ : 0}};
  }

 private:
  const std::uint64_t before_ = memoryInUse();
  const Moment begin_ = SteadyClock::now();
};

// Throws InputError or Json::exception.
Cost costFrom(const Json& json) {
  return {std::chrono::nanoseconds(memberOf(json, "nanoseconds").get<std::int64_t>()),
          memberOf(json, "bytes").get<std::uint64_t>()};
}

std::string loadingOf(const std::filesystem::path& file) { return "loading the plug-in '" + file.string() + "'"; }

DiagnosticErrorPtr noProcess(const std::string& purpose, const std::system_error& problem) {
  return hostError(HostErrorCode::kNoProcess,
                   "the process for " + purpose + " could not be created: " + problem.what());
}

// A plug-in in a process of its own.
class PluginLoading {
 public:
  PluginLoading(const IsolationOptions& options, const Deadlines& deadlines, std::filesystem::path file)
      : options_(options), deadline_(deadlines.of(Stage::kLoad)), file_(std::move(file)) {}

  // Returns the error if the plug-in cannot be loaded. Throws a CommandError (kCannotRead) if it is refused.
  DiagnosticErrorPtr perform(WatchedSignals& signals) {
    const Moment end = SteadyClock::now() + deadline_;
    const Conversation conversation{
        [this](const ConnectionWriter& connection) { speak(connection); },
        [this](const std::string& what, const Json& said) { listen(what, said); },
        [end] { return end; },
    };
    try {
      const Supervised supervised = converse(options_, signals, conversation);
      if (refusal_) refusePlugin(file_, *refusal_);
      if (!registrations_ || !endedWell(supervised)) return errorOf(supervised, loadingOf(file_), deadline_);
    } catch (const std::system_error& problem) {
      return noProcess(loadingOf(file_), problem);
    }
    return nullptr;
  }

  // After a successful perform().
  const std::vector<QZLab::Registration>& registrations() const { return *registrations_; }
  const Cost& cost() const { return cost_; }

 private:
  void speak(const ConnectionWriter& connection) const {
    const std::size_t before = QZLab::defaultLab().registrations().size();
    const CostMeter meter;
    try {
      loadPlugin(file_);
    } catch (const InputError& problem) {
      connection.say({{"says", "refused"}, {"text", losslessText(problem.what())}});
      return;
    }
    Json cost = meter.cost();
    const std::vector<QZLab::Registration>& all = QZLab::defaultLab().registrations();
    Json registrations = Json::array();
    for (std::size_t i = before; i < all.size(); ++i) registrations.push_back(registrationJson(all[i]));
    connection.say({{"says", "registered"}, {"registrations", std::move(registrations)}, {"cost", std::move(cost)}});
  }

  void listen(const std::string& what, const Json& said) {
    if (refusal_ || registrations_) throw InputError("the process says more than one thing");
    if (what == "refused") {
      refusal_ = textFrom(memberOf(said, "text"));
    } else if (what == "registered") {
      std::vector<QZLab::Registration> registrations;
      for (const Json& one : memberOf(said, "registrations")) registrations.push_back(registrationFrom(one));
      cost_ = costFrom(memberOf(said, "cost"));
      registrations_ = std::move(registrations);
    } else {
      throw InputError("the process says '" + what + "'");
    }
  }

  const IsolationOptions& options_;
  const std::chrono::nanoseconds deadline_;
  const std::filesystem::path file_;
  std::optional<std::string> refusal_;
  std::optional<std::vector<QZLab::Registration>> registrations_;
  Cost cost_;
};

// Adds the registrations of a plug-in to the lab, as loading it in this process would.
void addRegistrations(const std::filesystem::path& file, const std::vector<QZLab::Registration>& registrations,
                      QZLab& lab) {
  const std::size_t registered = lab.registrations().size();
  const std::size_t refused = lab.refusedNames().size();
  for (const QZLab::Registration& one : registrations) {
    switch (one.kind) {
      case QZLab::Kind::kExperiment: lab.addExperimentWithName(one.name, nullptr); break;
      case QZLab::Kind::kAnalysis: lab.addAnalysisWithName(one.name, nullptr); break;
      case QZLab::Kind::kDiagnostic:
        lab.addDiagnosticWithName(one.name, one.summary, one.experimentName, one.analysisName);
        break;
    }
  }
  try {
    checkNewRegistrations(lab, registered, refused);
  } catch (const InputError& problem) {
    refusePlugin(file, problem.what());
  }
}

// The files that register the diagnostic, its experiment and its analysis.
std::vector<std::filesystem::path> pluginsOf(const Diagnostic& one, const QZLab& lab,
                                             const std::vector<LoadedPlugin>& loaded) {
  const auto isPart = [&one](const QZLab::Registration& registration) {
    switch (registration.kind) {
      case QZLab::Kind::kDiagnostic: return !one.experimentOnly && registration.name == one.name;
      case QZLab::Kind::kExperiment: return registration.name == one.experimentName;
      case QZLab::Kind::kAnalysis: break;
    }
    return !one.experimentOnly && registration.name == one.analysisName;
  };
  std::vector<std::filesystem::path> files;
  auto first = lab.registrations().begin();
  for (const LoadedPlugin& plugin : loaded) {
    const auto last = lab.registrations().begin() + static_cast<std::ptrdiff_t>(plugin.last);
    if (std::any_of(first, last, isPart)) files.push_back(plugin.file);
    first = last;
  }
  return files;
}

// Descriptions in one process, until it ends.
class Describing {
 public:
  // All of `diagnostics` need the same plug-ins.
  Describing(const IsolationOptions& options, const Deadlines& deadlines, std::vector<DescribedDiagnostic*> diagnostics)
      : options_(options),
        deadlines_(deadlines),
        diagnostics_(std::move(diagnostics)),
        plugins_(diagnostics_.front()->diagnostic.plugins) {
    beginStage(Stage::kLoad);
  }

  // Fills in the descriptions, or errors. Returns the diagnostics that still need a description.
  std::vector<DescribedDiagnostic*> perform(WatchedSignals& signals) {
    const Conversation conversation{
        [this](const ConnectionWriter& connection) { speak(connection); },
        [this](const std::string& what, const Json& said) { listen(what, said); },
        [this] { return deadline_; },
    };
    try {
      const Supervised end = converse(options_, signals, conversation);
      if (refusal_) {
        failAll(hostError(HostErrorCode::kNothingMade, *refusal_));
      } else if (described_ < diagnostics_.size() || !endedWell(end)) {
        blame(end);
      }
    } catch (const std::system_error& problem) {
      for (DescribedDiagnostic* const one : diagnostics_) {
        fail(*one, noProcess("describing " + one->diagnostic.name, problem));
      }
      described_ = diagnostics_.size();
    }
    return {diagnostics_.begin() + static_cast<std::ptrdiff_t>(described_), diagnostics_.end()};
  }

 private:
  void speak(const ConnectionWriter& connection) const {
    try {
      loadSomePlugins(plugins_, [&connection] { connection.say({{"says", "loading"}}); });
    } catch (const CommandError& problem) {
      connection.say({{"says", "refused"}, {"text", losslessText(problem.what())}});
      return;
    }
    for (const DescribedDiagnostic* const one : diagnostics_) {
      connection.say({{"says", "describing"}});
      const CostMeter meter;
      Json description = descriptionJson(descriptionOf(one->diagnostic));
      connection.say({{"says", "described"}, {"description", std::move(description)}, {"cost", meter.cost()}});
    }
  }

  static DiagnosticDescription descriptionOf(const Diagnostic& wanted) {
    if (const std::optional<Diagnostic> found = registeredDiagnostic(QZLab::defaultLab(), wanted)) {
      return describeDiagnostic(*found);
    }
    DiagnosticDescription none;
    none.error = hostError(HostErrorCode::kNothingMade, "the plug-ins no longer register " + wanted.name);
    return none;
  }

  void listen(const std::string& what, const Json& said) {
    if (what == "loading" && loading_ < plugins_.size() && stage_ == Stage::kLoad) {
      ++loading_;
      beginStage(Stage::kLoad);
    } else if (what == "refused" && stage_ == Stage::kLoad && !refusal_) {
      refusal_ = textFrom(memberOf(said, "text"));
    } else if (what == "describing" && !isDescribing_ && described_ < diagnostics_.size() && !refusal_) {
      isDescribing_ = true;
      beginStage(Stage::kDescribe);
    } else if (what == "described" && isDescribing_) {
      diagnostics_[described_]->description = descriptionFrom(memberOf(said, "description"));
      diagnostics_[described_]->description.cost = costFrom(memberOf(said, "cost"));
      isDescribing_ = false;
      ++described_;
    } else {
      throw InputError("the process says '" + what + "' out of order");
    }
  }

  void beginStage(Stage stage) {
    stage_ = stage;
    deadline_ = SteadyClock::now() + deadlines_.of(stage);
  }

  // Attributes the end of the process to the plug-in that was being loaded, which all the diagnostics need, or to the
  // diagnostic that was being described, or was described last.
  void blame(const Supervised& end) {
    const std::chrono::nanoseconds deadline = deadlines_.of(stage_);
    if (stage_ == Stage::kLoad) {
      failAll(errorOf(end, loadingOf(plugins_[std::max<std::size_t>(loading_, 1) - 1]), deadline));
      return;
    }
    described_ = std::min(described_, diagnostics_.size() - 1);
    const std::string during = "describing " + diagnostics_[described_]->diagnostic.name;
    fail(*diagnostics_[described_++], errorOf(end, during, deadline));
  }

  void failAll(const DiagnosticErrorPtr& error) {
    for (DescribedDiagnostic* const one : diagnostics_) fail(*one, error);
    described_ = diagnostics_.size();
  }

  static void fail(DescribedDiagnostic& one, DiagnosticErrorPtr error) {
    one.description = DiagnosticDescription();
    one.description.error = std::move(error);
  }

  const IsolationOptions& options_;
  const Deadlines& deadlines_;
  const std::vector<DescribedDiagnostic*> diagnostics_;
  const std::vector<std::filesystem::path>& plugins_;
  std::optional<std::string> refusal_;
  std::size_t loading_ = 0;    // the plug-ins whose loading has begun
  std::size_t described_ = 0;  // the diagnostics with a description
  bool isDescribing_ = false;
  Stage stage_ = Stage::kLoad;
  Moment deadline_;
};

void checkFile(const std::filesystem::path& file) {
  requireTrustedPlugins({file});
  try {
    validateSharedObject(file);
  } catch (const InputError& problem) {
    refusePlugin(file, problem.what());
  }
}

// Plug-ins in the order in which they were accepted, and a lab with what they register.
// Thread: one at a time.
class AcceptedPlugins {
 public:
  // Throws a CommandError, and then accepts nothing of it, if the plug-in registers a name that is already taken.
  void accept(const std::filesystem::path& file, const std::vector<QZLab::Registration>& registrations) {
    plugins_.push_back({file, registrations});
    try {
      fillLab();
    } catch (const CommandError&) {
      plugins_.pop_back();
      fillLab();
      throw;
    }
  }

  // Removes the plug-ins with a diagnostic that names a part which no plug-in registers.
  std::vector<FailedPlugin> removeIncomplete() {
    std::vector<FailedPlugin> removed;
    std::size_t first = 0;
    for (const LoadedPlugin& plugin : loaded_) {
      try {
        checkDiagnosticsOf(*lab_, first, plugin);
      } catch (const CommandError& refusal) {
        removed.push_back(refusedPlugin(plugin.file, refusal));
        std::erase_if(plugins_, [&plugin](const Plugin& one) { return one.file == plugin.file; });
      }
      first = plugin.last;
    }
    if (!removed.empty()) fillLab();
    return removed;
  }

  static FailedPlugin refusedPlugin(const std::filesystem::path& file, const CommandError& refusal) {
    return {file, hostError(HostErrorCode::kPluginRefused, refusal.what())};
  }

  const QZLab& lab() const { return *lab_; }
  const std::vector<LoadedPlugin>& loaded() const { return loaded_; }

 private:
  struct Plugin {
    std::filesystem::path file;
    std::vector<QZLab::Registration> registrations;
  };

  void fillLab() {
    lab_ = std::make_unique<QZLab>();
    loaded_.clear();
    for (const Plugin& plugin : plugins_) {
      addRegistrations(plugin.file, plugin.registrations, *lab_);
      loaded_.push_back({plugin.file, lab_->registrations().size()});
    }
  }

  std::vector<Plugin> plugins_;
  std::unique_ptr<QZLab> lab_ = std::make_unique<QZLab>();
  std::vector<LoadedPlugin> loaded_;
};

// Loads the plug-in and accepts it, and adds what that took to `costs`. Returns an error if it cannot be loaded; throws
// a CommandError if it is refused.
DiagnosticErrorPtr accept(const IsolationOptions& options, const std::filesystem::path& file, WatchedSignals& signals,
                          AcceptedPlugins& accepted, std::vector<Cost>& costs) {
  if (options.unasked) checkFile(file);
  PluginLoading loading(options, Deadlines({}, options.deadlines), file);
  DiagnosticErrorPtr error = loading.perform(signals);
  if (error != nullptr || signals.requestsToEnd() > 0) return error;
  accepted.accept(file, loading.registrations());
  costs.push_back(loading.cost());
  return error;
}

}  // namespace

IsolationOptions withoutFailed(IsolationOptions options, const std::vector<FailedPlugin>& failed) {
  for (const FailedPlugin& plugin : failed) std::erase(options.plugins, plugin.file);
  return options;
}

PluginScan scanPlugins(const IsolationOptions& options, WatchedSignals& signals, const DiagnosticChoice& described) {
  const std::vector<std::filesystem::path> files = distinctFiles(options.plugins);
  if (!options.unasked) std::for_each(files.begin(), files.end(), checkFile);
  PluginScan scan;
  AcceptedPlugins accepted;
  for (const std::filesystem::path& file : files) {
    try {
      DiagnosticErrorPtr error = accept(options, file, signals, accepted, scan.loading);
      if (error != nullptr) scan.failed.push_back({file, std::move(error)});
    } catch (const CommandError& refusal) {
      if (!options.unasked) throw;
      scan.failed.push_back(AcceptedPlugins::refusedPlugin(file, refusal));
    }
    scan.interrupted = signals.requestsToEnd() > 0;
    if (scan.interrupted) return scan;
  }
  if (scan.failed.empty() && options.unasked) {
    scan.failed = accepted.removeIncomplete();
  } else if (scan.failed.empty()) {
    checkDiagnostics(accepted.lab(), accepted.loaded());
  }
  std::vector<Diagnostic> catalogue = catalogueOf(accepted.lab());
  for (Diagnostic& one : catalogue) one.plugins = pluginsOf(one, accepted.lab(), accepted.loaded());
  const std::vector<Diagnostic> wanted = described(catalogue);
  DiagnosticDescription none;
  none.isAsked = false;
  for (Diagnostic& one : catalogue) scan.catalogue.push_back({std::move(one), none});
  scan.interrupted = !describeIsolated(options, signals, wanted, scan.catalogue);
  return scan;
}

bool describeIsolated(const IsolationOptions& options, WatchedSignals& signals, const std::vector<Diagnostic>& wanted,
                      std::vector<DescribedDiagnostic>& catalogue) {
  const Deadlines deadlines({}, options.deadlines);
  std::vector<DescribedDiagnostic*> left;
  for (DescribedDiagnostic& one : catalogue) {
    if (contains(wanted, one.diagnostic)) left.push_back(&one);
  }
  while (!left.empty()) {
    const std::vector<std::filesystem::path>& needed = left.front()->diagnostic.plugins;
    const auto others = std::stable_partition(left.begin(), left.end(), [&needed](const DescribedDiagnostic* one) {
      return one->diagnostic.plugins == needed;
    });
    Describing describing(options, deadlines, {left.begin(), others});
    std::vector<DescribedDiagnostic*> next = describing.perform(signals);
    if (signals.requestsToEnd() > 0) return false;
    next.insert(next.end(), others, left.end());
    left = std::move(next);
  }
  return true;
}

}  // namespace quazor
