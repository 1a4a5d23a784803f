// Checks the output files of a run before anything runs: a run whose output cannot be written is worthless.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/model/run_event.h"

#include <filesystem>

namespace quazor {

// Throws a CommandError (kCannotWrite) if the file is a record: a report never replaces one.
void refuseRecordAsReport(const std::filesystem::path& file);

// Throws a CommandError: kUsage if a regular file would be written twice, or is an input of this run, under any name;
// kCannotWrite if a report cannot be written or would replace a record. `began` names the plug-ins and the phone.
// Nothing is created.
void checkOutputs(const Options& options, const Installation& installation, const RunStarted& began);

}  // namespace quazor
