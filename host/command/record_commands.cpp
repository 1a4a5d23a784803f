#include "host/command/commands.h"

#include "base/text/letter_case.h"
#include "contract/message_format.h"
#include "host/model/incomplete_run.h"
#include "host/record/record_file.h"
#include "host/record/record_place.h"
#include "host/record/verification.h"
#include "host/report/progress.h"
#include "host/report/record_difference.h"
#include "host/text/table.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <iterator>
#include <optional>
#include <sstream>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

namespace quazor {

namespace {

// What verify found in a record.
struct Finding {
  ExitCode code = ExitCode::kAllPassed;
  std::string counts;   // of events and verdicts; empty if a line is wrong
  std::string missing;  // what an incomplete record lacks
  std::vector<std::string> problems;
  std::string interrupted{};  // says that the run was interrupted; empty if it was not
};

std::string problemCount(const Finding& finding) { return countText(finding.problems.size(), "problem"); }

// Thrown in the middle of a record when the user interrupts. Thread: any.
struct VerificationInterrupted {};

// Shows on a terminal which record is verified, and ends the verification on an interrupt.
// Thread: one at a time.
class VerificationProgress {
 public:
  // Both are borrowed; `signals` may be null.
  VerificationProgress(Console& console, WatchedSignals* signals, std::size_t records)
      : line_(console.showsProgress ? &console.err : nullptr), signals_(signals), records_(records) {}

  void begin(const std::filesystem::path& file) {
    ++number_;
    file_ = file;
    std::error_code ignored;
    size_ = std::filesystem::file_size(file, ignored);
    if (ignored) size_ = 0;
    update(0);
  }

  // Throws VerificationInterrupted.
  void update(std::uint64_t bytes) {
    if (signals_ != nullptr && signals_->requestsToEnd() > 0) throw VerificationInterrupted();
    const auto now = std::chrono::steady_clock::now();
    if (!line_.isShown() || now < nextUpdate_) return;
    nextUpdate_ = now + std::chrono::milliseconds(100);
    std::string text = "Verifying";
    if (records_ > 1) text += formatMessage(" %@ of %@", number_, records_);
    if (size_ >= kMebibyte) text += formatMessage(" (%@ of %@ MiB)", bytes / kMebibyte, size_ / kMebibyte);
    line_.show(text + ": " + printable(file_.filename().string()));
  }

  void erase() { line_.erase(); }

 private:
  static constexpr std::uint64_t kMebibyte = 1U << 20U;

