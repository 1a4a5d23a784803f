// A plug-in for tests of the host: it registers the same name twice.
#include "contract/lab.h"

#include <memory>

namespace {

[[gnu::constructor]] void registerTwice() {
  quazor::QZLab& lab = quazor::QZLab::defaultLab();
  lab.addExperimentWithName("Repeated", [] { return nullptr; });
  lab.addExperimentWithName("Repeated", [] { return nullptr; });
}

}  // namespace
