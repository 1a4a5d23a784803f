// The record of the previous run, which is kept automatically.
#pragma once

#include "host/record/record_file.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// $XDG_STATE_HOME/quazor/last_run.jsonl, by default in ~/.local/state (XDG base directories). Empty if the environment
// has neither variable.
std::filesystem::path previousRunFile();
// False if nothing is there. A place that cannot be looked at counts as a record; reading it tells why.
bool hasPreviousRun(const std::filesystem::path& file);

// The names, in order, of the diagnostics that did not pass, did not finish, or were selected but never started.
std::vector<std::string> failedNames(const RecordedRun& run);

}  // namespace quazor
