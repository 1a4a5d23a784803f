// quazor selftest.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"

namespace quazor {

// Runs what every installed phone is for, with as many seeds as the options say, or only the phones that they name.
// kAllPassed when all is as the phones' scenarios expect, else kFailed. Throws a CommandError for what cannot be read.
ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console);

}  // namespace quazor
