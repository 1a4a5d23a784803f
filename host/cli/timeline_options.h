// The options of 'quazor report'.
#pragma once

#include "host/report/timeline.h"

#include <string>

namespace CLI {
class App;
}

namespace quazor {

// The arguments, before they are checked.
struct TimelineTexts {
  std::string format;
  std::string from;
  std::string to;
};

void addTimelineOptions(CLI::App& command, TimelineTexts& texts);

// Throws a CommandError (kUsage) that begins with the option.
TimelinePart timelinePartOf(const TimelineTexts& texts);

}  // namespace quazor
