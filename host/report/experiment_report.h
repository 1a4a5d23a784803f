// The report for people, of experiments that run on their own.
#pragma once

#include "contract/value.h"
#include "host/model/diagnostic_record.h"

#include <ostream>
#include <vector>

namespace quazor {

// How text may look where it goes.
struct TextStyle {
  bool colour = false;
  bool blocks = false;  // it takes UTF-8 text, and block elements in it
};

// Auxiliary data, indented by two spaces and, unless names or texts are longer, within 80 columns. Images
// (sample_images.h) have a line of what they hold beside samples, then a picture of each list of 8 to 64 samples with
// its lowest and highest one; of longer lists only these two are told.
void printAuxiliaryData(std::ostream& out, const Dictionary& data, bool blocks);

// What one experiment measured as a table, its auxiliary data, then how it ended and, with kError, the error.
void printExperiment(std::ostream& out, const DiagnosticRecord& record, TextStyle style);

// How many returned a result and how many did not, in one line.
void printExperimentSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
