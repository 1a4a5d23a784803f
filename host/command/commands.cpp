#include "host/command/commands.h"

#include "host/command/completion.h"
#include "host/command/explain_command.h"
#include "host/command/output_check.h"
#include "host/command/records/records_command.h"
#include "host/command/selection.h"
#include "host/command/unknown_name.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/record/value_json.h"
#include "host/report/json_report.h"
#include "host/report/text_report.h"
#include "host/system/output_file.h"
#include "host/text/table.h"
#include "host/text/terminal.h"

#include <algorithm>
#include <iterator>
#include <sstream>
#include <utility>

namespace quazor {

namespace {

// Reports the plug-ins that could not be loaded and returns the resulting exit code.
ExitCode reportFailed(const std::vector<FailedPlugin>& failed, Console& console, ExitCode otherwise) {
  for (const FailedPlugin& plugin : failed) {
    console.err << "quazor: " << printable(plugin.error->localizedDescription()) << '\n';
  }
  return failed.empty() ? otherwise : ExitCode::kCannotRead;
}

// What the names select, or everything except the experiments of diagnostics.
std::vector<Diagnostic> toList(std::vector<Diagnostic> all, const Options& options, bool mayBeNone) {
  if (!options.names.empty()) return wantedOf(all, options, mayBeNone);
  std::erase_if(all, [](const Diagnostic& one) { return !one.usedBy.empty(); });
  return all;
}

ExitCode list(const Options& options, const Installation& installation, Console& console) {
  // The summary of a diagnostic is known without a description; that of an experiment is not.
  const auto toDescribe = [&options](const std::vector<Diagnostic>& all) {
    std::vector<Diagnostic> described = toList(all, options, true);
    std::erase_if(described, [](const Diagnostic& one) { return !one.experimentOnly; });
    return described;
  };
  const PluginScan scan = scanOf(options, installation, toDescribe);
  std::vector<Diagnostic> catalogue;
  for (const DescribedDiagnostic& one : scan.catalogue) catalogue.push_back(one.diagnostic);
  std::vector<DescribedDiagnostic> listed;
  if (!options.names.empty()) wantedWithWayOut(catalogue, options, installation, !scan.failed.empty());
  for (const Diagnostic& one : toList(catalogue, options, !scan.failed.empty())) {
    std::copy_if(scan.catalogue.begin(), scan.catalogue.end(), std::back_inserter(listed),
                 [&one](const DescribedDiagnostic& candidate) { return contains({one}, candidate.diagnostic); });
  }
  std::ostringstream text = textFor(options.report, console);
  if (options.report.format == Format::kJson) {
    text << documentText(listDocument(listed));
  } else {
    printList(text, listed);
  }
  writeOutput(options.report, console, text.str());
  return reportFailed(scan.failed, console, ExitCode::kAllPassed);
}

ExitCode describe(const Options& options, const Installation& installation, Console& console) {
  const Selection selection = select(options, installation);
  tellRemarks(selection, selection.diagnostics, console.err);
  std::ostringstream text = textFor(options.report, console);
  if (options.report.format == Format::kJson) {
    text << documentText(descriptionDocument(selection.diagnostics));
  } else {
    printDescriptions(text, selection.diagnostics);
  }
  writeOutput(options.report, console, text.str());
  ExitCode code = ExitCode::kAllPassed;
  for (const ResolvedDiagnostic& one : selection.diagnostics) {
    if (one.described.description.error != nullptr) code = ExitCode::kError;
  }
  return reportFailed(selection.failed, console, code);
}

ExitCode explainErrors(const Options& options, const Installation& installation, Console& console) {
  std::ostringstream text = textFor(options.report, console);
  try {
    explain(options.names, installation.explanations(), options.report.format == Format::kJson, text);
  } catch (const CommandError& refusal) {
    if (refusal.code() == ExitCode::kUsage) {
      for (const std::string& name : options.names) refusePhoneAsName(name, installation);
    }
    throw;
  }
  writeOutput(options.report, console, text.str());
  return ExitCode::kAllPassed;
}

ExitCode aboutRecords(const Options& options, Console& console, WatchedSignals* signals) {
  std::ostringstream text = textFor(options.report, console);
  const ExitCode code = recordsCommand(options.ofStore, options.report.format, text, console, signals);
  writeOutput(options.report, console, text.str());
  return code;
}

// Watches the signals until this process has ended: none of them may meet its default action, not even while static
// objects are destroyed. Returns null with --in-process, where other threads may run.
WatchedSignals* watchSignals(const Options& options) {
  static WatchedSignals* signals = nullptr;
  if (!options.inProcess) signals = new WatchedSignals;
  return signals;
}

ExitCode perform(const Options& options, const Installation& installation, Console& console) {
  switch (options.command) {
    case Command::kList: return list(options, installation, console);
    case Command::kDescribe: return describe(options, installation, console);
    case Command::kRun:
    case Command::kExperiment: return runCommand(options, installation, console, watchSignals(options));
    case Command::kVerify: return verifyCommand(options, console, watchSignals(options));
    case Command::kAnalyze: return analyzeCommand(options, installation, console, watchSignals(options));
    case Command::kDiff: return diffCommand(options, console);
    case Command::kReport: return reportCommand(options, installation, console);
    case Command::kRecords: return aboutRecords(options, console, watchSignals(options));
    case Command::kExplain: return explainErrors(options, installation, console);
    case Command::kDoctor:
      return doctorCommand(options, installation, console, options.plugins.empty() ? nullptr : watchSignals(options));
    case Command::kSelftest: return selftestCommand(options, installation, console, watchSignals(options));
    case Command::kPhone: return phoneCommand(options, installation, console);
    case Command::kNew: return newCommand(options, installation, console);
    case Command::kCompletion: break;
  }
  writeUnfolded(console.out, completionScript(options.names.front()));
  console.out.flush();
  return ExitCode::kAllPassed;
}

}  // namespace

std::ostringstream textFor(const ReportOptions& report, const Console& console) {
  std::ostringstream text;
  if (report.output.empty()) prepareFor(console.out, text);
  return text;
}

void writeOutput(const ReportOptions& report, Console& console, const std::string& output) {
  if (report.output.empty()) {
    report.format == Format::kText ? void(console.out << output) : writeUnfolded(console.out, output);
    console.out.flush();
    if (!console.out) throw CommandError(ExitCode::kCannotWrite, "standard output cannot be written");
    return;
  }
  refuseRecordAsReport(report.output);
  writeOutputFile(report.output, output);
}

namespace {

ExitCode runArguments(const std::vector<std::string>& arguments, const Installation& installation, Console& console) {
  if (!arguments.empty() && arguments.front() == kCompletionRequest) {
    for (const std::string& one : completionsOf({arguments.begin() + 1, arguments.end()}, installation)) {
      writeUnfolded(console.out, one + '\n');
    }
    return ExitCode::kAllPassed;
  }
  ExitCode code = ExitCode::kInternal;
  std::optional<Options> options = parseCommandLine(arguments, console.out, console.err, &code);
  if (!options) return code;
  const auto refused = [&console](const InputError& error, ExitCode because) {
    console.err << "quazor: " << printable(error.what()) << '\n';
    return because;
  };
  try {
    for (std::filesystem::path& plugin : options->plugins) plugin = installation.plugin(plugin);
    return perform(*options, installation, console);
  } catch (const CommandError& error) {
    return refused(error, error.code());
  } catch (const InputError& error) {  // from reading a file
    return refused(error, ExitCode::kCannotRead);
  }
}

}  // namespace

ExitCode runProgram(const std::vector<std::string>& arguments, const Installation& installation, Console& console) {
  const ExitCode code = runArguments(arguments, installation, console);
  // These two were told already, with the reason.
  if (console.out.flush() || code == ExitCode::kCannotWrite || code == ExitCode::kInterrupted) return code;
  console.err << "quazor: standard output cannot be written\n";
  return ExitCode::kCannotWrite;
}

}  // namespace quazor
