// The report for people.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"

#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// The limit's name and range: "FrameTotalLimit: = 90", "Min Frame Count: >= 90", "Range: > 1, <= 2"; "-" for none.
std::string limitText(const std::optional<QZLimit>& limit);

// The error and the errors that caused it, one line each, the nearest first.
std::string errorText(const DiagnosticErrorPtr& error, std::string_view indent);

// "PASS", "FAIL" or "ERROR"; "DONE" for an experiment on its own that returned a result.
std::string verdictText(const DiagnosticRecord& record, bool colour);

// One diagnostic's measured results as a table, then its verdict and, with kError, the error.
void printRecord(std::ostream& out, const DiagnosticRecord& record, bool colour);

// "PASS  NAME": a record in one line.
void printVerdict(std::ostream& out, const DiagnosticRecord& record, bool colour);

// How many there were of each verdict, in one line.
void printSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records);

// Points out each declared fault that never fired: the run does not show what its scenario is for.
void printUnfiredFaults(std::ostream& out, const DiagnosticRecord& record);

// The diagnostics, then the experiments on their own, whose descriptions must be known.
void printList(std::ostream& out, const std::vector<DescribedDiagnostic>& diagnostics);
void printDescriptions(std::ostream& out, const std::vector<ResolvedDiagnostic>& diagnostics);

}  // namespace quazor
