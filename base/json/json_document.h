// JsonDocument: a JSON file, parsed strictly.
#pragma once

#include <nlohmann/json.hpp>

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// One JSON value, and the line numbers of the text that it was parsed from. JsonCursor reads the values.
//
// Thread: one at a time
class JsonDocument {
 public:
  // Parses `text`, which must be UTF-8 and exactly one JSON value, without duplicate keys in an object and nested at
  // most kMaxDocumentLevels deep. `name` is the user-readable name of the file. Throws InputError, "NAME:LINE: ..." or,
  // if the path is known, "NAME:LINE: PATH: ...".
  JsonDocument(std::string text, std::string name);

  // Reads a file of at most kMaxDocument bytes. Throws InputError, also if the file cannot be read.
  static JsonDocument read(const std::filesystem::path& file);

  const nlohmann::ordered_json& value() const { return value_; }
  // Replaces the value, for example with the result of a merge. The text remains: errors contain a line if their place
  // exists in the text.
  void setValue(nlohmann::ordered_json value) { value_ = std::move(value); }

  // Throws InputError, "NAME:LINE: PATH: SENTENCE", with the line of `place`, which is a path too. An empty path means
  // the whole document.
  [[noreturn]] void fail(const std::string& path, const std::string& sentence, const std::string& place) const;

 private:
  std::string text_;
  std::string name_;
  nlohmann::ordered_json value_;
};

// The line, starting at 1, on which the value at `path` (in the form of jsonPath()) or its key begins in `text`;
// nothing if the path does not exist there. Parses the text again.
std::optional<std::size_t> lineOfPath(std::string_view text, const std::string& path);

// "PATH: SENTENCE", with "the document" for an empty path. Control characters of the path are escaped.
std::string sentenceAbout(const std::string& path, const std::string& sentence);

// Extends a path: "faults" and 2 give "faults[2]"; that and "action" give "faults[2].action".
std::string jsonPath(const std::string& path, std::string_view key);
std::string jsonPath(const std::string& path, std::size_t index);

}  // namespace quazor
