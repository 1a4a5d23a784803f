// The command line of quazor.
#pragma once

#include "contract/log_channel.h"
#include "host/error/exit_code.h"
#include "host/plugin/parameters.h"
#include "host/plugin/profile.h"
#include "host/report/run_report.h"
#include "host/run/deadlines.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

enum class Command {
  kList,
  kDescribe,
  kRun,
  kExperiment,
  kVerify,
  kAnalyze,
  kDiff,
  kExplain,
  kDoctor,
  kSelftest,
  kPhone,
  kCompletion
};

// In the order of the enumerators.
inline constexpr std::string_view kCommandNames[] = {"list",   "describe", "run",   "experiment",
                                                     "verify", "analyze",  "diff",  "explain",
                                                     "doctor", "selftest", "phone", "completion"};

// What a command line asks for. Options that its command does not have keep their defaults.
struct Options {
  std::vector<std::string> names;  // of diagnostics and experiments; what is to be explained; a shell; probe
  std::vector<std::filesystem::path> plugins;  // none: the installed one
  std::vector<ParameterOverride> settings;
  std::vector<std::filesystem::path> parameterFiles;
  std::vector<std::filesystem::path> records;  // to be read
  std::filesystem::path record;                // to be written; empty: none
  std::filesystem::path failedOf;              // the record that --only failed means; empty: that of the last run
  std::filesystem::path profile;               // empty: the installed one
  std::optional<Profile> recorded;             // the parameters of the run of which something is run again
  std::filesystem::path phone;                 // a scenario, or linux:BINDING; empty: the installed healthy one
  ReportOptions report;
  std::vector<DeadlineSetting> deadlines;
  std::optional<std::uint64_t> memory;  // of a process of a plug-in, in bytes; nothing: no limit
  std::uint64_t seed = 0;
  std::uint64_t seeds = 0;  // how many, from 0 on
  std::optional<LogLevel> logLevel;
  Command command = Command::kList;
  bool all = false;
  bool onlyFailed = false;
  bool withoutProfile = false;
  bool realTime = false;
  bool systemLog = false;
  bool inProcess = false;
};

struct OptionSummary {
  std::string name;  // as in "--set"
  bool takesValue = false;
};

// What the command of that name can be given; nothing for an unknown command.
std::vector<OptionSummary> optionsOfCommand(const std::string& command);

// The options of a command line, or nothing when it has been answered at once: with the help or the version, on `out`,
// and then `code` is kAllPassed, or with a refusal, on `err`, and then it is kUsage. `arguments` are without the
// program's name.
std::optional<Options> parseCommandLine(const std::vector<std::string>& arguments, std::ostream& out, std::ostream& err,
                                        ExitCode* code);

}  // namespace quazor
