// A plug-in for tests of the host: it registers only an analysis.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <memory>

namespace {

[[gnu::constructor]] void registerAnalysis() {
  quazor::QZLab::defaultLab().addAnalysisWithName("Analysis",
                                                  [] { return std::make_shared<quazor::fake::FakeAnalysis>(); });
}

}  // namespace
