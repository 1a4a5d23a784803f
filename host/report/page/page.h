// The report page: one HTML file for one run or several, for people who were not there. It needs no network. Only a
// page of one run with more frames than its pictures can show has scripts, to zoom with. docs/report_page.md is the
// public description.
#pragma once

#include "host/report/page/advice.h"
#include "host/report/page/plot_library.h"
#include "host/report/report_format.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct PageOptions {
  // Returns null for a topic without an explanation. What it returns is valid until the page is written. Without the
  // function, nothing is explained.
  std::function<const Advice*(const std::string& topic)> adviceOf{};
  bool frames = true;                    // show the frames over time
  std::optional<PlotLibrary> library{};  // without it, plots cannot be zoomed
};

// The page of at least one run.
std::string reportPage(const std::vector<ShownRun>& runs, const PageOptions& options);

}  // namespace quazor
