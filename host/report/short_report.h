// The short text report: one line for a diagnostic that passes, and what did not pass again at the end.
#pragma once

#include "host/model/diagnostic_record.h"

#include <cstddef>
#include <functional>
#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// "9 results, 2 with limits, 1 failed, 1 warning"; empty without results.
std::string resultCountsText(const DiagnosticRecord& record);

// How much of a record the report shows.
enum class Shown { kWhole, kLine, kNothing };

// Chooses what is shown of repetitions that did not pass at once: the first of a diagnostic whole, and of the others
// one line for each kind of failure. What passed with a warning or after an error is shown whole.
// Thread: one at a time.
class ShownFailures {
 public:
  Shown add(const DiagnosticRecord& record);

 private:
  std::set<std::string> names_;
  std::set<std::pair<std::string, std::string>> kinds_;  // names and failures
};

// Prints the verdict in one line with the number of results, the rows of results that are noteworthy
// (text_report.h) and, unless the diagnostic passed, its summary and its error; with kLine only the verdict
// and what failed. The name is padded to `nameWidth`.
void printShortRecord(std::ostream& out, const DiagnosticRecord& record, bool colour, std::size_t nameWidth,
                      Shown shown = Shown::kWhole);

// What to ask `quazor explain` about a diagnostic that did not pass, the most specific first: its error, or its results
// that failed, and then its name.
std::vector<std::string> topicsOf(const DiagnosticRecord& record);

// Prints a line for each diagnostic that did not pass or that passed only after an error, with the results that failed
// or with its error, and then the command that explains them; nothing if all passed. The command names only what
// `isExplained` accepts: of each diagnostic its error, or the first of its results that failed, or else itself.
void printFailures(std::ostream& out, const std::vector<DiagnosticRecord>& records, bool colour,
                   const std::function<bool(const std::string& topic)>& isExplained);

// Prints a sentence about the diagnostics that passed although none of their results has a limit, and how to set one;
// nothing if there are none.
void printUnlimited(std::ostream& out, const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
