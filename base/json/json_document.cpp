#include "base/json/json_document.h"

#include "base/json/json_limits.h"
#include "base/text/input_error.h"
#include "base/text/utf8.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <optional>
#include <set>
#include <system_error>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

std::string lineAt(std::string_view text, std::size_t offset) {
  const std::string_view before = text.substr(0, offset);
  return std::to_string(std::ranges::count(before, '\n') + 1);
}

// The path with control characters as in a document, so that it fits on one line.
std::string printablePath(std::string_view path) {
  std::string printable;
  for (const char character : path) {
    if (static_cast<unsigned char>(character) >= 0x20) {
      printable += character;
    } else {
      const std::string quoted = Json(std::string(1, character)).dump();
      printable += quoted.substr(1, quoted.size() - 2);
    }
  }
  return printable;
}

// The progress of the parser: the number of line ends before the character that it read last. That is the last
// character of the reported value or, for a number, the one after it.
struct Progress {
  std::size_t offset = 0;  // of the character after it
  std::size_t line = 1;
  bool tookLineEnd = false;
};

// Feeds a text to the parser and records the progress.
class CountingIterator {
 public:
  using iterator_category = std::input_iterator_tag;
  using value_type = char;
  using difference_type = std::ptrdiff_t;
  using pointer = const char*;
  using reference = const char&;

  CountingIterator(const char* at, Progress* progress) : at_(at), progress_(progress) {}

  reference operator*() const { return *at_; }
  CountingIterator& operator++() {
    ++progress_->offset;
    if (progress_->tookLineEnd) ++progress_->line;
    progress_->tookLineEnd = *at_++ == '\n';
    return *this;
  }
  bool operator==(const CountingIterator& other) const { return at_ == other.at_; }

 private:
  const char* at_;
  Progress* progress_;
};

// Follows the parser through the document to track the current path and the keys of each object.
class Tracker {
 public:
  explicit Tracker(std::string name) : name_(std::move(name)) {}

  // Parses the text and calls `visit` whenever path() and line() may have changed.
  template <typename Visit>
  Json parse(std::string_view text, const Visit& visit) {
    const auto follow = [&](int, Json::parse_event_t event, Json& parsed) {
      take(event, parsed);
      visit();
      return true;
    };
    return Json::parse(CountingIterator(text.data(), &progress_),
                       CountingIterator(text.data() + text.size(), &progress_), follow);
  }

  const Progress& progress() const { return progress_; }
  std::size_t line() const { return progress_.line; }
  // "NAME:LINE: PATH: " or, for the document as a whole, "NAME:LINE: ".
  std::string place() const {
    const std::string where = path();
    return name_ + ":" + std::to_string(line()) + ": " + (where.empty() ? "" : printablePath(where) + ": ");
  }

  std::string path() const {
    std::string path;
    for (const Container& container : open_) {
      if (container.isArray && container.elements > 0) path = jsonPath(path, container.elements - 1);
      if (!container.isArray && !container.key.empty()) path = jsonPath(path, container.key);
    }
    return path;
  }

 private:
  struct Container {
    bool isArray = false;
    std::size_t elements = 0;  // the number of elements started, for an array
    std::string key;           // the current key, for an object
    std::set<std::string> keys;
  };

  void take(Json::parse_event_t event, const Json& parsed) {
    switch (event) {
      case Json::parse_event_t::object_start: open(false); break;
      case Json::parse_event_t::array_start: open(true); break;
      case Json::parse_event_t::object_end:
      case Json::parse_event_t::array_end: open_.pop_back(); break;
      case Json::parse_event_t::key: key(parsed.get<std::string>()); break;
      case Json::parse_event_t::value: element(); break;
    }
  }
  void element() {
    if (!open_.empty() && open_.back().isArray) ++open_.back().elements;
  }
  void open(bool isArray) {
    element();
    if (open_.size() == kMaxDocumentLevels) {
      throw InputError(name_ + ":" + std::to_string(line()) + ": the document is nested more than " +
                       std::to_string(kMaxDocumentLevels) + " deep.");
    }
    open_.push_back({isArray, 0, {}, {}});
  }
  void key(const std::string& key) {
    Container& object = open_.back();
    object.key.clear();
    if (!object.keys.insert(key).second) {
      throw InputError(place() + "the key " + Json(key).dump() + " is duplicated; remove one.");
    }
    object.key = key;
  }

