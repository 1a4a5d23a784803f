// A plug-in for tests of the host: a diagnostic that works, and some that cannot even be created.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <memory>
#include <stdexcept>

namespace quazor::fake {

namespace {

class UndescribableExperiment final : public FakeExperiment {
 public:
  QZDescription experimentDescription() const override { throw std::runtime_error("description threw"); }
};

[[gnu::constructor]] void registerAll() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("FakeExperiment", [] { return std::make_shared<FakeExperiment>(); });
  lab.addAnalysisWithName("FakeAnalysis", [] { return std::make_shared<FakeAnalysis>(); });
  lab.addDiagnosticWithName("Fake.One", "Does as it is told.", "FakeExperiment", "FakeAnalysis");
  lab.addDiagnosticWithName("Fake.Two", "Does as it is told, too.", "FakeExperiment", "FakeAnalysis");
  lab.addExperimentWithName("NoExperiment", [] { return nullptr; });
  lab.addDiagnosticWithName("Broken.Nothing", "Its factory makes nothing.", "NoExperiment", "FakeAnalysis");
  lab.addExperimentWithName("ThrowingFactory",
                            []() -> std::shared_ptr<QZExperiment> { throw std::runtime_error("factory threw"); });
  lab.addDiagnosticWithName("Broken.Factory", "Its factory throws.", "ThrowingFactory", "FakeAnalysis");
  lab.addExperimentWithName("UndescribableExperiment", [] { return std::make_shared<UndescribableExperiment>(); });
  lab.addDiagnosticWithName("Broken.Description", "Its description throws.", "UndescribableExperiment", "FakeAnalysis");
}

}  // namespace

}  // namespace quazor::fake
