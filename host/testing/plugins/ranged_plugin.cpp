// A plug-in for tests of the host: its parameters have ranges, as the environment variable RANGED_PLUGIN says.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/parameter_range.h"

#include <cmath>
#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string_view>

namespace {

using namespace quazor;

bool isAsked(std::string_view way) {
  const char* const variable = std::getenv("RANGED_PLUGIN");
  return variable != nullptr && way == variable;
}

class RangedExperiment final : public QZExperiment, public QZParameterRanges {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("Accepts some numbers.");
    description.addParameter(QZNumberParameter("How often.", true), "count");
    description.addParameter(QZNumberParameter("How much.", false), "gain");
    description.addParameter(QZNumberParameter("Anything.", false), "anything");
    return description;
  }

  OrderedMap<QZParameterRange> parameterRanges() const override {
    if (isAsked("throw")) throw std::runtime_error("no ranges today");
    QZParameterRange count;
    count.setMinimum(isAsked("swapped") ? 9 : 1);
    count.setMaximum(isAsked("nan") ? std::nan("") : 8);
    count.setInteger();
    if (isAsked("required")) count.setDefault(3);
    QZParameterRange gain;
    gain.setMinimum(0, true);
    gain.setUnit("dB");
    gain.setDefault(0.5);
    OrderedMap<QZParameterRange> ranges;
    ranges.set(isAsked("unknown") ? "cuont" : "count", count);
    ranges.set("gain", gain);
    return ranges;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    return std::make_unique<QZExperimentResult>();
  }
};

class RangedAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Measures 1."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& /*result*/,
                                                            DiagnosticErrorPtr* /*error*/) override {
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back("R", Measurement(1, QZDimensionlessUnit::events()));
    return analysis;
  }
};

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("RangedExperiment", [] { return std::make_shared<RangedExperiment>(); });
  lab.addAnalysisWithName("RangedAnalysis", [] { return std::make_shared<RangedAnalysis>(); });
  lab.addDiagnosticWithName("Ranged", "Has ranges.", "RangedExperiment", "RangedAnalysis");
}

}  // namespace
