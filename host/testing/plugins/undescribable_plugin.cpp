// A plug-in for tests of the host: asking its diagnostic for a description ends the process.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <unistd.h>

#include <memory>

namespace quazor::fake {

namespace {

class FatalDescription final : public FakeExperiment {
 public:
  QZDescription experimentDescription() const override { ::_exit(4); }
};

[[gnu::constructor]] void registerFatal() {
  QZLab& lab = QZLab::defaultLab();
  lab.addAnalysisWithName("FatalAnalysis", [] { return std::make_shared<FakeAnalysis>(); });
  lab.addExperimentWithName("FatalExperiment", [] { return std::make_shared<FatalDescription>(); });
  lab.addDiagnosticWithName("Fatal", "Cannot be described.", "FatalExperiment", "FatalAnalysis");
}

}  // namespace

}  // namespace quazor::fake
