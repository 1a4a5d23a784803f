// What is run again: that which did not pass, as it was run.
#pragma once

#include "host/command_line.h"
#include "host/profile.h"
#include "host/record_file.h"

namespace quazor {

// The parameters of a run's diagnostics of these names, as a profile; what was not begun is not in it.
Profile recordedProfile(const std::filesystem::path& record, const RecordedRun& run,
                        const std::vector<std::string>& names);

// The options of `run --only failed` with what that means: the names of what did not pass in the record of --of or in
// that of the last run; its parameters, below all that are given now; and its phone and its plug-ins where none are
// given. No names: everything passed. Throws a Refusal (kCannotRead) where there is no such record, and for one with a
// plug-in that could not be loaded.
Options optionsToRunAgain(Options options);

}  // namespace quazor
