#include "host/report/short_report.h"

#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/report/text_report.h"
#include "host/report/variation_report.h"
#include "host/text/display_width.h"
#include "host/text/shell_word.h"
#include "host/text/table.h"
#include "host/text/terminal.h"

#include <algorithm>
#include <sstream>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

// Telling more would push the other diagnostics off the screen.
constexpr std::size_t kMaxNamed = 3;  // of a diagnostic
constexpr std::size_t kMaxAsked = 12;

std::vector<ResultVerdict> verdictsOf(const DiagnosticRecord& record, const std::vector<LimitCheck>& checks) {
  std::vector<ResultVerdict> verdicts;
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    verdicts.push_back(verdictOf(record.measuredResults[i], checksOfResult(checks, i)));
  }
  return verdicts;
}

// The results that failed, each once, in their order.
std::vector<std::string> failedResults(const DiagnosticRecord& record) {
  const std::vector<ResultVerdict> verdicts = verdictsOf(record, limitChecksOf(record));
  std::vector<std::string> names;
  for (std::size_t i = 0; i < verdicts.size(); ++i) {
    const std::string& name = record.measuredResults[i].result.name();
    const bool isNew = std::find(names.begin(), names.end(), name) == names.end();
    if (verdicts[i] == ResultVerdict::kFail && isNew) names.push_back(name);
  }
  return names;
}

std::string failureText(const DiagnosticRecord& record) {
  if (record.skip) return textOf(*record.skip);
  if (record.error != nullptr) return formatMessage("%@ code %@", record.error->domain(), record.error->code());
  return listText(failedResults(record), kMaxNamed);
}

// A line that says what did not pass. The repetitions that ended alike share one.
struct FailureLine {
  std::string text;
  std::string first;  // the attempt and repetition of the first
  bool isRepeated = false;
  std::size_t times = 1;
};

FailureLine lineOf(const std::vector<DiagnosticRecord>& records, std::size_t index, bool colour) {
  const DiagnosticRecord& record = records[index];
  FailureLine line{{}, trialTextWithSeed(record), record.trial.repetition > 0};
  if (isFlaky(record) && record.verdict == Verdict::kPass) {
    line.text = flakyColumn(colour) + printable(record.name);
    const DiagnosticErrorPtr before = index == 0 ? nullptr : records[index - 1].error;  // of the attempt before
    if (before != nullptr) line.text += printable(formatMessage(": %@ code %@", before->domain(), before->code()));
  } else {
    line.text = verdictColumn(record, colour) + printable(record.name);
    if (const std::string text = failureText(record); !text.empty()) line.text += ": " + printable(text);
  }
  return line;
}

void addLine(std::vector<FailureLine>& lines, FailureLine line) {
  const auto same = std::find_if(lines.begin(), lines.end(), [&line](const FailureLine& one) {
    return one.isRepeated && line.isRepeated && one.text == line.text;
  });
  if (same == lines.end()) {
    lines.push_back(std::move(line));
  } else {
    ++same->times;
  }
}

std::string textOf(const FailureLine& line) {
  if (line.times > 1) return formatMessage("%@ (%@ times, first in %@)", line.text, line.times, line.first);
  return line.first.empty() ? line.text : formatMessage("%@ (%@)", line.text, line.first);
}

bool holds(const std::vector<std::string>& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

// What has an explanation: the error, or else the results that failed, or else the diagnostic.
std::vector<std::string> explained(const DiagnosticRecord& record,
                                   const std::function<bool(const std::string& topic)>& isExplained) {
  std::vector<std::string> topics = topicsOf(record);
  std::erase_if(topics, [&isExplained](const std::string& topic) { return !isExplained(topic); });
  if (topics.size() > 1 && topics.back() == record.name) topics.pop_back();
  return topics;
}

// The topics of the command that explains what did not pass, each once.
// Thread: one at a time.
class Questions {
 public:
  void add(const std::vector<std::string>& topicsOfOne) {
    std::size_t ofThis = 0;
    for (const std::string& topic : topicsOfOne) {
      if (holds(asked_, topic)) continue;
      if (ofThis < kMaxNamed && asked_.size() < kMaxAsked) {
        asked_.push_back(topic);
        ++ofThis;
      } else if (!holds(left_, topic)) {
        left_.push_back(topic);
      }
    }
  }

  void print(std::ostream& out, std::size_t columns) const {
    if (asked_.empty()) return;
    const std::string command = "quazor explain";
    std::string all = "Next: " + command;
    for (const std::string& topic : asked_) all += ' ' + shellWord(topic);
    if (widthOf(all) <= columns) {
      out << all << '\n';
    } else {
      // A command that is broken into lines cannot be pasted.
      std::string_view before = "Next: ";
      for (const std::string& topic : asked_)
        out << std::exchange(before, kIndent) << command << ' ' << shellWord(topic) << '\n';
    }
    const auto more =
        std::count_if(left_.begin(), left_.end(), [this](const std::string& topic) { return !holds(asked_, topic); });
    if (more > 0) out << kIndent << "and " << more << " more\n";
  }

 private:
  static constexpr std::string_view kIndent = "      ";

  std::vector<std::string> asked_;
  std::vector<std::string> left_;  // there is no room for them
};

void addCount(std::string& text, std::size_t number, std::string_view one, std::string_view several) {
  if (number > 0) text += formatMessage(", %@ %@", number, number == 1 ? one : several);
}

}  // namespace

