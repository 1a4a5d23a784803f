// Values in JSON, without loss. docs/record_format.md is the public description.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/results.h"
#include "contract/value.h"

#include <nlohmann/json.hpp>

#include <string>
#include <string_view>

namespace quazor {

// A string, or {"hex": "..."} if the text is not valid UTF-8.
nlohmann::ordered_json losslessText(std::string_view text);
std::string textFrom(const nlohmann::ordered_json& json);

// A finite number, or the string "nan", "inf" or "-inf".
nlohmann::ordered_json losslessNumber(double number);
double numberFrom(const nlohmann::ordered_json& json);

// An object with one key, which gives the kind. An Object is stored as its description and read back as an object with
// that description. An error keeps its domain, code and user info. Values with more than 500 levels of nesting cannot
// be read back.
nlohmann::ordered_json losslessValue(const Value& value);
Value valueFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json losslessDictionary(const Dictionary& dictionary);
Dictionary dictionaryFrom(const nlohmann::ordered_json& json);

// null if there is no error.
nlohmann::ordered_json losslessError(const DiagnosticErrorPtr& error);
DiagnosticErrorPtr errorFrom(const nlohmann::ordered_json& json);

// [value, unit symbol].
nlohmann::ordered_json losslessMeasurement(const Measurement& measurement);
Measurement measurementFrom(const nlohmann::ordered_json& json);

nlohmann::ordered_json losslessResult(const QZMeasuredResult& result);
QZMeasuredResult resultFrom(const nlohmann::ordered_json& json);

// The entry of a JSON object under `key`. Throws InputError if there is none.
const nlohmann::ordered_json& memberOf(const nlohmann::ordered_json& json, const char* key);

}  // namespace quazor
