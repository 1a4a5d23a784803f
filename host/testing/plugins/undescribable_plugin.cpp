// A plug-in for tests of the host: asking its diagnostic for a description ends the process.
#include "host/testing/plugins/fake_diagnostic.h"

#include <unistd.h>

#include <memory>

namespace quazor::fake {

namespace {

class FatalDescription final : public FakeExperiment {
 public:
  QZDescription experimentDescription() const override { ::_exit(4); }
};

[[gnu::constructor]] void registerFatal() { registerDiagnostic<FatalDescription>("Fatal", "Cannot be described."); }

}  // namespace

}  // namespace quazor::fake
