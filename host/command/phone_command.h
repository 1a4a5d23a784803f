// `quazor phone probe`: what this machine has for a binding.
#pragma once

#include "host/cli/command_line.h"
#include "host/error/exit_code.h"

namespace quazor {

// Prints what there is, why each fits or not, and a binding to start from, or writes that to the output file. What is
// missing is no failure: kAllPassed. Throws a CommandError (kCannotWrite) when the file cannot be written.
ExitCode phoneCommand(const Options& options, Console& console);

}  // namespace quazor
