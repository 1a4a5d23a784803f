// Strict reading of JSON files.
#pragma once

#include <nlohmann/json.hpp>

#include <filesystem>
#include <stdexcept>
#include <string>
#include <string_view>

namespace quazor {

// What is wrong with a document: one sentence for its author. Never leaves the reader of scenarios.
class JsonProblem : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The document in `text`, which must be UTF-8 and nothing but one JSON value, without two equal keys in one object and
// not nested absurdly deep. Throws JsonProblem: "NAME:LINE: ..." where the text is no JSON, else "NAME: PATH: ...".
nlohmann::ordered_json parseJson(std::string_view text, const std::string& name);

// The document in a file. Throws JsonProblem, also for a file that cannot be read.
nlohmann::ordered_json readJsonFile(const std::filesystem::path& file);

// A path into a document: "faults" and 2 make "faults[2]"; that and "action" make "faults[2].action".
std::string jsonPath(const std::string& path, std::string_view key);
std::string jsonPath(const std::string& path, std::size_t index);

}  // namespace quazor
