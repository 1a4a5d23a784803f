#include "host/commands.h"

#include "backends/threads/standard_error_log.h"
#include "backends/threads/system_log.h"
#include "host/catalogue.h"
#include "host/diagnostic_run.h"
#include "host/interrupt_watcher.h"
#include "host/json_report.h"
#include "host/output_file.h"
#include "host/parameters.h"
#include "host/phone.h"
#include "host/plugin_loader.h"
#include "host/profile.h"
#include "host/table.h"
#include "host/text_report.h"
#include "host/value_json.h"

#include <unistd.h>

#include <memory>
#include <optional>
#include <sstream>
#include <utility>

namespace quazor {

namespace {

std::vector<Diagnostic> loadCatalogue(const Options& options, const Installation& installation) {
  std::vector<std::filesystem::path> plugins = options.plugins;
  if (plugins.empty()) plugins.push_back(installation.defaultPlugin());
  loadPlugins(plugins);
  return catalogueOf(QZLab::defaultLab());
}

Wanted wantedBy(Command command) {
  if (command == Command::kRun) return Wanted::kDiagnostics;
  return command == Command::kExperiment ? Wanted::kExperiments : Wanted::kDescribable;
}

std::vector<Diagnostic> wantedOf(const std::vector<Diagnostic>& catalogue, const Options& options) {
  const Wanted wanted = wantedBy(options.command);
  if (!options.all) return selectDiagnostics(catalogue, wanted, options.names);
  std::vector<Diagnostic> all = allOf(catalogue, wanted);
  if (!all.empty()) return all;
  if (wanted == Wanted::kExperiments) throw Refusal(ExitCode::kUsage, "the loaded plug-ins have no experiment");
  const std::string hint = catalogue.empty() ? "" : ", only experiments; 'quazor experiment --all' runs them";
  throw Refusal(ExitCode::kUsage, "the loaded plug-ins have no diagnostic" + hint);
}

// The selected diagnostics or experiments with their parameters; everything that can be wrong with them has been
// checked, but for required parameters without a value.
std::vector<BoundDiagnostic> bindDiagnostics(const Options& options, const Installation& installation) {
  const std::vector<Diagnostic> catalogue = loadCatalogue(options, installation);
  const std::vector<Diagnostic> wanted = wantedOf(catalogue, options);
  std::vector<DescribedDiagnostic> described;
  described.reserve(catalogue.size());
  for (const Diagnostic& one : catalogue) described.push_back({one, describeDiagnostic(one)});

  std::optional<Profile> profile;
  if (!options.withoutProfile) {
    // The installed profile may have entries for plug-ins that are not loaded now; a profile that was named may not.
    const bool named = !options.profile.empty();
    profile = readProfile(named ? options.profile : installation.defaultProfile());
    checkProfile(*profile, described, named);
  }
  std::vector<DescribedDiagnostic> selected;
  for (const Diagnostic& one : wanted) {
    for (const DescribedDiagnostic& candidate : described) {
      const Diagnostic& other = candidate.diagnostic;
      if (other.name == one.name && other.experimentOnly == one.experimentOnly) selected.push_back(candidate);
    }
  }
  checkSettings(options.settings, selected);
  std::vector<BoundDiagnostic> bound;
  for (DescribedDiagnostic& one : selected) {
    BoundParameters parameters = bindParameters(one, profile ? &*profile : nullptr, options.settings);
    bound.push_back({std::move(one), std::move(parameters)});
  }
  return bound;
}

// Writes what a command without a run has to say.
ExitCode writeAnswer(const Options& options, Console& console, const std::string& answer) {
  if (options.report.output.empty()) {
    console.out << answer << std::flush;
    if (console.out) return ExitCode::kAllPassed;
    throw Refusal(ExitCode::kCannotWrite, "the standard output cannot be written");
  }
  const std::string problem = writeOutputFile(options.report.output, answer);
  if (problem.empty()) return ExitCode::kAllPassed;
  throw Refusal(ExitCode::kCannotWrite,
                "the output file '" + options.report.output.string() + "' cannot be written: " + problem);
}

ExitCode list(const Options& options, const Installation& installation, Console& console) {
  std::vector<DescribedDiagnostic> listed;
  for (const Diagnostic& one : allOf(loadCatalogue(options, installation), Wanted::kDescribable)) {
    // A diagnostic's summary is known without making anything of it.
    listed.push_back({one, one.experimentOnly ? describeDiagnostic(one) : DiagnosticDescription()});
  }
  if (options.report.format == Format::kJson) return writeAnswer(options, console, documentText(listDocument(listed)));
  std::ostringstream text;
  printList(text, listed);
  return writeAnswer(options, console, text.str());
}

ExitCode describe(const Options& options, const Installation& installation, Console& console) {
  const std::vector<BoundDiagnostic> diagnostics = bindDiagnostics(options, installation);
  std::ostringstream text;
  if (options.report.format == Format::kJson) {
    text << documentText(descriptionDocument(diagnostics));
  } else {
    printDescriptions(text, diagnostics);
  }
  const ExitCode written = writeAnswer(options, console, text.str());
  for (const BoundDiagnostic& one : diagnostics) {
    if (one.described.description.error != nullptr) return ExitCode::kError;
  }
  return written;
}

RunOptions runOptionsOf(const Options& options, const Installation& installation, Progress& progress) {
  RunOptions runOptions;
  const std::filesystem::path scenario =
      options.phone.empty() ? installation.defaultScenario() : installation.scenario(options.phone);
  runOptions.makePhone = phonesOfScenario(scenario, options.realTime, options.seed);
  runOptions.seed = options.seed;
  runOptions.logLevel = options.logLevel.value_or(LogLevel::kDefault);
  const LogLevel shown = options.logLevel.value_or(LogLevel::kError);
  std::shared_ptr<LogBackend> system;
  if (options.systemLog) system = std::make_shared<SystemLog>();
  runOptions.makeListeners = [shown, kept = runOptions.logLevel, system,
                              &progress](const std::shared_ptr<Clock>& clock) {
    auto console = std::make_shared<LogBesideProgress>(progress, std::make_shared<StandardErrorLog>(clock));
    std::vector<RunLog::Listener> listeners{{std::move(console), shown}};
    if (system != nullptr) listeners.push_back({system, kept});
    return listeners;
  };
  runOptions.watchPhone = [&progress](const std::shared_ptr<const Phone>& phone) {
    progress.countFrames([phone] { return phone->framesDelivered(); });
  };
  return runOptions;
}

ExitCode run(const Options& options, const Installation& installation, Console& console) {
  const std::vector<BoundDiagnostic> diagnostics = bindDiagnostics(options, installation);
  for (const BoundDiagnostic& one : diagnostics) requireParameters(one.described, one.parameters);
  RunReport report(options.report, console);
  const RunOptions runOptions = runOptionsOf(options, installation, report.progress());
  const InterruptWatcher watcher(
      [&report] { report.interrupt([] { ::_exit(static_cast<int>(ExitCode::kInterrupted)); }); });
  for (const BoundDiagnostic& one : diagnostics) {
    report.begin(one.described.diagnostic.name, one.parameters);
    report.finish(runDiagnostic(one.described, one.parameters, runOptions));
  }
  return report.conclude();
}

}  // namespace

ExitCode runProgram(const std::vector<std::string>& arguments, const Installation& installation, Console& console) {
  ExitCode code = ExitCode::kInternal;
  const std::optional<Options> options = parseCommandLine(arguments, console.out, console.err, &code);
  if (!options) return code;
  try {
    switch (options->command) {
      case Command::kList: return list(*options, installation, console);
      case Command::kDescribe: return describe(*options, installation, console);
      case Command::kRun:
      case Command::kExperiment: return run(*options, installation, console);
    }
  } catch (const Refusal& refusal) {
    console.err << "quazor: " << printable(refusal.what()) << '\n';
    return refusal.code();
  }
  return ExitCode::kInternal;
}

}  // namespace quazor
