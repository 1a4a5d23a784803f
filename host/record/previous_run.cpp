#include "host/record/previous_run.h"

#include <algorithm>
#include <cstdlib>
#include <system_error>

namespace quazor {

namespace {

std::filesystem::path directoryIn(const char* variable) {
  const char* const value = std::getenv(variable);
  // The XDG base directory rules require that relative paths are ignored.
  return value != nullptr && *value == '/' ? value : "";
}

}  // namespace

std::filesystem::path previousRunFile() {
  std::filesystem::path state = directoryIn("XDG_STATE_HOME");
  if (state.empty()) {
    state = directoryIn("HOME");
    if (state.empty()) return {};
    state /= ".local/state";
  }
  return state / "quazor" / "last_run.jsonl";
}

bool hasPreviousRun(const std::filesystem::path& file) {
  std::error_code error;
  return std::filesystem::status(file, error).type() != std::filesystem::file_type::not_found;
}

std::vector<std::string> failedNames(const RecordedRun& run) {
  std::vector<std::string> names;
  for (const std::string& name : run.began.names) {
    const bool passed = std::any_of(run.records.begin(), run.records.end(), [&name](const DiagnosticRecord& one) {
      return one.name == name && one.verdict == Verdict::kPass;
    });
    if (!passed) names.push_back(name);
  }
  return names;
}

}  // namespace quazor
