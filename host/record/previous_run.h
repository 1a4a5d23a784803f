// The record that is kept of the last run, for those who did not ask for one.
#pragma once

#include "host/record/record_file.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// $XDG_STATE_HOME/quazor/last_run.jsonl, by default in ~/.local/state (XDG base directories). Empty
// when the environment tells neither.
std::filesystem::path previousRunFile();

// The names of what did not pass, or did not come to its end, in their order; what was to be run and was not is among
// them.
std::vector<std::string> failedNames(const RecordedRun& run);

}  // namespace quazor
