// Values in JSON from which the same values can be made again. docs/record_format.md is the public description.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/results.h"
#include "contract/value.h"

#include <nlohmann/json.hpp>

#include <string>
#include <string_view>

namespace quazor {

// A string; {"hex": "..."} for a text that is not UTF-8.
nlohmann::ordered_json losslessText(std::string_view text);
std::string textFrom(const nlohmann::ordered_json& json);

// A finite number as it is; "nan", "inf" or "-inf".
nlohmann::ordered_json losslessNumber(double number);
double numberFrom(const nlohmann::ordered_json& json);

// An object with one key, which tells the kind. Of an Object only its description is kept, and what comes back is an
// object with that description; an error keeps domain, code and user info. Values in more than 500 levels cannot be
// read back.
nlohmann::ordered_json losslessValue(const Value& value);
Value valueFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json losslessDictionary(const Dictionary& dictionary);
Dictionary dictionaryFrom(const nlohmann::ordered_json& json);

// null for no error.
nlohmann::ordered_json losslessError(const DiagnosticErrorPtr& error);
DiagnosticErrorPtr errorFrom(const nlohmann::ordered_json& json);

// [value, unit symbol].
nlohmann::ordered_json losslessMeasurement(const Measurement& measurement);
Measurement measurementFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json losslessResult(const QZMeasuredResult& result);
QZMeasuredResult resultFrom(const nlohmann::ordered_json& json);

// The entry under `key` of a JSON object. Throws InputError when there is none.
const nlohmann::ordered_json& memberOf(const nlohmann::ordered_json& json, const char* key);

}  // namespace quazor
