// The program's commands: the entry point, and each command that has a file of its own.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/error/exit_code.h"
#include "host/report/run_report.h"
#include "host/system/watched_signals.h"

#include <sstream>
#include <string>
#include <vector>

namespace quazor {

// Executes the command line and returns the exit code. `arguments` excludes the program's name. An interrupt during a
// run writes the reports of the finished diagnostics and ends the process. Exceptions that indicate a defect of quazor
// are passed on.
ExitCode runProgram(const std::vector<std::string>& arguments, const Installation& installation, Console& console);

// run and experiment; analyze, which repeats the analyses of a record. They throw a CommandError for any problem that
// is found before the run starts. `signals` is null with --in-process.
ExitCode runCommand(const Options& options, const Installation& installation, Console& console,
                    WatchedSignals* signals);
ExitCode analyzeCommand(const Options& options, const Installation& installation, Console& console,
                        WatchedSignals* signals);

// verify: kAllPassed if every verdict in each record follows from the rest of it and its run ended. Otherwise the worst
// of kCannotRead (no complete line), kFailed (something is wrong) and kIncomplete (the run did not end). A folder
// stands for the records in it. Throws a CommandError (kCannotRead) if the only record, or a folder, cannot be read,
// and kInterrupted on an interrupt, after the total of the records that are verified. `signals` may be null.
ExitCode verifyCommand(const Options& options, Console& console, WatchedSignals* signals);

// diff: kAllPassed if two records agree, else kFailed. They agree if the same diagnostics have the same verdicts,
// parameters, errors, results, limits and measurements; dates, durations and log lines are not compared. Throws a
// CommandError (kCannotRead).
ExitCode diffCommand(const Options& options, Console& console);

// report: writes the page of records, or the time line of one, also of those whose run did not end, which it says.
// Throws a CommandError: kCannotRead for a record that cannot be read, kUsage if the time line would be too large.
ExitCode reportCommand(const Options& options, const Installation& installation, Console& console);

// doctor: prints one line per plug-in, backend and file that quazor would use: accepted, or refused with the reason.
// kAllPassed if nothing is refused, else kCannotRead. With plug-ins in the options, prints what a reviewer would find
// in each of these instead: kAllPassed if there is no problem, else kCannotRead. Throws a CommandError (kUsage) for
// that with --in-process, where `signals` is null, and for parameters without a plug-in.
ExitCode doctorCommand(const Options& options, const Installation& installation, Console& console,
                       WatchedSignals* signals);

// selftest: runs the expected outcomes of every installed phone, or of the phones and files named in the options, with
// the requested number of seeds. kAllPassed if every outcome is as expected, else kFailed. Throws a CommandError if a
// file cannot be read. An interrupt ends it with kInterrupted, after the matrix of the phones that are done. `signals`
// is null with --in-process.
ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console,
                         WatchedSignals* signals);

// phone list: prints the scenarios that --phone accepts by name, or those that the options name. kCannotRead if one of
// them cannot be read, which is told. Throws a CommandError (kUsage) for a name or pattern that fits none.
// phone probe: prints the devices of this machine that a binding can use, why each fits or not, and a starter binding,
// which goes to the output file if there is one. Missing devices are not a failure: kAllPassed. Throws a CommandError
// (kCannotWrite) if the file cannot be written.
ExitCode phoneCommand(const Options& options, const Installation& installation, Console& console);

// new: makes a folder with the project of a plug-in, which is the installed template with the names of the new one.
// Throws a CommandError, and then leaves nothing behind: kUsage for a name that no plug-in can have, kCannotRead
// without the template, kCannotWrite if the folder exists and is not empty, or cannot be made.
ExitCode newCommand(const Options& options, const Installation& installation, Console& console);

// A stream for the output of such a command: what is printed there fits where writeOutput() writes it.
std::ostringstream textFor(const ReportOptions& report, const Console& console);

// Writes the output of a command that does not run a diagnostic to the output file, or else to the console. Throws a
// CommandError (kCannotWrite) on failure.
void writeOutput(const ReportOptions& report, Console& console, const std::string& output);

}  // namespace quazor
