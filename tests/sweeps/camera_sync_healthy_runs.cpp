// The complete traces of healthy runs.
#include "tests/sweeps/camera_sync_bench.h"

namespace quazor {

namespace {

// The runs of the back cameras differ in how the slaves are configured, and in nothing else.
std::string backRun(const char* slaveConfiguration) {
  constexpr const char* kBefore = R"(service create plug-in
plug-in get device
device get groups
back-cameras get streams
back-wide get PortType
back-wide get PortType
back-tele get PortType
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
device request control (back-wide, back-tele, back-super-wide)
back-cameras set ActiveStreams = (stream back-wide (BackFacingCamera), stream back-tele (BackFacingTelephotoCamera), stream back-super-wide (BackFacingSuperWideCamera))
back-cameras get SynchronizationMaster
device set MultiCamConfiguration = {ActiveSynchronizedStreamsGroups = (group back-cameras)}
back-wide set MultipleOutputSupportEnabled = 1
back-tele set MultipleOutputSupportEnabled = 1
back-super-wide set MultipleOutputSupportEnabled = 1
back-cameras get MasterConfigurationSupportedKeys
)";
  constexpr const char* kAfterwards = R"(back-wide set FormatIndex = 16
back-wide set MinimumFrameRate = 30
back-wide set MaximumFrameRate = 30
back-tele set FormatIndex = 14
back-tele set MinimumFrameRate = 30
back-tele set MaximumFrameRate = 30
back-super-wide set FormatIndex = 9
back-super-wide set MinimumFrameRate = 30
back-super-wide set MaximumFrameRate = 30
back-wide start
back-tele start
back-super-wide start
clock sleep 2
device get MulticamSessionStatus
back-wide get ErrorCounters
log default: BackFacingCamera <-- sync master
  Offset: 0
  Frames: 60
  Total: 60
  ErrorCounters: {I2CErrorCount = 11}

back-tele get ErrorCounters
log default: BackFacingTelephotoCamera
  Offset: 1
  Frames: 59
  Total: 60
  ErrorCounters: {I2CErrorCount = 22}

back-super-wide get ErrorCounters
log default: BackFacingSuperWideCamera
  Offset: 2
  Frames: 58
  Total: 60
  ErrorCounters: {I2CErrorCount = 33}

back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned a result
error untouched
BackWide.FrameOffset = 0 frames
BackWide.Frames = 60 frames
BackTele.FrameOffset = 1 frames
BackTele.Frames = 59 frames
BackSuperWide.FrameOffset = 2 frames
BackSuperWide.Frames = 58 frames
ErrorCounters = {BackWide = {I2CErrorCount = 11}; BackTele = {I2CErrorCount = 22}; BackSuperWide = {I2CErrorCount = 33}}
)";
  return std::string(kBefore) + slaveConfiguration + kAfterwards;
}

}  // namespace

const std::string kHealthyBackRun = backRun(R"(log default: Device supports SlaveConfigurationByPortType
back-cameras set MasterConfiguration = {SlaveConfigurationByPortType = {BackFacingTelephotoCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}; BackFacingSuperWideCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}}}
)");

const char* const kSlavesConfiguredByThemselves =
    R"(log default: Device does not support SlaveConfigurationByPortType, using SynchronizedStreamsSlaveConfiguration instead.
back-wide get PortType
back-tele get PortType
back-tele set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}
back-super-wide get PortType
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
back-super-wide set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}
)";

const std::string kHealthyBackRunWithoutMasterConfiguration = backRun(kSlavesConfiguredByThemselves);
;

// The group of the back cameras is looked through first: it has streams enough, and none of the ports.
const std::string kHealthyFrontRun =
    R"(service create plug-in
plug-in get device
device get groups
back-cameras get streams
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
front-cameras get streams
front get PortType
front get PortType
front-infrared get PortType
device request control (front, front-infrared)
front-cameras set ActiveStreams = (stream front (FrontFacingCamera), stream front-infrared (FrontFacingInfraredCamera))
front-cameras get SynchronizationMaster
device set MultiCamConfiguration = {ActiveSynchronizedStreamsGroups = (group front-cameras)}
front set MultipleOutputSupportEnabled = 1
front-infrared set MultipleOutputSupportEnabled = 1
front-cameras get MasterConfigurationSupportedKeys
log default: Device supports SlaveConfigurationByPortType
front-cameras set MasterConfiguration = {SlaveConfigurationByPortType = {FrontFacingInfraredCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}}}
front set FormatIndex = 1
front set MinimumFrameRate = 30
front set MaximumFrameRate = 30
front-infrared set FormatIndex = 0
front-infrared set MinimumFrameRate = 30
front-infrared set MaximumFrameRate = 30
front start
front-infrared start
clock sleep 2
device get MulticamSessionStatus
front get ErrorCounters
log default: FrontFacingCamera <-- sync master
  Offset: 0
  Frames: 60
  Total: 60
  ErrorCounters: {I2CErrorCount = 44}

front-infrared get ErrorCounters
log default: FrontFacingInfraredCamera
  Offset: 3
  Frames: 57
  Total: 60
  ErrorCounters: {I2CErrorCount = 55}

front-infrared stop
front stop
device relinquish control (front, front-infrared)
returned a result
error untouched
Front.FrameOffset = 0 frames
Front.Frames = 60 frames
FrontInfrared.FrameOffset = 3 frames
FrontInfrared.Frames = 57 frames
ErrorCounters = {Front = {I2CErrorCount = 44}; FrontInfrared = {I2CErrorCount = 55}}
)";

}  // namespace quazor
