// The program's commands.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/error/exit_code.h"
#include "host/report/run_report.h"

#include <functional>
#include <string>
#include <vector>

namespace quazor {

// Does what the command line asks for and gives the exit code. `arguments` are without the program's name. An interrupt
// while diagnostics run writes what is finished and ends the process. Lets through what is our own fault, as
// exceptions.
ExitCode runProgram(const std::vector<std::string>& arguments, const Installation& installation, Console& console);

}  // namespace quazor
