// One run of a page: what did not pass and what to do about it, each diagnostic, the run itself.
#pragma once

#include "host/report/page/frames_section.h"
#include "host/report/page/page.h"

#include <cstddef>
#include <string>

namespace quazor {

// The verdict on a run as a page shows it.
struct PageVerdict {
  std::string word;  // "FAIL"
  std::string kind;  // "pass", "fail", "error" or "skip"
  int rank = 0;      // the worst has the highest
};

// A run that did not come to its end is an error, whatever its diagnostics say.
PageVerdict verdictOf(const ShownRun& run);

// "5 diagnostics: 4 passed, 1 failed, 0 ended in an error", as in the text report.
std::string summaryOf(const ShownRun& run);

// `number` is that of the run in the page, and `level` that of the headings.
std::string runSections(const ShownRun& run, std::size_t number, int level, const PageOptions& options,
                        ManyFrames many);

}  // namespace quazor
