// The registration of this plug-in with the host's lab. The name is public and permanent.
#include "contract/lab.h"
#include "contract/loading.h"
#include "diagnostics/sensor_images/nimbe_image_experiment.h"

#include <memory>

QUAZOR_LOADED_ONLY_WHEN_NAMED;  // its experiment streams images, which nobody should wait for unasked

namespace quazor {

namespace {

[[gnu::constructor]] void registerSensorImages() {
  QZLab::defaultLab().addExperimentWithName("NimbeImageExperiment",
                                            [] { return std::make_shared<QZNimbeImageExperiment>(); });
}

}  // namespace

}  // namespace quazor
