// The text report.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"

#include <cstddef>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// The capabilities of the output, and how much is shown.
struct TextStyle {
  bool colour = false;
  bool blocks = false;   // supports UTF-8 and block elements
  bool verbose = false;  // shows every result of a diagnostic
};

// The limit's name and range: "FrameTotalLimit: = 90", "Min Frame Count: >= 90", "Range: > 1, <= 2"; "-" for none.
std::string limitText(const std::optional<QZLimit>& limit);

// The value with its unit: "90 frames", "2.5" without a unit.
std::string valueText(const Measurement& measurement);

// "BackTele.Total is 87 frames, limit FrameTotalLimit: = 90".
std::string againstLimitText(const QZMeasuredResult& result, const std::string& limit);

// The error and its underlying errors, one line each, the nearest first.
std::string errorText(const DiagnosticErrorPtr& error, std::string_view indent);

// The stage of the record's error for tables: that of the analysis if its results cannot be judged, "record" if the
// record could not be written; empty without an error, or if it was interrupted at an unknown stage.
std::string_view errorStageText(const DiagnosticRecord& record);

// Prints what the experiment says in words, "Camera: 0, FrontFacingCamera": a line for each text of its auxiliary data.
void printAuxiliaryTexts(std::ostream& out, const DiagnosticRecord& record);

// "PASS", "FAIL" or "ERROR"; "DONE" for an experiment on its own that returned a result.
std::string verdictText(const DiagnosticRecord& record, bool colour);
// The same, padded to a column of its own.
std::string verdictColumn(const DiagnosticRecord& record, bool colour);
// "FLAKY" in that column, for a pass after an error.
std::string flakyColumn(bool colour);

// Prints one diagnostic's measured results as a table, then its verdict and, for kError, the error.
void printRecord(std::ostream& out, const DiagnosticRecord& record, bool colour);

// The rows of a table of results.
enum class ResultRows {
  kAll,         // with the severity of the user's limits
  kNoteworthy,  // a result that failed or cannot be judged, and every limit of the user
};

// Prints the rows as a table, or nothing if there are none.
void printResults(std::ostream& out, const DiagnosticRecord& record, ResultRows rows, bool colour);

// Prints a record as one line, "PASS  NAME", followed by `more`. The name is padded to `nameWidth` if there is more.
void printVerdict(std::ostream& out, const DiagnosticRecord& record, bool colour, const std::string& more = {},
                  std::size_t nameWidth = 0);

// Prints one line with the number of records per verdict, and of those that the run did not reach.
void printSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records, std::size_t notReached = 0);

// Prints each declared fault that never fired, because such a run says nothing about it.
void printUnfiredFaults(std::ostream& out, const DiagnosticRecord& record);

// Prints the diagnostics, then the experiments on their own, which must have been described.
void printList(std::ostream& out, const std::vector<DescribedDiagnostic>& diagnostics);
void printDescriptions(std::ostream& out, const std::vector<ResolvedDiagnostic>& diagnostics);

}  // namespace quazor