std::vector<std::string> topicsOf(const DiagnosticRecord& record) {
  std::vector<std::string> topics;
  if (record.error != nullptr) {
    topics.push_back(formatMessage("%@:%@", record.error->domain(), record.error->code()));
  } else {
    topics = failedResults(record);
  }
  topics.push_back(record.name);
  return topics;
}

std::string resultCountsText(const DiagnosticRecord& record) {
  if (record.measuredResults.empty()) return {};
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  const std::vector<ResultVerdict> verdicts = verdictsOf(record, checks);
  const auto countOf = [&verdicts](ResultVerdict verdict) {
    return static_cast<std::size_t>(std::count(verdicts.begin(), verdicts.end(), verdict));
  };
  std::string text = countText(verdicts.size(), "result");
  const std::size_t limited = verdicts.size() - countOf(ResultVerdict::kNone);
  if (limited == 0) text += ", none with a limit";
  addCount(text, limited, "with a limit", "with limits");
  addCount(text, countOf(ResultVerdict::kFail), "failed", "failed");
  addCount(text, countOf(ResultVerdict::kError), "not judged", "not judged");
  addCount(text, warningsIn(checks), "warning", "warnings");
  return text;
}

Shown ShownFailures::add(const DiagnosticRecord& record) {
  if (record.trial.repetition == 0 || record.verdict == Verdict::kPass) return Shown::kWhole;
  const bool isNewKind = kinds_.emplace(record.name, std::string(nameOf(record.verdict)) + failureText(record)).second;
  if (names_.insert(record.name).second) return Shown::kWhole;
  return isNewKind ? Shown::kLine : Shown::kNothing;
}

void printShortRecord(std::ostream& out, const DiagnosticRecord& record, bool colour, std::size_t nameWidth,
                      Shown shown) {
  if (shown == Shown::kNothing) return;
  std::string more = record.skip ? printable(textOf(*record.skip)) : resultCountsText(record);
  if (shown == Shown::kLine) {
    more = printable(failureText(record));
    if (record.error != nullptr) more += ": " + printable(record.error->localizedDescription());
  }
  const std::string trial = trialTextWithSeed(record);
  printVerdict(out, record, colour, trial + (trial.empty() || more.empty() ? "" : ", ") + more, nameWidth);
  if (record.skip || shown == Shown::kLine) return;
  const bool passed = record.verdict == Verdict::kPass;
  std::ostringstream table;
  prepareFor(out, table);
  printResults(table, record, ResultRows::kNoteworthy, colour);
  if (!passed) out << indentedLines(record.summary, "  ");
  printAuxiliaryTexts(out, record);
  if (record.verdict == Verdict::kError) out << '\n' << errorText(record.error, "  ");
  if (!table.view().empty()) out << (passed ? "" : "\n") << table.str();
  if (!passed || !table.view().empty()) out << '\n';
}

void printFailures(std::ostream& out, const std::vector<DiagnosticRecord>& records, bool colour,
                   const std::function<bool(const std::string& topic)>& isExplained) {
  Questions questions;
  std::vector<FailureLine> lines;
  for (std::size_t i = 0; i < records.size(); ++i) {
    const DiagnosticRecord& record = records[i];
    if (record.verdict == Verdict::kPass && !isFlaky(record)) continue;
    if (!hasLaterAttempt(records, i)) addLine(lines, lineOf(records, i, colour));
    if (isExplained && !record.skip && record.verdict != Verdict::kPass) questions.add(explained(record, isExplained));
  }
  for (const FailureLine& line : lines) out << textOf(line) << '\n';
  questions.print(out, columnsOf(out));
}

void printUnlimited(std::ostream& out, const std::vector<DiagnosticRecord>& records) {
  std::vector<std::string> names;
  for (const DiagnosticRecord& record : records) {
    if (record.verdict != Verdict::kPass || record.measuredResults.empty()) continue;
    const std::vector<ResultVerdict> verdicts = verdictsOf(record, limitChecksOf(record));
    const bool isUnlimited =
        std::all_of(verdicts.begin(), verdicts.end(), [](ResultVerdict one) { return one == ResultVerdict::kNone; });
    if (isUnlimited && !holds(names, printable(record.name))) names.push_back(printable(record.name));
  }
  if (names.empty()) return;
  const std::string who = listText(names, kMaxNamed);
  out << formatMessage(
      "No result of %@ has a limit, so %@ measured. Add limits: --limit 'RESULT >= NUMBER', or --profile.\n", who,
      names.size() == 1 ? "it passes whatever is" : "they pass whatever is");
}

}  // namespace quazor
