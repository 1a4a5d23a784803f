// Commands in explanations, fitted to the run that a page shows.
#pragma once

#include "host/report/report_format.h"

#include <string>

namespace quazor {

// A run, and the diagnostic of it that is explained. Borrows both.
struct Explained {
  const ShownRun& run;
  const DiagnosticRecord& record;
};

// The command with the run's phone, and with the name of the diagnostic or experiment in place of NAME. A text that is
// no command to run something stays as it is.
std::string fittedCommand(const std::string& command, const Explained& explained);

// What the run already shows of the command: "already run here: passed", or "used in this run" for a profile; else
// empty. Nothing is said of the explained diagnostic itself, which is to be run again.
std::string knownOfCommand(const std::string& command, const Explained& explained);

}  // namespace quazor
