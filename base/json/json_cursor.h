// JsonCursor: a value of a JSON document that knows where it stands.
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

// Reads with checks: every wrong type, unknown key and number out of range throws InputError, "NAME:LINE: PATH: " and
// one sentence that says what is wrong and what would be right.
//
// Borrows the document.
// Thread: one at a time.
class JsonCursor {
 public:
  explicit JsonCursor(const JsonDocument& document) : JsonCursor(document.value(), "", &document) {}
  // A value that is in no file: errors have no name and no line.
  explicit JsonCursor(const nlohmann::ordered_json& value) : JsonCursor(value, "", nullptr) {}

  const std::string& path() const { return path_; }
  bool isNull() const { return value_->is_null(); }
  bool isBoolean() const { return value_->is_boolean(); }
  bool isNumber() const { return value_->is_number(); }
  bool isString() const { return value_->is_string(); }
  bool isObject() const { return value_->is_object(); }
  bool isArray() const { return value_->is_array(); }

  // Of objects. `keys` are all the keys there may be.
  void allowKeys(std::initializer_list<std::string_view> keys) const;
  // Returns the entry, which is required: throws if it is missing.
  JsonCursor at(std::string_view key) const;
  // The entry, where it is there.
  std::optional<JsonCursor> find(std::string_view key) const;
  // All entries, in the document's order.
  std::vector<std::pair<std::string, JsonCursor>> entries() const;

  // Of arrays.
  std::vector<JsonCursor> elements() const;

  // Of values.
  bool boolean() const;
  // Not empty.
  std::string text() const;
  std::int64_t integer() const;
  std::uint64_t integer(std::uint64_t minimum, std::uint64_t maximum) const;
  double number(double minimum, double maximum) const;
  // Above 0.
  double positiveNumber(double maximum) const;
  // A number, a boolean or a string; whole numbers are signed integers where they fit one.
  Value scalar() const;
  // One of `names`; `what` says what they are: "an action".
  std::string oneOf(std::span<const std::string_view> names, std::string_view what) const;

  [[noreturn]] void fail(const std::string& sentence) const;
  // "must be `expected`, not ...": what stands there is told.
  [[noreturn]] void failType(const std::string& expected) const;

 private:
  JsonCursor(const nlohmann::ordered_json& value, std::string path, const JsonDocument* document)
      : value_(&value), path_(std::move(path)), document_(document) {}

  JsonCursor inside(const nlohmann::ordered_json& value, std::string path) const;
  // What is wrong stands at `place`, which is this path or one in it.
  [[noreturn]] void fail(const std::string& sentence, const std::string& place) const;
  const nlohmann::ordered_json& object() const;

  const nlohmann::ordered_json* value_;
  std::string path_;
  const JsonDocument* document_;  // null: none
};

// `"name"`, as a document has it.
std::string inQuotes(std::string_view name);

// `; did you mean "near"?` with the nearestName() of `names`, else `; expected one of "a", "b".`: the end of a sentence
// about a name that does not exist.
std::string suggestion(std::string_view name, std::span<const std::string_view> names);

}  // namespace quazor
