// A plug-in for tests of the host: experiments that no diagnostic uses.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/plugins/image_experiment.h"

#include <memory>

namespace {

[[gnu::constructor]] void registerExperiments() {
  quazor::QZLab& lab = quazor::QZLab::defaultLab();
  lab.addExperimentWithName("Alone.Images", [] { return std::make_shared<quazor::fake::ImageExperiment>(); });
  lab.addExperimentWithName("Alone.Counts", [] { return std::make_shared<quazor::fake::FakeExperiment>(); });
  lab.addExperimentWithName("Alone.Nothing", [] { return nullptr; });
}

}  // namespace
