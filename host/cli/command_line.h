// The command line of quazor.
#pragma once

#include "contract/log_channel.h"
#include "host/cli/choice_options.h"
#include "host/cli/records_command_options.h"
#include "host/cli/report_command_options.h"
#include "host/error/exit_code.h"
#include "host/limits/user_limit.h"
#include "host/plugin/parameters.h"
#include "host/plugin/profile.h"
#include "host/report/run_report.h"
#include "host/run/deadlines.h"
#include "host/run/frame_teller.h"
#include "host/run/log_limit.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <map>
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
  kReport,
  kRecords,
  kExplain,
  kDoctor,
  kSelftest,
  kPhone,
  kCompletion,
  kNew
};

// In the order of the enumerators.
inline constexpr std::string_view kCommandNames[] = {"list",    "describe", "run",    "experiment", "verify",
                                                     "analyze", "diff",     "report", "records",    "explain",
                                                     "doctor",  "selftest", "phone",  "completion", "new"};

// 'quazor help' and 'quazor help NAME' are 'quazor --help' and 'quazor NAME --help'.
inline constexpr const char* kHelpWord = "help";

// A parsed command line. Options that the command does not have keep their defaults.
struct Options {
  // Positional arguments: diagnostics or experiments, topics, a shell, "probe", "list" and phones, a folder.
  std::vector<std::string> names;
  std::vector<std::filesystem::path> plugins;  // empty: those in the folders of plug-ins
  std::vector<ParameterOverride> settings;
  std::vector<UserLimit> limits;
  OrderedMap<std::string> tags;
  std::vector<std::filesystem::path> parameterFiles;  // or names of profiles
  std::vector<std::filesystem::path> records;         // to read
  std::filesystem::path record;                       // to write, or the folder for it; empty: none
  std::filesystem::path failedOf;                     // the record for --only failed; empty: that of the last run
  std::filesystem::path profile;                      // empty: the default one
  std::optional<Profile> recorded;                    // the parameters of the run that is repeated
  std::vector<std::filesystem::path> bases;           // of profiles and phone: files that a run reads besides
  std::filesystem::path phone;                        // a scenario, or linux:BINDING; empty: the installed healthy one
  Choice choice;                                      // of what runs
  ReportOptions report;
  std::vector<DeadlineSetting> deadlines;
  std::chrono::nanoseconds grace = kDefaultGrace;
  std::chrono::nanoseconds heartbeat{};  // zero: none
  std::optional<std::uint64_t> memory;   // limit of a plug-in process, in bytes; nothing: no limit
  std::uint64_t seed = 0;
  bool hasSeed = false;                         // --seed was given
  std::map<std::string, std::uint64_t> seedOf;  // of a diagnostic whose seed is not that of the run
  std::uint64_t seeds = 0;                      // the number of seeds, starting at 0
  std::optional<LogLevel> logLevel;
  LogLimit logLimit;  // of each diagnostic
  TraceSetting trace;
  RecordReport ofRecords;       // what report makes of records
  RecordsRequest ofStore;       // what records is asked for
  std::filesystem::path store;  // to import the record of a run into; empty: none
  Command command = Command::kList;
  bool all = false;
  bool onlyFailed = false;
  bool replace = false;  // an existing record
  bool withoutProfile = false;
  bool realTime = false;
  bool systemLog = false;
  bool inProcess = false;
};

// Only commands that run or analyze write several reports, each in one of all formats.
constexpr bool writesSeveralFormats(Command command) {
  return command == Command::kRun || command == Command::kExperiment || command == Command::kAnalyze;
}

struct OptionSummary {
  std::string name;  // as in "--set"
  bool takesValue = false;
};

// The options of the command with that name; empty for an unknown command.
std::vector<OptionSummary> optionsOfCommand(const std::string& command);

// Parses a command line without the program's name. Returns nothing if there is nothing to execute: after printing the
// help or the version on `out`, with `code` kAllPassed, or an error message on `err`, with `code` kUsage.
std::optional<Options> parseCommandLine(const std::vector<std::string>& arguments, std::ostream& out, std::ostream& err,
                                        ExitCode* code);

}  // namespace quazor
