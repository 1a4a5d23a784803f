// A plug-in for tests of the host: it registers an analysis and nothing else.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <memory>

namespace {

[[gnu::constructor]] void registerAnalysis() {
  quazor::QZLab::defaultLab().addAnalysisWithName("Analysis",
                                                  [] { return std::make_shared<quazor::fake::FakeAnalysis>(); });
}

}  // namespace
