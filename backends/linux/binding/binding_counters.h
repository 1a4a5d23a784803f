// Reads the counters of a binding file.
#pragma once

#include "backends/linux/binding/binding.h"
#include "base/json/json_cursor.h"

#include <string>
#include <vector>

namespace quazor {

// All of these throw InputError: "PATH: ...".
std::vector<CounterFilesBinding> readAllCounterFiles(const JsonCursor& cursor);
std::vector<TracepointBinding> readAllTracepoints(const JsonCursor& cursor);
// An absolute path of valid length, without "..".
std::string readPathText(const JsonCursor& cursor);

}  // namespace quazor
