#include "host/record/previous_run.h"

#include "host/model/incomplete_run.h"
#include "host/model/trials.h"
#include "host/system/user_directory.h"

#include <map>
#include <set>
#include <system_error>
#include <utility>

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
  std::map<std::string, std::vector<DiagnosticRecord>> entries;
  for (const DiagnosticRecord& record : run.records) {
    DiagnosticRecord entry;  // what the verdict of the run needs
    entry.name = record.name;
    entry.verdict = record.verdict;
    entry.trial = record.trial;
    entries[record.name].push_back(std::move(entry));
  }
  std::set<std::string> incomplete;
  for (const PlannedDiagnostic& one : missingOf(run.began, run.records)) incomplete.insert(one.name);
  std::vector<std::string> names;
  for (const std::string& name : run.began.names) {
    const bool passed = !incomplete.contains(name) && entries.contains(name) &&
                        runVerdictOf(entries[name], run.began.acceptFlaky) == Verdict::kPass;
    if (!passed) names.push_back(name);
  }
  return names;
}

}  // namespace quazor
