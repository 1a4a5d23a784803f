// Commands that repeat a recorded run.
#pragma once

#include "host/report/report_format.h"

#include <string>
#include <vector>

namespace quazor {

// The parts of a command that runs these names on the same phone, with the same plug-ins and seed, and without a
// profile. Each part is quoted for the shell; an option and its argument are one.
std::vector<std::string> commandParts(const RunStarted& run, const std::vector<std::string>& names, std::uint64_t seed);

// "--set experiment.duration=3" for each parameter that has a value.
std::vector<std::string> settingParts(const ResolvedParameters& parameters);

// An option and its argument, quoted for the shell.
std::string optionPart(const std::string& option, const std::string& argument);

// The commands that run the same diagnostics with the same parameters, limits, phone and seed. A setting applies to
// every diagnostic of a command that declares it, so diagnostics with different values are in different commands. A
// command has several lines, each of which ends in a backslash but the last one. Limits that only warn are left
// out, and so are diagnostics that the run did not reach if an earlier record does not tell their parameters.
std::string rerunCommands(const ShownRun& run);

}  // namespace quazor
