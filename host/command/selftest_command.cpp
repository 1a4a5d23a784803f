#include "host/command/commands.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/command/selection.h"
#include "host/command/selftest.h"
#include "host/model/record_builder.h"
#include "host/record/value_json.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <sstream>
#include <utility>

namespace quazor {

namespace {

std::vector<std::string> wantedScenarios(const Options& options, const Installation& installation) {
  std::vector<std::string> all = installation.scenarioNames();
  if (options.names.empty()) return all;
  std::vector<std::string> wanted;
  for (const std::string& name : options.names) {
    if (std::filesystem::is_regular_file(name)) {
      wanted.push_back(name);
      continue;
    }
    const std::size_t before = wanted.size();
    for (const std::string& one : all) {
      if (matchesName(name, one) && std::find(wanted.begin(), wanted.end(), one) == wanted.end()) wanted.push_back(one);
    }
    const bool found = wanted.size() > before || std::find(wanted.begin(), wanted.end(), name) != wanted.end();
    if (!found)
      throw CommandError(ExitCode::kUsage, "no installed phone is called '" + name + "'" + didYouMean(name, all));
  }
  return wanted;
}

class Selftest {
 public:
  // `signals` is null if the diagnostics run in this process.
  Selftest(const Options& options, const Installation& installation, Console& console, WatchedSignals* signals)
      : options_(withAllPlugins(options, installation)),
        installation_(installation),
        scan_(scanOf(
            options_, installation, [](const std::vector<Diagnostic>& all) { return all; }, signals)),
        isolation_(withoutFailed(isolationOf(options_, installation), scan_.failed)),
        progress_(console.showsProgress ? &console.err : nullptr),
        signals_(signals) {
    profile_ = readProfile(installation.defaultProfile());
  }

  std::vector<SelftestRow> perform() {
    std::vector<SelftestRow> rows;
    for (const std::string& name : wantedScenarios(options_, installation_)) {
      const std::filesystem::path file = installation_.scenario(name);
      for (const ExpectedOutcome& expected : summaryOfScenario(file).expected) {
        SelftestRow row{name, expected, 0, 0, 0, {}, {}};
        for (std::uint64_t seed = 0; seed < options_.seeds; ++seed) {
          count(row, run(file, expected, seed));
          if (signals_ != nullptr && signals_->requestsToEnd() > 0)
            throw CommandError(ExitCode::kInterrupted, "interrupted");
        }
        rows.push_back(std::move(row));
      }
    }
    return rows;
  }

 private:
  static Options withAllPlugins(Options options, const Installation& installation) {
    if (options.plugins.empty()) options.plugins = installation.allPlugins();
    return options;
  }

  static void count(SelftestRow& row, const DiagnosticRecord& record) {
    ++row.runs;
    if (record.verdict == Verdict::kPass) ++row.passes;
    const std::string difference = differenceOf(row.expected, record);
    if (difference.empty()) {
      ++row.asExpected;
    } else if (row.difference.empty()) {
      row.difference = "seed " + std::to_string(record.seed) + ": " + difference;
    }
    row.faultsFired.resize(std::max(row.faultsFired.size(), record.faults.size()));
    for (std::size_t i = 0; i < record.faults.size(); ++i) row.faultsFired[i] += record.faults[i].fired;
  }

  const DescribedDiagnostic& find(const ExpectedOutcome& expected) const {
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const Diagnostic& diagnostic = one.diagnostic;
      if (diagnostic.name == expected.name && diagnostic.experimentOnly == expected.experimentOnly) return one;
    }
    throw CommandError(ExitCode::kCannotRead, "a phone expects " + expected.name + ", but no loaded plug-in has it");
  }

  ResolvedParameters parametersOf(const DescribedDiagnostic& described, const ExpectedOutcome& expected) const {
    if (!expected.experimentOnly) return resolveParameters(described, {profile_}, {});
    std::vector<ParameterOverride> settings;
    for (const auto& [name, value] : expected.parameters) {
      // Formats the value like on a command line, where a whole number is an integer.
      settings.push_back(parseOverride(formatMessage("%@=%@", name, value)));
    }
    return resolveParameters(described, {}, settings);
  }

  DiagnosticRecord run(const std::filesystem::path& file, const ExpectedOutcome& expected, std::uint64_t seed) {
    const DescribedDiagnostic& described = find(expected);
    const Diagnostic& diagnostic = described.diagnostic;
    const ResolvedParameters parameters = parametersOf(described, expected);
    RunOptions runOptions;
    runOptions.makePhone = phonesOfScenario(file, false, seed);
    runOptions.logLevel = LogLevel::kError;
    RecordBuilder builder;
    builder.onEvent(DiagnosticStarted{diagnostic.name, described.summary(), diagnostic.experimentName,
                                      diagnostic.analysisName, diagnostic.experimentOnly, parameters, seed, dateNow()});
    progress_.start(file.stem().string(), {});
    if (signals_ == nullptr) {
      runDiagnostic(diagnostic, parameters, runOptions, builder);
    } else {
      runIsolated(isolation_, *signals_, diagnostic, parameters, runOptions, nullptr, progress_, builder);
    }
    progress_.stop();
    for (const RunEvent& event : builder.ending(dateNow())) builder.onEvent(event);
    return builder.takeRecord();
  }

  const Options options_;
  const Installation& installation_;
  const PluginScan scan_;
  const IsolationOptions isolation_;
  Progress progress_;
  Profile profile_;
  WatchedSignals* const signals_;
};

}  // namespace

ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console,
                         WatchedSignals* signals) {
  const std::vector<SelftestRow> rows = Selftest(options, installation, console, signals).perform();
  if (rows.empty()) throw CommandError(ExitCode::kCannotRead, "nothing was tested: no phone has an expected outcome");
  std::ostringstream text;
  if (options.report.format == Format::kJson) {
    text << documentText(selftestDocument(rows, options.seeds));
  } else {
    printSelftest(text, rows, options.seeds);
  }
  writeOutput(options.report, console, text.str());
  return allPassed(verdictsOf(rows)) ? ExitCode::kAllPassed : ExitCode::kFailed;
}

}  // namespace quazor
