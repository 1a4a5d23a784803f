// A plug-in for tests of attempts and repetitions: diagnostics whose runs end as a file says.
//
// QUAZOR_SCRIPT names the file. Each run of an experiment takes the first character of it away: 'p' passes, 'f' fails,
// 'e' ends in an error, 'n' returns a result that is no number and 'c' crashes. An empty file makes a run pass.
#include "contract/lab.h"
#include "contract/results.h"

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <limits>
#include <memory>
#include <string>

namespace quazor {

namespace {

char nextOfScript() {
  const char* const file = std::getenv("QUAZOR_SCRIPT");
  if (file == nullptr) return 'p';
  std::ifstream in(file);
  std::string script((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  in.close();
  if (script.empty()) return 'p';
  std::ofstream(file) << script.substr(1);
  return script.front();
}

class ScriptedExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override { return QZDescription("Does what the script says."); }
  bool setupWithParameters(const Dictionary& /*parameters*/, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    return true;
  }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    const char next = nextOfScript();
    if (next == 'c') std::abort();
    if (next == 'e') {
      *error = errorWithMessage("Script", 7, "the script says so", nullptr);
      return nullptr;
    }
    const double value = next == 'n' ? std::numeric_limits<double>::quiet_NaN() : next == 'f' ? 1 : 10;
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set("Value", Measurement(value, QZDimensionlessUnit::frames()));
    result->measurements().set("Same", Measurement(5, QZDimensionlessUnit::frames()));
    return result;
  }
};

class ScriptedAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Limits the value."); }
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& measured,
                                                            DiagnosticErrorPtr* /*error*/) override {
    auto result = std::make_unique<QZAnalysisResult>();
    for (const auto& [name, measurement] : measured.measurements()) {
      QZMeasuredResult one(name, measurement);
      QZLimit limit("Enough");
      const Measurement least(5, QZDimensionlessUnit::frames());
      limit.setLowerBound(std::make_shared<const QZBound>(least, false));
      one.setLimit(limit);
      result->measuredResults().push_back(one);
    }
    return result;
  }
};

[[gnu::constructor]] void registerAll() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("ScriptedExperiment", [] { return std::make_shared<ScriptedExperiment>(); });
  lab.addAnalysisWithName("ScriptedAnalysis", [] { return std::make_shared<ScriptedAnalysis>(); });
  for (const char* name : {"Scripted.One", "Scripted.Two"}) {
    lab.addDiagnosticWithName(name, "Ends as the script says.", "ScriptedExperiment", "ScriptedAnalysis");
  }
}

}  // namespace

}  // namespace quazor
