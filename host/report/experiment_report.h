// The text report of experiments that run on their own.
#pragma once

#include "contract/value.h"
#include "host/model/diagnostic_record.h"
#include "host/report/text_report.h"

#include <cstddef>
#include <ostream>
#include <vector>

namespace quazor {

// Prints auxiliary data, indented by two spaces and within 80 columns unless a name or text is longer. For an image
// (sample_images.h) it prints a line with the values other than samples, then a picture of each list of 8 to 64 samples
// with its minimum and maximum. For longer lists it prints only the minimum and maximum.
void printAuxiliaryData(std::ostream& out, const Dictionary& data, bool blocks);

// Prints the measurements of one experiment as a table, its auxiliary data, its outcome and, for kError, the error.
void printExperiment(std::ostream& out, const DiagnosticRecord& record, TextStyle style);

// Prints one line with the number of experiments that returned a result, that did not, and that the run did not reach.
void printExperimentSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records,
                            std::size_t notReached = 0);

}  // namespace quazor
