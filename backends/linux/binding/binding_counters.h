// What a binding file says of counters.
#pragma once

#include "backends/linux/binding/binding.h"
#include "base/json/json_cursor.h"

#include <string>
#include <vector>

namespace quazor {

// All throw InputError: "PATH: ...".
std::vector<CounterFilesBinding> readAllCounterFiles(const JsonCursor& cursor);
std::vector<TracepointBinding> readAllTracepoints(const JsonCursor& cursor);
// An absolute path that a system call can take, without components that lead back.
std::string readPathText(const JsonCursor& cursor);

}  // namespace quazor
