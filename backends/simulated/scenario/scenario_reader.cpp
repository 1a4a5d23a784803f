#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/scenario/scenario_content.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;
namespace fs = std::filesystem;

struct Loaded {
  Json document;  // with its base merged in
  Scenario scenario;
};

// One file and its bases. A base is a whole scenario itself, so that what is wrong with it is found there and not in
// the files that build on it. `open_` are the files on the way here; none of them may be a base again.
class Loader {
 public:
  Loaded load(const fs::path& file) {
    Json document = readJsonFile(file);
    try {
      if (document.is_object() && document.contains("base")) document = merged(std::move(document), file);
      Scenario scenario = scenarioOf(JsonCursor(document));
      return {std::move(document), std::move(scenario)};
    } catch (const JsonProblem& problem) {
      throw JsonProblem(file.string() + ": " + problem.what());
    }
  }

 private:
  // RFC 7396: the document as a merge patch on its base.
  Json merged(Json document, const fs::path& file) {
    const JsonCursor base = JsonCursor(document).at("base");
    const fs::path baseFile = (file.parent_path() / base.text()).lexically_normal();
    open_.push_back(fs::weakly_canonical(file));
    if (std::ranges::find(open_, fs::weakly_canonical(baseFile)) != open_.end()) {
      base.fail(inQuotes(base.text()) + " is based on this file in turn; a base must stand on its own.");
    }
    Json result = loadBase(baseFile);
    document.erase("base");
    result.merge_patch(document);
    return result;
  }

  Json loadBase(const fs::path& file) {
    try {
      return load(file).document;
    } catch (const JsonProblem& problem) {
      throw JsonProblem(std::string("base: ") + problem.what());
    }
  }

  std::vector<fs::path> open_;
};

}  // namespace

std::optional<Scenario> readScenario(const fs::path& file, std::string* problem) {
  try {
    return Loader().load(file).scenario;
  } catch (const JsonProblem& found) {
    if (problem != nullptr) *problem = found.what();
  } catch (const fs::filesystem_error& failure) {
    if (problem != nullptr) *problem = file.string() + ": " + failure.code().message() + ".";
  }
  return std::nullopt;
}

}  // namespace quazor
