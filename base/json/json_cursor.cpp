#include "base/json/json_cursor.h"

#include "base/text/input_error.h"
#include "base/text/nearest_name.h"

#include <algorithm>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

std::string described(const Json& value) {
  switch (value.type()) {
    case Json::value_t::object: return "an object";
    case Json::value_t::array: return "an array";
    default: return value.dump();
  }
}

}  // namespace

std::string inQuotes(std::string_view name) { return Json(name).dump(); }

std::string suggestion(std::string_view name, std::span<const std::string_view> names) {
  if (names.empty()) return ".";
  if (const auto nearest = nearestName(name, {names.begin(), names.end()})) {
    return "; did you mean " + inQuotes(*nearest) + "?";
  }
  std::string known;
  for (const std::string_view candidate : names) known += (known.empty() ? "" : ", ") + inQuotes(candidate);
  return "; expected one of " + known + ".";
}

void JsonCursor::fail(const std::string& sentence) const { fail(sentence, path_); }

void JsonCursor::fail(const std::string& sentence, const std::string& place) const {
  if (document_ != nullptr) document_->fail(path_, sentence, place);
  throw InputError(sentenceAbout(path_, sentence));
}

void JsonCursor::failType(const std::string& expected) const {
  fail("must be " + expected + ", not " + described(*value_) + ".");
}

JsonCursor JsonCursor::inside(const Json& value, std::string path) const { return {value, std::move(path), document_}; }

const Json& JsonCursor::object() const {
  if (!value_->is_object()) failType("an object");
  return *value_;
}

void JsonCursor::allowKeys(std::initializer_list<std::string_view> keys) const {
  for (const auto& [key, value] : object().items()) {
    if (std::ranges::find(keys, key) != keys.end()) continue;
    fail("unknown key " + inQuotes(key) + suggestion(key, keys), jsonPath(path_, key));
  }
}

JsonCursor JsonCursor::at(std::string_view key) const {
  if (std::optional<JsonCursor> entry = find(key)) return *std::move(entry);
  const std::string sentence = "the key " + inQuotes(key) + " is missing.";
  if (document_ != nullptr) document_->failMissing(path_, sentence);
  fail(sentence);
}

std::optional<JsonCursor> JsonCursor::find(std::string_view key) const {
  const auto entry = object().find(key);
  if (entry == value_->end()) return std::nullopt;
  return inside(*entry, jsonPath(path_, key));
}

std::vector<std::pair<std::string, JsonCursor>> JsonCursor::entries() const {
  std::vector<std::pair<std::string, JsonCursor>> entries;
  for (const auto& [key, value] : object().items()) {
    entries.emplace_back(key, inside(value, jsonPath(path_, key)));
  }
  return entries;
}

std::vector<JsonCursor> JsonCursor::elements() const {
  if (!value_->is_array()) failType("an array");
  std::vector<JsonCursor> elements;
  for (const Json& value : *value_) elements.push_back(inside(value, jsonPath(path_, elements.size())));
  return elements;
}

bool JsonCursor::boolean() const {
  if (!value_->is_boolean()) failType("true or false");
  return value_->get<bool>();
}

std::string JsonCursor::text() const {
  if (!value_->is_string() || value_->get_ref<const std::string&>().empty()) failType("a non-empty string");
  return value_->get<std::string>();
}

std::int64_t JsonCursor::integer() const {
  const bool fits = value_->is_number_integer() &&
                    (!value_->is_number_unsigned() || std::in_range<std::int64_t>(value_->get<std::uint64_t>()));
  if (!fits) failType("a signed 64-bit integer");
  return value_->get<std::int64_t>();
}

std::uint64_t JsonCursor::integer(std::uint64_t minimum, std::uint64_t maximum) const {
  // The parser stores integers as unsigned unless they are negative.
  const bool fits = value_->is_number_unsigned() && value_->get<std::uint64_t>() >= minimum &&
                    value_->get<std::uint64_t>() <= maximum;
  if (!fits && minimum == maximum) failType(std::to_string(minimum));
  if (!fits) failType("an integer from " + std::to_string(minimum) + " to " + std::to_string(maximum));
  return value_->get<std::uint64_t>();
}

double JsonCursor::number(double minimum, double maximum) const {
  const bool fits = value_->is_number() && value_->get<double>() >= minimum && value_->get<double>() <= maximum;
  if (!fits) failType("a number from " + Json(minimum).dump() + " to " + Json(maximum).dump());
  return value_->get<double>();
}

double JsonCursor::positiveNumber(double maximum) const {
  const bool fits = value_->is_number() && value_->get<double>() > 0 && value_->get<double>() <= maximum;
  if (!fits) failType("a number above 0 and at most " + Json(maximum).dump());
  return value_->get<double>();
}

Value JsonCursor::scalar() const {
  if (value_->is_string()) return Value(value_->get<std::string>());
  if (value_->is_boolean()) return Value(value_->get<bool>());
  if (value_->is_number_float()) return Value(value_->get<double>());
  if (!value_->is_number()) failType("a number, a string, true or false");
  const bool isLarge = value_->is_number_unsigned() && !std::in_range<std::int64_t>(value_->get<std::uint64_t>());
  return isLarge ? Value(value_->get<std::uint64_t>()) : Value(value_->get<std::int64_t>());
}

std::string JsonCursor::oneOf(std::span<const std::string_view> names, std::string_view what) const {
  std::string name = text();
  if (std::ranges::find(names, name) != names.end()) return name;
  fail(inQuotes(name) + " is not " + std::string(what) + suggestion(name, names));
}

}  // namespace quazor
