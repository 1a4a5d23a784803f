#include "host/command/commands.h"

#include "contract/message_format.h"
#include "host/record/record_file.h"
#include "host/record/verification.h"
#include "host/report/record_difference.h"
#include "host/text/table.h"

#include <algorithm>
#include <sstream>

namespace quazor {

namespace {

// Appends what verify says about a record and returns its exit code.
ExitCode verifyRecord(const std::filesystem::path& file, std::ostream& answer) {
  StoredRecord stored;
  try {
    stored = readRecord(file);
  } catch (const RecordDefect& defect) {
    answer << "WRONG  " << printable(defect.what()) << '\n';
    return ExitCode::kFailed;
  }
  std::vector<std::string> problems = problemsOf(stored.events);
  const bool complete = std::holds_alternative<RunEnded>(stored.events.back());
  if (complete && stored.cutOff) problems.emplace_back("an incomplete line follows the end of the run");
  for (const std::string& problem : problems) answer << "WRONG  " << printable(problem) << '\n';
  const auto verdicts =
      static_cast<std::size_t>(std::count_if(stored.events.begin(), stored.events.end(), [](const RunEvent& event) {
        return std::holds_alternative<DiagnosticEnded>(event);
      }));
  answer << countText(stored.events.size(), "event") << ", " << countText(verdicts, "verdict") << ", "
         << countText(problems.size(), "problem") << '\n';
  if (!complete) {
    answer << "The record is incomplete: the run did not end"
           << (stored.cutOff ? ", and the record's last line is cut off.\n" : ".\n");
  }
  if (!problems.empty()) return ExitCode::kFailed;
  return complete ? ExitCode::kAllPassed : ExitCode::kIncomplete;
}

}  // namespace

ExitCode verifyCommand(const Options& options, Console& console) {
  constexpr ExitCode kWorstFirst[] = {ExitCode::kCannotRead, ExitCode::kFailed, ExitCode::kIncomplete};
  const bool isOne = options.records.size() == 1;
  std::ostringstream answer;
  std::vector<ExitCode> codes;
  for (const std::filesystem::path& file : options.records) {
    if (!isOne) answer << printable(file.string()) << ":\n";
    try {
      codes.push_back(verifyRecord(file, answer));
    } catch (const CommandError& refusal) {
      if (isOne) throw;
      answer << "WRONG  " << printable(refusal.what()) << '\n';
      codes.push_back(refusal.code());
    }
  }
  writeOutput(options.report, console, answer.str());
  for (const ExitCode code : kWorstFirst) {
    if (std::find(codes.begin(), codes.end(), code) != codes.end()) return code;
  }
  return ExitCode::kAllPassed;
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
