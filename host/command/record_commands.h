// quazor verify and quazor diff: what can be said of records without running anything.
#pragma once

#include "host/cli/command_line.h"

namespace quazor {

// kAllPassed when every verdict of the record follows from the rest of it, else kFailed. Throws a CommandError
// (kCannotRead).
ExitCode verifyCommand(const Options& options, Console& console);

// kAllPassed when two records tell the same, else kFailed: of the same diagnostics the same verdicts, parameters,
// errors, results and limits. When something was run, how long it took and what it logged makes no difference. Throws a
// CommandError (kCannotRead).
ExitCode diffCommand(const Options& options, Console& console);

}  // namespace quazor
