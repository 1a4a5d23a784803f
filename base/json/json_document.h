// JsonDocument: a JSON file, strictly read.
#pragma once

#include <nlohmann/json.hpp>

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// One JSON value, and the lines of the text that it was read from. Read values through JsonCursor.
//
// Thread: one at a time
class JsonDocument {
 public:
  // Parses `text`, which must be UTF-8 and nothing but one JSON value, without two equal keys in one object and nested
  // at most 32 deep. `name` is the file's, for people. Throws InputError, "NAME:LINE: ..." or, where that is known,
  // "NAME:LINE: PATH: ...".
  JsonDocument(std::string text, std::string name);

  // Reads a file of at most 16 MiB. Throws InputError, also for a file that cannot be read.
  static JsonDocument read(const std::filesystem::path& file);

  const nlohmann::ordered_json& value() const { return value_; }
  // Changes the value, by one that is merged with another document, for example. The text stays: an error has a line
  // where its place is in the text.
  void setValue(nlohmann::ordered_json value) { value_ = std::move(value); }

  // Throws InputError, "NAME:LINE: PATH: SENTENCE", where the line is that of `place`, a path too. An empty path is the
  // document as a whole.
  [[noreturn]] void fail(const std::string& path, const std::string& sentence, const std::string& place) const;

 private:
  std::string text_;
  std::string name_;
  nlohmann::ordered_json value_;
};

// The line, from 1, in which the value at `path` (as jsonPath() writes it) of the document in `text` begins, or the
// key that it has; nothing where the path is not in the text. Parses the text again.
std::optional<std::size_t> lineOfPath(std::string_view text, const std::string& path);

// "PATH: SENTENCE"; an empty path is "the document".
std::string sentenceAbout(const std::string& path, const std::string& sentence);

// A path into a document: "faults" and 2 make "faults[2]"; that and "action" make "faults[2].action".
std::string jsonPath(const std::string& path, std::string_view key);
std::string jsonPath(const std::string& path, std::size_t index);

}  // namespace quazor
