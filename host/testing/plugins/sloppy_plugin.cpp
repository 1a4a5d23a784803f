// A plug-in for tests of the host: it works, and a reviewer would object to nearly all of it.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"

#include <memory>

namespace quazor::fake {

namespace {

class SloppyExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("counts something ");
    description.addParameter(QZNumberParameter("", false), "how.many");
    description.addParameter(QZNumberParameter("Not used. By anything.", false), "Unused");
    return description;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set("Something", Measurement(1, QZUnit::unitWithSymbol("parsec")));
    result->measurements().set("Else", Measurement(1, QZUnit::unitWithSymbol("")));
    return result;
  }
};

// None of its results has a limit.
class SloppyAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Looks.\nAnd looks again."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* /*error*/) override {
    auto analyzed = std::make_unique<QZAnalysisResult>();
    for (const auto& [name, measurement] : result.measurements()) {
      analyzed->measuredResults().emplace_back(name, measurement);
    }
    return analyzed;
  }
};

[[gnu::constructor]] void registerSloppy() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("measure_things", [] { return std::make_shared<SloppyExperiment>(); });
  lab.addAnalysisWithName("SloppyAnalysis", [] { return std::make_shared<SloppyAnalysis>(); });
  lab.addDiagnosticWithName("my check", "", "measure_things", "SloppyAnalysis");
}

}  // namespace

}  // namespace quazor::fake
