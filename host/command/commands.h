// The program's commands: the whole program, and each command that has a file of its own.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/error/exit_code.h"
#include "host/report/run_report.h"

#include <string>
#include <vector>

namespace quazor {

// Does what the command line asks for and gives the exit code. `arguments` are without the program's name. An interrupt
// while diagnostics run writes what is finished and ends the process. Lets through what is our own fault, as
// exceptions.
ExitCode runProgram(const std::vector<std::string>& arguments, const Installation& installation, Console& console);

// run and experiment; analyze, which runs the analyses of a record again. Throw a CommandError for what is wrong before
// anything has run.
ExitCode runCommand(const Options& options, const Installation& installation, Console& console);
ExitCode analyzeCommand(const Options& options, const Installation& installation, Console& console);

// verify: kAllPassed when every verdict of the record follows from the rest of it, else kFailed. Throws a CommandError
// (kCannotRead).
ExitCode verifyCommand(const Options& options, Console& console);

// diff: kAllPassed when two records tell the same, else kFailed: of the same diagnostics the same verdicts, parameters,
// errors, results and limits. When something was run, how long it took and what it logged makes no difference. Throws a
// CommandError (kCannotRead).
ExitCode diffCommand(const Options& options, Console& console);

// doctor: a line for each plug-in, backend and file that quazor would use: accepted, or refused and why. kAllPassed
// when nothing is refused, else kCannotRead.
ExitCode doctorCommand(const Options& options, const Installation& installation, Console& console);

// selftest: runs what every installed phone is for, with as many seeds as the options say, or only the phones that they
// name. kAllPassed when all is as the phones' scenarios expect, else kFailed. Throws a CommandError for what cannot be
// read.
ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console);

// phone probe: prints what this machine has for a binding, why each fits or not, and a binding to start from, or writes
// that to the output file. What is missing is no failure: kAllPassed. Throws a CommandError (kCannotWrite) when the
// file cannot be written.
ExitCode phoneCommand(const Options& options, Console& console);

// Writes the output of a command that runs no diagnostic to the output file, or else to the console. Throws a
// CommandError (kCannotWrite) when that fails.
void writeOutput(const ReportOptions& report, Console& console, const std::string& output);

}  // namespace quazor
