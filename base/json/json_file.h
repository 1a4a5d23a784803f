// Strict reading of JSON files.
#pragma once

#include <nlohmann/json.hpp>

#include <cstddef>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

// What is wrong with a document: one sentence for its author. Never leaves whoever reads the document.
class JsonProblem : public std::runtime_error {
 public:
  explicit JsonProblem(const std::string& sentence) : std::runtime_error(sentence) {}
  // The sentence is about what stands at `path`, and begins with it; an empty path is the document as a whole.
  JsonProblem(const std::string& path, const std::string& sentence) : JsonProblem(path, sentence, path) {}
  // The same; what is wrong stands at `place`, which is within `path`.
  JsonProblem(const std::string& path, const std::string& sentence, std::string place)
      : std::runtime_error((path.empty() ? "the document" : path) + ": " + sentence), place_(std::move(place)) {}

  // The path of what is wrong; nothing where the sentence says itself where that is.
  const std::optional<std::string>& place() const { return place_; }

 private:
  std::optional<std::string> place_;
};

// The document in `text`, which must be UTF-8 and nothing but one JSON value, without two equal keys in one object and
// not nested absurdly deep. Throws JsonProblem, "NAME:LINE: ..." or, where that is known, "NAME:LINE: PATH: ...".
nlohmann::ordered_json parseJson(std::string_view text, const std::string& name);

// The line, from 1, in which the value at `path` (as jsonPath() writes it) of the document in `text` begins, or the
// key that it has; 1 where there is none. Parses the text once more: for what goes wrong.
std::size_t lineOfPath(std::string_view text, const std::string& path);

// The text of a file. Throws JsonProblem where it cannot be read, or is larger than 16 MiB.
std::string readTextFile(const std::filesystem::path& file);

// The document in a file. Throws JsonProblem, also for a file that cannot be read.
nlohmann::ordered_json readJsonFile(const std::filesystem::path& file);

// A path into a document: "faults" and 2 make "faults[2]"; that and "action" make "faults[2].action".
std::string jsonPath(const std::string& path, std::string_view key);
std::string jsonPath(const std::string& path, std::size_t index);

}  // namespace quazor
