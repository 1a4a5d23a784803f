// A plug-in with one diagnostic, for any machine with a camera: does one camera deliver its frames?
#include "contract/lab.h"
#include "diagnostics/single_camera/single_camera_analysis.h"
#include "diagnostics/single_camera/single_camera_experiment.h"

#include <memory>

namespace quazor {

namespace {

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("SingleCameraExperiment", [] { return std::make_shared<QZSingleCameraExperiment>(); });
  lab.addAnalysisWithName("SingleCameraAnalysis", [] { return std::make_shared<QZSingleCameraAnalysis>(); });
  lab.addDiagnosticWithName("SingleCameraDiagnostic", "Stream one camera and ensure it delivers every frame on time.",
                            "SingleCameraExperiment", "SingleCameraAnalysis");
}

}  // namespace

}  // namespace quazor
