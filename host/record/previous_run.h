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

// The names, in order, of the diagnostics that did not pass, did not finish, or were selected but never started.
std::vector<std::string> failedNames(const RecordedRun& run);

}  // namespace quazor