  StatusLine line_;
  WatchedSignals* const signals_;
  const std::size_t records_;
  std::size_t number_ = 0;
  std::filesystem::path file_;
  std::uint64_t size_ = 0;
  std::chrono::steady_clock::time_point nextUpdate_ = std::chrono::steady_clock::now() + std::chrono::milliseconds(300);
};

// For example "3 verdicts (2 pass, 1 fail)".
std::string verdictsText(const std::vector<RunEvent>& events) {
  std::size_t all = 0;
  std::string kinds;
  for (const Verdict verdict : {Verdict::kPass, Verdict::kFail, Verdict::kError, Verdict::kSkip}) {
    const auto number =
        static_cast<std::size_t>(std::count_if(events.begin(), events.end(), [&](const RunEvent& event) {
          const auto* const ended = std::get_if<DiagnosticEnded>(&event);
          return ended != nullptr && ended->verdict == verdict;
        }));
    all += number;
    if (number > 0) kinds += formatMessage("%@%@ %@", kinds.empty() ? "" : ", ", number, nameOf(verdict));
  }
  return countText(all, "verdict") + (kinds.empty() ? "" : " (" + kinds + ")");
}

// Empty if the run was not interrupted. The last event is its end.
std::string interruptionText(const std::vector<RunEvent>& events) {
  const std::optional<std::string>& interrupted = std::get<RunEnded>(events.back()).interrupted;
  if (!interrupted) return {};
  const auto* const began = std::get_if<RunStarted>(&events.front());
  return "the run was interrupted while " + nameOfRunning(began == nullptr ? RunStarted{} : *began, *interrupted) +
         " was running";
}

Finding verifyRecord(const std::filesystem::path& file, VerificationProgress& progress) {
  Finding finding;
  StoredRecord stored;
  progress.begin(file);
  try {
    stored = readRecord(file, [&progress](std::uint64_t bytes) { progress.update(bytes); });
  } catch (const RecordDefect& defect) {
    return {ExitCode::kFailed, {}, {}, {defect.what()}};
  }
  finding.problems = problemsOfRecord(stored);
  const bool isComplete = std::holds_alternative<RunEnded>(stored.events.back());
  finding.counts = countText(stored.events.size(), "event") + ", " + verdictsText(stored.events);
  if (isComplete) finding.interrupted = interruptionText(stored.events);
  if (!isComplete) {
    finding.missing =
        stored.cutOff ? "the run did not end, and the record's last line is cut off" : "the run did not end";
    finding.code = ExitCode::kIncomplete;
  }
  if (!finding.problems.empty()) finding.code = ExitCode::kFailed;
  return finding;
}

ExitCode verifyOne(const std::filesystem::path& file, const Options& options, Console& console,
                   WatchedSignals* signals) {
  VerificationProgress progress(console, signals, 1);
  Finding finding;
  try {
    finding = verifyRecord(file, progress);
  } catch (const VerificationInterrupted&) {
    throw CommandError(ExitCode::kInterrupted, "interrupted before the record was verified");
  }
  progress.erase();
  std::string answer;
  for (const std::string& problem : finding.problems) answer += "WRONG  " + printable(problem) + "\n";
  if (!finding.counts.empty()) answer += finding.counts + ", " + problemCount(finding) + "\n";
  if (!finding.missing.empty()) answer += "The record is incomplete: " + finding.missing + ".\n";
  if (!finding.interrupted.empty()) answer += capitalized(printable(finding.interrupted)) + ".\n";
  writeOutput(options.report, console, answer);
  return finding.code;
}

// How a record can be, best first. Text and count are those of the answer.
struct Outcome {
  ExitCode code;
  std::string_view word;
  std::string_view name;
  std::size_t records = 0;
};

std::string lineOf(const std::filesystem::path& file, const Finding& finding, std::string_view word) {
  std::string line(word);
  line.append(12 - word.size(), ' ');
  line += printable(file.string()) + ": ";
  if (finding.code == ExitCode::kCannotRead) return line + printable(finding.problems.front()) + "\n";
  line += finding.counts;
  line += (finding.counts.empty() ? "" : ", ") + problemCount(finding);
  if (!finding.missing.empty()) line += "; " + finding.missing;
  if (!finding.interrupted.empty()) line += "; " + printable(finding.interrupted);
  line += "\n";
  for (const std::string& problem : finding.problems) line += "    " + printable(problem) + "\n";
  return line;
}

ExitCode verifyMany(const std::vector<std::filesystem::path>& files, Console& console, WatchedSignals* signals) {
  Outcome outcomes[] = {{ExitCode::kAllPassed, "OK", "OK"},
                        {ExitCode::kIncomplete, "INCOMPLETE", "incomplete"},
                        {ExitCode::kFailed, "WRONG", "wrong"},
                        {ExitCode::kCannotRead, "UNREADABLE", "unreadable"}};
  VerificationProgress progress(console, signals, files.size());
  std::size_t verified = 0;
  for (const std::filesystem::path& file : files) {
    Finding finding;
    try {
      finding = verifyRecord(file, progress);
    } catch (const CommandError& refusal) {
      finding = {refusal.code(), {}, {}, {refusal.what()}};
    } catch (const VerificationInterrupted&) {
      break;
    }
    ++verified;
    progress.erase();
    Outcome& outcome = *std::find_if(std::begin(outcomes), std::end(outcomes),
                                     [&finding](const Outcome& one) { return one.code == finding.code; });
    ++outcome.records;
    console.out << lineOf(file, finding, outcome.word) << std::flush;
  }
  std::string total;
  ExitCode worst = ExitCode::kAllPassed;
  for (const Outcome& one : outcomes) {
    if (one.records == 0) continue;
    total += (total.empty() ? ": " : ", ") + std::to_string(one.records) + " " + std::string(one.name);
    worst = one.code;
  }
  progress.erase();
  console.out << countText(verified, "record") << total << '\n' << std::flush;
  if (!console.out) throw CommandError(ExitCode::kCannotWrite, "standard output cannot be written");
  if (verified < files.size()) {
    throw CommandError(ExitCode::kInterrupted,
                       formatMessage("interrupted: %@ of %@ records were verified", verified, files.size()));
  }
  return worst;
}

}  // namespace

ExitCode verifyCommand(const Options& options, Console& console, WatchedSignals* signals) {
  const std::vector<std::filesystem::path>& given = options.records;
  std::error_code ignored;
  const bool isOne = given.size() == 1 && !std::filesystem::is_directory(given.front(), ignored);
  return isOne ? verifyOne(given.front(), options, console, signals) : verifyMany(recordsIn(given), console, signals);
}

ExitCode diffCommand(const Options& options, Console& console) {
  const RecordedRun before = runIn(options.records[0]);
  const RecordedRun after = runIn(options.records[1]);
  const std::vector<std::string> differences = differencesOf(before, after);
  std::ostringstream answer = textFor(options.report, console);
  for (const std::string& one : differences) answer << printable(one) << '\n';
  if (differences.empty()) answer << "The records do not differ.\n";
  writeOutput(options.report, console, answer.str());
  return differences.empty() ? ExitCode::kAllPassed : ExitCode::kFailed;
}

}  // namespace quazor
