// Ranges of parameters: their text, their JSON, and the values that fit.
#pragma once

#include "base/json/json_cursor.h"
#include "contract/parameter_range.h"
#include "contract/results.h"
#include "contract/value.h"

#include <nlohmann/json.hpp>

#include <string>

namespace quazor {

// Throws InputError, a clause, if the range is nonsense. docs/writing_a_diagnostic.md lists what is.
void validateRange(const QZParameterRange& range);

// Throws InputError, a clause that names the parameter, if a range is nonsense, or is not one of a declared parameter,
// or has a default although the parameter is required.
void validateRanges(const OrderedMap<QZParameterRange>& ranges, const QZDescription& description);

// True if the value is a number in the range. Compares integers of 64 bits exactly.
bool accepts(const QZParameterRange& range, const Value& value);

// ">= 0 s", "an integer > 0 and <= 5 frames"; "a number" if there is no bound.
std::string rangeText(const QZParameterRange& range);

// An object with the keys that docs/explanations.md describes, and back. Throws InputError if it has another form or
// the range is nonsense.
nlohmann::ordered_json rangeJson(const QZParameterRange& range);
QZParameterRange rangeFrom(const JsonCursor& object);

}  // namespace quazor
