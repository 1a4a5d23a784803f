// records: questions about many records. docs/records.md is the public description.
#pragma once

#include "host/cli/records_command_options.h"
#include "host/command/records/answer.h"
#include "host/error/exit_code.h"
#include "host/report/run_report.h"
#include "host/store/database.h"
#include "host/store/run_rows.h"
#include "host/system/watched_signals.h"

#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// Writes the answer to `out`. import: kAllPassed if all records are in the store then, kFailed if one of them is wrong,
// kCannotRead if one is no record. check: kFailed if something is wrong. Others: kAllPassed. Throws a CommandError:
// kCannotRead for a store that is not there, of a later version or damaged, kCannotWrite if it cannot be written,
// kUsage for a run that is not there, kInterrupted. `signals` may be null.
ExitCode recordsCommand(const RecordsRequest& request, Format format, std::ostream& out, Console& console,
                        WatchedSignals* signals);

// Throws a CommandError if records cannot be imported there, as far as can be known before there is one.
void requireStoreFor(const std::filesystem::path& store);

// Imports the record of a run that has ended. Returns why it is not in the store; empty if it is.
std::string importAfterRun(const std::filesystem::path& store, const std::filesystem::path& record);

// What the actions answer. Throw as above.
ExitCode importRecords(const RecordsRequest& request, Answer& answer, Console& console, WatchedSignals* signals);
Answer listAnswer(Database& store, const Filter& filter);
Answer showAnswer(Database& store, const std::string& run);
Answer yieldAnswer(Database& store, const Filter& filter, const std::string& tag);
Answer failuresAnswer(Database& store, const Filter& filter);
Answer flakyAnswer(Database& store, const Filter& filter);
Answer driftAnswer(Database& store, const Filter& filter);
Answer capabilityAnswer(Database& store, const Filter& filter);
Answer gaugeAnswer(Database& store, const Filter& filter);

// The limit of a characteristic, for example "[-2, 2)"; empty without bounds.
std::string limitText(const Characteristic& of);

}  // namespace quazor
