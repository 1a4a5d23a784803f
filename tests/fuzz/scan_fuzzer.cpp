// Arbitrary lines as what a process says that scans plug-ins: each is a registration or a description that is the same
// when it is said again, or is refused.
#include "base/json/json_line.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameters.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"
#include "tests/fuzz/fuzzing.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

std::string said(const Json& json) { return json.dump(-1, ' ', false, Json::error_handler_t::replace); }

std::optional<QZLab::Registration> requireRegistration(const Json& json) {
  std::optional<QZLab::Registration> registration = accepted([&] { return registrationFrom(json); });
  if (!registration) return registration;
  const std::string line = said(registrationJson(*registration));
  require(said(registrationJson(registrationFrom(parseJsonLine(line)))) == line,
          "a registration is the same when it is said again");
  return registration;
}

void add(const QZLab::Registration& one, QZLab& lab) {
  switch (one.kind) {
    case QZLab::Kind::kExperiment: lab.addExperimentWithName(one.name, nullptr); return;
    case QZLab::Kind::kAnalysis: lab.addAnalysisWithName(one.name, nullptr); return;
    case QZLab::Kind::kDiagnostic:
      lab.addDiagnosticWithName(one.name, one.summary, one.experimentName, one.analysisName);
  }
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
  QZLab lab;
  std::vector<DiagnosticDescription> descriptions;
  for (const std::string& line : linesOf(asText(data, size))) {
    const std::optional<Json> json = accepted([&] { return parseJsonLine(line); });
    if (!json) break;  // the host ends the process
    if (const std::optional<QZLab::Registration> registration = requireRegistration(*json)) {
      add(*registration, lab);
    } else if (std::optional<DiagnosticDescription> description = requireDescription(*json)) {
      descriptions.push_back(*std::move(description));
    }
  }
  const std::vector<Diagnostic> diagnostics = catalogueOf(lab);
  std::vector<DescribedDiagnostic> described;
  for (std::size_t i = 0; i < std::min(diagnostics.size(), descriptions.size()); ++i) {
    described.push_back({diagnostics[i], descriptions[i]});
  }
  requireCatalogue(diagnostics, described);
  return 0;
}
