// quazor run and quazor experiment; quazor analyze, which runs the analyses of a record again.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"

namespace quazor {

// Throws a CommandError for what is wrong before anything has run.
ExitCode runCommand(const Options& options, const Installation& installation, Console& console);
ExitCode analyzeCommand(const Options& options, const Installation& installation, Console& console);

}  // namespace quazor
