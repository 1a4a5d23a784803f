#include "host/command/commands.h"

#include "contract/message_format.h"
#include "host/record/record_file.h"
#include "host/record/verification.h"
#include "host/report/record_difference.h"
#include "host/text/table.h"

#include <algorithm>
#include <sstream>

namespace quazor {

ExitCode verifyCommand(const Options& options, Console& console) {
  const std::filesystem::path& file = options.records.front();
  const StoredRecord stored = readRecord(file);
  const std::vector<std::string> problems = problemsOf(stored.events);
  std::ostringstream answer;
  for (const std::string& problem : problems) answer << "WRONG  " << printable(problem) << '\n';
  const auto verdicts =
      static_cast<std::size_t>(std::count_if(stored.events.begin(), stored.events.end(), [](const RunEvent& event) {
        return std::holds_alternative<DiagnosticEnded>(event);
      }));
  const bool complete = std::holds_alternative<RunEnded>(stored.events.back());
  answer << countText(stored.events.size(), "event") << ", " << countText(verdicts, "verdict") << ", "
         << countText(problems.size(), "problem") << '\n';
  if (!complete) {
    answer << "The record is incomplete: the run did not end"
           << (stored.cutOff ? ", and the record's last line is cut off.\n" : ".\n");
  }
  writeOutput(options.report, console, answer.str());
  return problems.empty() ? ExitCode::kAllPassed : ExitCode::kFailed;
}

ExitCode diffCommand(const Options& options, Console& console) {
  const RecordedRun before = runIn(options.records[0]);
  const RecordedRun after = runIn(options.records[1]);
  const std::vector<std::string> differences = differencesOf(before, after);
  std::ostringstream answer;
  for (const std::string& one : differences) answer << printable(one) << '\n';
  if (differences.empty()) answer << "The records do not differ.\n";
  writeOutput(options.report, console, answer.str());
  return differences.empty() ? ExitCode::kAllPassed : ExitCode::kFailed;
}

}  // namespace quazor
