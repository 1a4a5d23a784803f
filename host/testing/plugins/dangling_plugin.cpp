// A plug-in for tests of the host: its diagnostic names an analysis that does not exist.
#include "contract/lab.h"

#include <memory>

namespace {

[[gnu::constructor]] void registerDangling() {
  quazor::QZLab& lab = quazor::QZLab::defaultLab();
  lab.addExperimentWithName("DanglingExperiment", [] { return nullptr; });
  lab.addAnalysisWithName("DanglingAnalysis", [] { return nullptr; });
  lab.addDiagnosticWithName("Dangling", "Names an analysis that is not there.", "DanglingExperiment",
                            "DanglingAnalysys");
}

}  // namespace
