// Arbitrary lines as what a process says that scans plug-ins: each is a diagnostic or a description that is the same
// when it is said again, or is refused.
#include "base/json/json_line.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"
#include "tests/fuzz/fuzzing.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

std::string said(const Json& json) { return json.dump(-1, ' ', false, Json::error_handler_t::replace); }

std::optional<Diagnostic> requireDiagnostic(const Json& json) {
  std::optional<Diagnostic> diagnostic = accepted([&] { return diagnosticFrom(json); });
  if (!diagnostic) return diagnostic;
  const std::string line = said(diagnosticJson(*diagnostic));
  const Diagnostic again = diagnosticFrom(parseJsonLine(line));
  require(said(diagnosticJson(again)) == line, "a diagnostic is the same when it is said again");
  require(contains({again}, *diagnostic) && matchesName(again.name, diagnostic->name), "its name is the same");
  return diagnostic;
}

std::optional<DiagnosticDescription> requireDescription(const Json& json) {
  std::optional<DiagnosticDescription> description = accepted([&] { return descriptionFrom(json); });
  if (!description) return description;
  const std::string line = said(descriptionJson(*description));
  require(said(descriptionJson(descriptionFrom(parseJsonLine(line)))) == line,
          "a description is the same when it is said again");
  return description;
}

// A catalogue of what was said can be searched with its own names.
void requireCatalogue(const std::vector<Diagnostic>& diagnostics, const std::vector<DescribedDiagnostic>& described) {
  for (const Wanted wanted : {Wanted::kDiagnostics, Wanted::kExperiments, Wanted::kDescribable}) {
    accepted([&] { return selectDiagnostics(diagnostics, wanted, namesOf(diagnostics)); });
    for (const Diagnostic& one : allOf(diagnostics, wanted)) {
      const auto found = accepted([&] { return selectDiagnostics(diagnostics, wanted, {one.name}); });
      require(found && contains(*found, one), "a diagnostic is found by its name");
    }
  }
  for (const DescribedDiagnostic& one : described) {
    const ResolvedParameters parameters = resolveParameters(one, {}, {});
    require(dictionaryOf(parameters.experiment).size() == 0, "without a source no parameter is set");
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  std::vector<Diagnostic> diagnostics;
  std::vector<DescribedDiagnostic> described;
  for (const std::string& line : linesOf(asText(data, size))) {
    const std::optional<Json> json = accepted([&] { return parseJsonLine(line); });
    if (!json) break;  // the host ends the process
    if (std::optional<Diagnostic> diagnostic = requireDiagnostic(*json)) {
      diagnostics.push_back(*std::move(diagnostic));
    } else if (std::optional<DiagnosticDescription> description = requireDescription(*json)) {
      if (described.size() == diagnostics.size()) break;
      described.push_back({diagnostics[described.size()], *std::move(description)});
    }
  }
  requireCatalogue(diagnostics, described);
  return 0;
}
