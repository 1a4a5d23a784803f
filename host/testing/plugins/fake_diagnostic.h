// A diagnostic for tests; its parameters determine its behaviour.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "platform/platform.h"

#include <memory>
#include <string>
#include <string_view>

namespace quazor::fake {

// Values of the parameter "behaviour".
enum class Behaviour {
  kNormal = 0,

  // Experiment.
  kSetupFails = 1,
  kSetupFailsWithoutError = 2,
  kSetupThrows = 3,
  kSetupThrowsAnInteger = 4,
  kRunFails = 5,  // with an underlying error
  kRunFailsWithoutError = 6,
  kRunThrows = 7,
  kRunSucceedsWithError = 8,  // returns a result and also sets an error
  kTeardownFails = 9,
  kTeardownThrows = 10,
  kRunAndTeardownFail = 11,
  kRunThrowsAnInteger = 12,

  // Analysis.
  kAnalysisSetupFails = 20,
  kAnalysisSetupThrows = 21,
  kAnalyzingFails = 22,
  kAnalyzingFailsWithoutError = 23,
  kAnalyzingThrows = 24,
  kNothingMeasured = 25,
  kBoundInAnotherUnit = 26,
  kNotANumber = 27,
};

// Parameters: "duration" (required), seconds to sleep by the platform's clock; "measured", the value of the measurement
// "Count"; "behaviour". The result also has auxiliary data of several kinds.
class FakeExperiment : public QZExperiment, public QZTeardown {
 public:
  QZDescription experimentDescription() const override;
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;
  bool teardown(DiagnosticErrorPtr* error) override;

 private:
  Behaviour behaviour_ = Behaviour::kNormal;
  double duration_ = 0;  // seconds
  double measured_ = 0;
};

// Parameters: "minimum", the closed lower bound of the result "Count"; "behaviour". The second result, "Echo", has no
// limit.
class FakeAnalysis : public QZAnalysis, public QZAnalysisSetup {
 public:
  QZDescription analysisDescription() const override;
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override;

 private:
  Behaviour behaviour_ = Behaviour::kNormal;
  double minimum_ = 0;
};

// Registers the diagnostic NAME of an experiment NAMEExperiment and an analysis NAMEAnalysis.
template <class Experiment>
void registerDiagnostic(const std::string& name, std::string_view summary) {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName(name + "Experiment", [] { return std::make_shared<Experiment>(); });
  lab.addAnalysisWithName(name + "Analysis", [] { return std::make_shared<FakeAnalysis>(); });
  lab.addDiagnosticWithName(name, summary, name + "Experiment", name + "Analysis");
}

}  // namespace quazor::fake
