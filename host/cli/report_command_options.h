// The options of 'quazor report'.
#pragma once

#include "host/report/report_format.h"
#include "host/report/timeline.h"

#include <filesystem>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quazor {

// The arguments, before they are checked.
struct ReportCommandTexts {
  std::string format = "html";
  std::string from;
  std::string to;
  bool noFrames = false;
  bool compare = false;
};

// What the command makes of records.
struct RecordReport {
  bool isTimeline = false;    // else a page
  TimelinePart part;          // of a time line
  bool frames = true;         // show them on a page
  bool isComparison = false;  // a page of what differs between two records
};

void addReportCommandOptions(CLI::App& command, ReportCommandTexts& texts);

// Throws a CommandError (kUsage) that begins with the option.
RecordReport recordReportOf(const ReportCommandTexts& texts, const std::vector<std::string>& records);

Format formatOf(const RecordReport& report);

}  // namespace quazor
