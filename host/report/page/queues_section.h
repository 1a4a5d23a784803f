// The tasks of a diagnostic's queues: how many, and how long they waited and ran.
#pragma once

#include "host/record/record_file.h"

#include <string>
#include <vector>

namespace quazor {

// A sentence and a table of the queues. `level` is that of the heading. Empty without tasks.
std::string queuesSection(const std::vector<RecordedStream>& queues, int level);

}  // namespace quazor
