// The events `frames` and `tasks` in JSON: the frames of a stream, or the tasks of a queue, in columns.
#pragma once

#include "host/model/run_event.h"

#include <nlohmann/json.hpp>

namespace quazor {

// Each column has the value of the first frame, and then what each further one adds to that of the frame before it.
// Null stands for a frame that was not handed back.
nlohmann::ordered_json framesJson(const FramesTraced& event);

// Throws InputError, which names the column and the entry, if the JSON is not that of an event.
FramesTraced framesFrom(const nlohmann::ordered_json& json, TracedKind kind);

}  // namespace quazor
