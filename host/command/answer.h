// What a command says that runs nothing.
#pragma once

#include "host/report/run_report.h"

#include <string>

namespace quazor {

// Writes it to the output file, or else to the console. Throws a CommandError (kCannotWrite) when that fails.
void writeOutput(const ReportOptions& report, Console& console, const std::string& answer);

}  // namespace quazor
