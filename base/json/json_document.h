// JsonDocument: a JSON file, parsed strictly.
#pragma once

#include "base/text/input_error.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

// A mistake at a place of a document. what() begins with the file and the line.
//
// Thread: any
class DocumentError : public InputError {
 public:
  DocumentError(const std::string& text, std::size_t offset) : InputError(text), offset_(offset) {}

  // The place in the order of the text.
  std::size_t offset() const { return offset_; }

 private:
  std::size_t offset_;
};

// The first of the mistakes of a document, in the order of its text.
//
// Thread: one at a time
class FirstMistake {
 public:
  // Calls `check` and notes the DocumentError that it throws, if any.
  template <class Check>
  void of(Check&& check) {
    try {
      std::forward<Check>(check)();
    } catch (const DocumentError& error) {
      ++noted_;
      if (!first_ || error.offset() < first_->offset()) first_ = error;
    }
  }

  // Calls `check` with each element, in the order of the document, until one has a mistake: those behind it come later.
  template <class Elements, class Check>
  void inOrder(const Elements& elements, const Check& check) {
    const std::size_t before = noted_;
    for (const auto& one : elements) {
      of([&] { check(one); });
      if (noted_ > before) return;
    }
  }

  // Throws the DocumentError that comes first, if one was noted.
  void throwIfAny() const {
    if (first_) throw DocumentError(*first_);
  }

 private:
  std::optional<DocumentError> first_;
  std::size_t noted_ = 0;
};

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

  // The text of such a file, for a document that is parsed later.
  static std::string textOf(const std::filesystem::path& file);

  const nlohmann::ordered_json& value() const { return value_; }
  // Replaces the value, for example with the result of a merge. The text remains: errors contain a line if their place
  // exists in the text.
  void setValue(nlohmann::ordered_json value) { value_ = std::move(value); }

  // Throws DocumentError, "NAME:LINE: PATH: SENTENCE", with the line of `place`, which is a path too. An empty path
  // means the whole document. A place that does not exist in the text has no line and comes first.
  [[noreturn]] void fail(const std::string& path, const std::string& sentence, const std::string& place) const;
  // Like fail(), for something that is missing at `path`: comes after all that is there, because a key that is missing
  // often is there with a mistake in its name.
  [[noreturn]] void failMissing(const std::string& path, const std::string& sentence) const;

 private:
  std::string textAt(const std::optional<std::size_t>& line, const std::string& path,
                     const std::string& sentence) const;

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
