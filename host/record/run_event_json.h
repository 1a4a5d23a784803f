// Events in JSON: the lines of a record and of the connection between quazor and a plug-in process.
// docs/record_format.md is the public description.
#pragma once

#include "contract/lab.h"
#include "host/model/run_event.h"

#include <nlohmann/json.hpp>

namespace quazor {

// The version of the record format, of one with the event `frames`, and of one with `frames` and `tasks`.
inline constexpr int kRecordFormat = 2;
inline constexpr int kRecordFormatWithFrames = 3;
inline constexpr int kRecordFormatWithTasks = 4;

nlohmann::ordered_json eventJson(const RunEvent& event);

// Throws InputError if the JSON is not an event.
RunEvent eventFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json registrationJson(const QZLab::Registration& registration);
// The result has no factories. Throws InputError.
QZLab::Registration registrationFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json descriptionJson(const DiagnosticDescription& description);
// Throws InputError.
DiagnosticDescription descriptionFrom(const nlohmann::ordered_json& json);

}  // namespace quazor
