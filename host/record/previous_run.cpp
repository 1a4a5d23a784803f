#include "host/record/previous_run.h"

#include "host/system/user_directory.h"

#include <algorithm>
#include <system_error>

namespace quazor {

std::filesystem::path previousRunFile() {
  const std::filesystem::path state = userDirectory("XDG_STATE_HOME", ".local/state");
  return state.empty() ? state : state / "last_run.jsonl";
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
