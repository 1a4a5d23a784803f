// JsonCursor: a value in a JSON document together with its path.
#pragma once

#include "base/json/json_document.h"
#include "contract/value.h"

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// Checked access: a wrong type, an unknown key or a number out of range throws InputError, "NAME:LINE: PATH: " and one
// sentence with the problem and the expectation.
//
// Borrows the document.
// Thread: one at a time.
class JsonCursor {
 public:
  explicit JsonCursor(const JsonDocument& document) : JsonCursor(document.value(), "", &document) {}
  // A value that does not come from a file: errors contain no name and no line.
  explicit JsonCursor(const nlohmann::ordered_json& value) : JsonCursor(value, "", nullptr) {}

  const std::string& path() const { return path_; }
  bool isNull() const { return value_->is_null(); }
  bool isBoolean() const { return value_->is_boolean(); }
  bool isNumber() const { return value_->is_number(); }
  bool isString() const { return value_->is_string(); }
  bool isObject() const { return value_->is_object(); }
  bool isArray() const { return value_->is_array(); }

  // For objects. `keys` are all allowed keys.
  void allowKeys(std::initializer_list<std::string_view> keys) const;
  // The entry, which is required: throws if it is missing.
  JsonCursor at(std::string_view key) const;
  // The entry, if it exists.
  std::optional<JsonCursor> find(std::string_view key) const;
  // All entries, in document order.
  std::vector<std::pair<std::string, JsonCursor>> entries() const;

  // For arrays.
  std::vector<JsonCursor> elements() const;

  // For other values.
  bool boolean() const;
  // Not empty.
  std::string text() const;
  std::int64_t integer() const;
  std::uint64_t integer(std::uint64_t minimum, std::uint64_t maximum) const;
  double number(double minimum, double maximum) const;
  // Above 0.
  double positiveNumber(double maximum) const;
  // A number, a boolean or a string; integers are signed if they fit.
  Value scalar() const;
  // One of `names`. `what` is the noun for messages, for example "an action".
  std::string oneOf(std::span<const std::string_view> names, std::string_view what) const;

  [[noreturn]] void fail(const std::string& sentence) const;
  // Throws "must be `expected`, not ..." with a description of the actual value.
  [[noreturn]] void failType(const std::string& expected) const;

 private:
  JsonCursor(const nlohmann::ordered_json& value, std::string path, const JsonDocument* document)
      : value_(&value), path_(std::move(path)), document_(document) {}

  JsonCursor inside(const nlohmann::ordered_json& value, std::string path) const;
  // Throws an error for `place`, which is this path or one below it.
  [[noreturn]] void fail(const std::string& sentence, const std::string& place) const;
  const nlohmann::ordered_json& object() const;

  const nlohmann::ordered_json* value_;
  std::string path_;
  const JsonDocument* document_;  // null: no document
};

// Returns `"name"`, quoted as in a document.
std::string inQuotes(std::string_view name);

// The end of a sentence about an unknown name: `; did you mean "near"?` with the nearestName() in `names`, or `;
// expected one of "a", "b".`
std::string suggestion(std::string_view name, std::span<const std::string_view> names);

}  // namespace quazor
