// quazor doctor: is everything there that quazor needs, and why not?
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"

namespace quazor {

// A line for each plug-in, backend and file that quazor would use: accepted, or refused and why. kAllPassed when
// nothing is refused, else kCannotRead.
ExitCode doctorCommand(const Options& options, const Installation& installation, Console& console);

}  // namespace quazor
