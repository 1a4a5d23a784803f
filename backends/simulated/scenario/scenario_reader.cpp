#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/scenario/scenario_content.h"
#include "base/text/input_error.h"

#include <algorithm>
#include <memory>
#include <system_error>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;
namespace fs = std::filesystem;

// Reads one file and its bases. A base must be a complete scenario by itself, so its errors are reported for the base
// and not for the files that use it. `open_` are the files being read; none of them may be a base again.
//
// Thread: one at a time
class Loader {
 public:
  explicit Loader(const ScenarioFinder& find) : find_(find) {}

  Scenario load(const fs::path& file) {
    auto document = std::make_shared<JsonDocument>(JsonDocument::read(file));
    if (document->value().is_object() && document->value().contains("base"))
      document->setValue(merged(*document, file));
    Scenario scenario = scenarioOf(JsonCursor(*document));
    scenario.document = std::move(document);
    scenario.bases = bases_;
    return scenario;
  }

 private:
  // RFC 7396: the document as a merge patch on its base.
  Json merged(const JsonDocument& document, const fs::path& file) {
    const JsonCursor base = JsonCursor(document).at("base");
    const fs::path baseFile = fileOfBase(base.text(), file);
    open_.push_back(canonical(file));
    if (std::ranges::find(open_, canonical(baseFile)) != open_.end()) {
      base.fail(inQuotes(base.text()) +
                " is itself based on this file; scenarios must not be based on each other in a circle.");
    }
    Json patch = document.value();
    patch.erase("base");
    bases_.push_back(baseFile);
    Json result = loadBase(baseFile, base);
    result.merge_patch(patch);
    return result;
  }

  fs::path fileOfBase(const std::string& name, const fs::path& file) const {
    fs::path beside = (file.parent_path() / name).lexically_normal();
    std::error_code ignored;
    const bool mayBeName = find_ && fs::path(name).is_relative() && !fs::is_regular_file(beside, ignored);
    const fs::path found = mayBeName ? find_(name) : fs::path();
    return found.empty() ? beside : found;
  }

  Json loadBase(const fs::path& file, const JsonCursor& base) {
    try {
      return load(file).document->value();
    } catch (const InputError& problem) {
      base.fail(problem.what());
    }
  }

  static fs::path canonical(const fs::path& file) {
    std::error_code failure;
    fs::path path = fs::weakly_canonical(file, failure);
    if (failure) throw InputError(file.string() + ": " + failure.message() + ".");
    return path;
  }

  const ScenarioFinder& find_;
  std::vector<fs::path> open_;
  std::vector<fs::path> bases_;
};

}  // namespace

Scenario readScenario(const fs::path& file, const ScenarioFinder& find) { return Loader(find).load(file); }

}  // namespace quazor
