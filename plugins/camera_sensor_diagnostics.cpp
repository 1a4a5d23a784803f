// The registry of this plug-in: the names that it registers with the host's lab when it is loaded.
//
// The names are public and permanent; their order is the order in which hosts list them.
#include "contract/lab.h"
#include "diagnostics/camera_sync/camera_sync_analysis.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "diagnostics/projector_fault/tessel_fault_analysis.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "diagnostics/report_channels/tessel_telemon_analysis.h"
#include "diagnostics/report_channels/tessel_telemon_experiment.h"
#include "platform/capture_keys.h"

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

namespace {

using PortTypes = std::vector<std::string>;

void registerReportChannels(QZLab& lab) {
  lab.addExperimentWithName("TesselTelemonExperiment", [] { return std::make_shared<QZTesselTelemonExperiment>(); });
  lab.addAnalysisWithName("TesselTelemonAnalysis", [] { return std::make_shared<QZTesselTelemonAnalysis>(); });
  lab.addDiagnosticWithName("TesselTelemonDiagnostic",
                            "Measure the important Tessel Telemons and ensure they are all present.",
                            "TesselTelemonExperiment", "TesselTelemonAnalysis");
}

void registerProjectorFault(QZLab& lab) {
  lab.addExperimentWithName("TesselFaultExperiment", [] { return std::make_shared<QZTesselFaultExperiment>(); });
  lab.addAnalysisWithName("TesselFaultAnalysis", [] { return std::make_shared<QZTesselFaultAnalysis>(); });
  lab.addDiagnosticWithName("TesselFaultDiagnostic",
                            "Perform a 30fps Dense-Intereleaved stream and capture K42ISP Telemon delta.",
                            "TesselFaultExperiment", "TesselFaultAnalysis");
}

// The first port of each list is the group's synchronisation master.
void registerBackCameras(QZLab& lab) {
  const PortTypes ports{std::string(port_type::BackFacingCamera), std::string(port_type::BackFacingTelephotoCamera),
                        std::string(port_type::BackFacingSuperWideCamera)};
  lab.addExperimentWithName("CameraSyncExperiment.Back", [ports] {
    return std::make_shared<QZCameraSyncExperiment>(ports, Array{16, 14, 9}, 30);
  });
  lab.addAnalysisWithName("CameraSyncAnalysis.Back", [ports] { return std::make_shared<QZCameraSyncAnalysis>(ports); });
  lab.addDiagnosticWithName("CameraSyncDiagnostic.Back",
                            "Sync the back cameras and ensure each camera produces a frame.",
                            "CameraSyncExperiment.Back", "CameraSyncAnalysis.Back");
}

void registerFrontCameras(QZLab& lab) {
  const PortTypes ports{std::string(port_type::FrontFacingCamera), std::string(port_type::FrontFacingInfraredCamera)};
  lab.addExperimentWithName("CameraSyncExperiment.Front", [ports] {
    return std::make_shared<QZCameraSyncExperiment>(ports, Array{1, 0}, 30);
  });
  lab.addAnalysisWithName("CameraSyncAnalysis.Front",
                          [ports] { return std::make_shared<QZCameraSyncAnalysis>(ports); });
  lab.addDiagnosticWithName("CameraSyncDiagnostic.Front",
                            "Sync the front cameras and ensure each camera produces a frame.",
                            "CameraSyncExperiment.Front", "CameraSyncAnalysis.Front");
}

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  registerReportChannels(lab);
  registerProjectorFault(lab);
  registerBackCameras(lab);
  registerFrontCameras(lab);
}

}  // namespace

}  // namespace quazor
