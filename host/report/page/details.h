// What a diagnostic's section of a page shows besides results and frames. Each function returns HTML, empty if there is
// nothing to show; `level` is that of its heading.
#pragma once

#include "host/model/diagnostic_record.h"

#include <string>

namespace quazor {

// The stages and how long they took.
std::string stagesSection(const DiagnosticRecord& record, int level);

// Each parameter with its value and where it came from.
std::string parametersSection(const DiagnosticRecord& record, int level);

std::string measurementsSection(const DiagnosticRecord& record, int level);

// Auxiliary data: images of samples as pictures, dictionaries of values as tables, everything else as text.
std::string auxiliarySection(const DiagnosticRecord& record, int level);

// The log; a choice of levels, which works without a script, if it has several. `id` is unique in the page.
std::string logSection(const DiagnosticRecord& record, int level, const std::string& id);

// The faults of a simulated phone.
std::string faultsSection(const DiagnosticRecord& record, int level);

// How long the diagnostic took: by the phone's clock if all of its stages say so, else by the wall clock.
std::string durationText(const DiagnosticRecord& record);

}  // namespace quazor
