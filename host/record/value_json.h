// Values in JSON. docs/json_output.md is the public description.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <nlohmann/json.hpp>

#include <chrono>
#include <string>
#include <utility>

namespace quazor {

// A finite number, or the string "nan", "inf" or "-inf".
nlohmann::ordered_json numberJson(double number);

// Seconds.
nlohmann::ordered_json secondsJson(std::chrono::nanoseconds duration);

// Numbers keep their kind, 32-bit floats use their shortest decimal form, non-finite ones follow numberJson(). Bytes
// become hexadecimal text; dates, objects and errors become their default text.
nlohmann::ordered_json valueJson(const Value& value);

// An object with one key per entry. Linear in the number of entries, because the map's keys are known to be unique.
template <class T, class ToJson>
nlohmann::ordered_json objectJson(const OrderedMap<T>& map, ToJson&& toJson) {
  nlohmann::ordered_json::object_t object;
  object.reserve(map.size());
  for (const auto& [key, value] : map) object.emplace_back(key, toJson(value));
  return nlohmann::ordered_json(std::move(object));
}
nlohmann::ordered_json dictionaryJson(const Dictionary& dictionary);

// The error's dictionary form, or null.
nlohmann::ordered_json errorJson(const DiagnosticErrorPtr& error);

// The document as text, indented by two spaces, with a closing newline. U+FFFD replaces invalid UTF-8.
std::string documentText(const nlohmann::ordered_json& document);

}  // namespace quazor
