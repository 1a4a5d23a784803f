// A plug-in for tests of the host: a diagnostic with the experiment of working_plugin.cpp, and one with its own.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <memory>

namespace quazor::fake {

namespace {

[[gnu::constructor]] void registerCombined() {
  QZLab& lab = QZLab::defaultLab();
  lab.addAnalysisWithName("CombiningAnalysis", [] { return std::make_shared<FakeAnalysis>(); });
  lab.addExperimentWithName("CombiningExperiment", [] { return std::make_shared<FakeExperiment>(); });
  lab.addDiagnosticWithName("Combined", "Has another's experiment.", "FakeExperiment", "CombiningAnalysis");
  lab.addDiagnosticWithName("Combining.Own", "Has its own.", "CombiningExperiment", "CombiningAnalysis");
}

}  // namespace

}  // namespace quazor::fake
