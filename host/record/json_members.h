// Typed members of the JSON of events.
#pragma once

#include "base/text/input_error.h"
#include "host/record/lossless_json.h"

#include <nlohmann/json.hpp>

#include <concepts>
#include <cstdint>
#include <string>
#include <utility>

namespace quazor {

template <class T>
bool isInteger(const nlohmann::ordered_json& json) {
  if (json.is_number_unsigned()) return std::in_range<T>(json.get<std::uint64_t>());
  return json.is_number_integer() && std::in_range<T>(json.get<std::int64_t>());
}

// Throws InputError if the member is missing or is not a T; an integer must fit.
template <class T>
T get(const nlohmann::ordered_json& json, const char* key) {
  const nlohmann::ordered_json& member = memberOf(json, key);
  bool fits = true;
  if constexpr (std::integral<T> && !std::same_as<T, bool>) fits = isInteger<T>(member);
  try {
    if (fits) return member.get<T>();
  } catch (const nlohmann::ordered_json::exception&) {
  }
  throw InputError(std::string("\"") + key + "\" has the wrong type");
}

inline std::string textAt(const nlohmann::ordered_json& json, const char* key) { return textFrom(memberOf(json, key)); }

// A count that is not written if it is 0.
inline std::uint64_t countAt(const nlohmann::ordered_json& json, const char* key) {
  if (!json.contains(key)) return 0;
  const auto count = get<std::uint64_t>(json, key);
  if (count == 0) throw InputError(std::string("\"") + key + "\" is 0");
  return count;
}

inline const nlohmann::ordered_json& arrayAt(const nlohmann::ordered_json& json, const char* key) {
  const nlohmann::ordered_json& array = memberOf(json, key);
  if (!array.is_array()) throw InputError(std::string("\"") + key + "\" is not an array");
  return array;
}

}  // namespace quazor
