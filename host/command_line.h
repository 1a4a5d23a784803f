// The command line of quazor.
#pragma once

#include "frame/log_channel.h"
#include "host/exit_code.h"
#include "host/parameters.h"
#include "host/run_report.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

enum class Command { kList, kDescribe, kRun, kExperiment };

// What a command line asks for. Options that its command does not have keep their defaults.
struct Options {
  std::vector<std::string> names;
  std::vector<std::filesystem::path> plugins;  // none: the installed one
  std::vector<Setting> settings;
  std::filesystem::path profile;  // empty: the installed one
  std::filesystem::path phone;    // empty: the installed healthy one
  ReportOptions report;
  std::uint64_t seed = 0;
  std::optional<LogLevel> logLevel;
  Command command = Command::kList;
  bool all = false;
  bool withoutProfile = false;
  bool realTime = false;
  bool systemLog = false;
};

// The options of a command line, or nothing when it has been answered at once: with the help or the version, on `out`,
// and then `code` is kAllPassed, or with a refusal, on `err`, and then it is kUsage. `arguments` are without the
// program's name.
std::optional<Options> parseCommandLine(const std::vector<std::string>& arguments, std::ostream& out, std::ostream& err,
                                        ExitCode* code);

}  // namespace quazor