  std::string name_;
  Progress progress_;
  std::vector<Container> open_;
};

// Where the value at the path or its key begins; nothing if the path does not exist in the text.
std::optional<Progress> placeOfPath(std::string_view text, const std::string& path) {
  if (path.empty()) return Progress();
  Tracker tracker("");
  std::optional<Progress> place;
  tracker.parse(text, [&] {
    if (!place && tracker.path() == path) place = tracker.progress();
  });
  return place;
}

// The parser's message without its prefix.
std::string complaintOf(const Json::parse_error& error) {
  const std::string text = error.what();
  const std::size_t dash = text.find(" - ");
  return dash == std::string::npos ? text : text.substr(dash + 3);
}

Json parsed(std::string_view text, const std::string& name) {
  if (const std::optional<std::size_t> invalid = findInvalidUtf8(text)) {
    throw InputError(name + ":" + lineAt(text, *invalid) + ": the file is not valid UTF-8.");
  }
  Tracker tracker(name);
  try {
    return tracker.parse(text, [] {});
  } catch (const Json::parse_error& error) {
    const std::size_t offset = error.byte == 0 ? 0 : error.byte - 1;
    throw InputError(name + ":" + lineAt(text, offset) + ": not valid JSON: " + complaintOf(error) + ".");
  } catch (const Json::out_of_range&) {
    throw InputError(tracker.place() + "the number is too large for a double.");
  }
}

}  // namespace

std::string jsonPath(const std::string& path, std::string_view key) {
  return path.empty() ? std::string(key) : path + "." + std::string(key);
}

std::string jsonPath(const std::string& path, std::size_t index) { return path + "[" + std::to_string(index) + "]"; }

std::string sentenceAbout(const std::string& path, const std::string& sentence) {
  return (path.empty() ? "the document" : printablePath(path)) + ": " + sentence;
}

std::optional<std::size_t> lineOfPath(std::string_view text, const std::string& path) {
  const std::optional<Progress> place = placeOfPath(text, path);
  return place ? std::optional(place->line) : std::nullopt;
}

JsonDocument::JsonDocument(std::string text, std::string name)
    : text_(std::move(text)), name_(std::move(name)), value_(parsed(text_, name_)) {}

std::string JsonDocument::textOf(const std::filesystem::path& file) {
  const std::string name = file.string();
  std::error_code failure;
  const std::filesystem::file_status status = std::filesystem::status(file, failure);
  if (status.type() == std::filesystem::file_type::not_found) throw InputError(name + ": the file does not exist.");
  if (std::filesystem::is_directory(status)) throw InputError(name + ": this is a directory, not a file.");
  std::ifstream stream(file, std::ios::binary);
  if (!stream) throw InputError(name + ": the file cannot be opened; check its permissions.");
  std::string text;
  std::array<char, 65536> piece;  // read() reports a failure where stream iterators throw
  while (stream.read(piece.data(), piece.size()) || stream.gcount() > 0) {
    text.append(piece.data(), static_cast<std::size_t>(stream.gcount()));
    if (text.size() > kMaxDocument) {
      throw InputError(name + ": the file is larger than " + std::to_string(kMaxDocument >> 20U) + " MiB.");
    }
  }
  if (stream.bad()) throw InputError(name + ": the file cannot be read.");
  return text;
}

JsonDocument JsonDocument::read(const std::filesystem::path& file) { return {textOf(file), file.string()}; }

std::string JsonDocument::textAt(const std::optional<std::size_t>& line, const std::string& path,
                                 const std::string& sentence) const {
  return name_ + (line ? ":" + std::to_string(*line) : "") + ": " + sentenceAbout(path, sentence);
}

void JsonDocument::fail(const std::string& path, const std::string& sentence, const std::string& place) const {
  const std::optional<Progress> at = placeOfPath(text_, place);
  if (!at) throw DocumentError(textAt(std::nullopt, path, sentence), 0);
  throw DocumentError(textAt(at->line, path, sentence), at->offset);
}

void JsonDocument::failMissing(const std::string& path, const std::string& sentence) const {
  throw DocumentError(textAt(lineOfPath(text_, path), path, sentence), text_.size());
}

}  // namespace quazor
