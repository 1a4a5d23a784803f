// The record that is kept of the last run, for those who did not ask for one.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// $XDG_STATE_HOME/quazor/last_run.jsonl, by default in ~/.local/state (XDG base directories). Empty
// when the environment tells neither.
std::filesystem::path lastRunFile();

// The names of the diagnostics of a record that did not pass, or did not come to their end, in their order; those that
// were to be run and were not are among them. Throws a Refusal (kCannotRead) when the record cannot be read.
std::vector<std::string> namesNotPassed(const std::filesystem::path& record);

}  // namespace quazor
