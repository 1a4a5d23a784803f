// Complete runs on a simulated phone: healthy ones, and those that fail before a stream is configured.
#include "diagnostics/camera_sync/camera_sync_experiment.h"

#include "tests/sweeps/camera_sync_bench.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(CameraSyncExperiment, RunsTheBackCameras) { expectTold(kHealthyBackRun, Side::kBack, cameraSyncScenario()); }

TEST(CameraSyncExperiment, RunsTheFrontCameras) { expectTold(kHealthyFrontRun, Side::kFront, cameraSyncScenario()); }

TEST(CameraSyncExperiment, ConfiguresEverySlaveByItselfWhereTheMasterCannot) {
  expectTold(kHealthyBackRunWithoutMasterConfiguration, Side::kBack, withoutMasterConfiguration(cameraSyncScenario()));
}

std::string notSynchronized() {
  return "returned nothing\nerror QZCapturePlugInErrorDomain code 214: Failed to synchronize cameras!\n";
}
std::string noGroup() {
  return "front-cameras get streams\n"
         "log error: Failed to find appropriate group for ports (BackFacingCamera, BackFacingTelephotoCamera, "
         "BackFacingSuperWideCamera)!\n" +
         notSynchronized();
}

constexpr const char* kReadGroup = "SynchronizedStreamsGroup.valueForProperty";
constexpr const char* kSetGroup = "SynchronizedStreamsGroup.setValue";

class FailingSynchronization : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingSynchronization, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, cameraSyncScenario(), kHealthyBackRun);
}

const FaultRow kSynchronizationRows[] = {
    {"ThePlugInIsNotLoaded", {"CaptureService.createPlugIn"}, R"(service create plug-in -> failed
log error: Failed to load capture plugin!
returned nothing
error QZCapturePlugInErrorDomain code 200: Failed to create capture device!
)"},
    {"ThereIsNoDevice", {"CapturePlugIn.device"}, R"(plug-in get device -> failed
log error: Failed to create capture device! {error}
returned nothing
error QZCapturePlugInErrorDomain code 200: Failed to create capture device!{cause}
)"},
    {"TheDeviceTellsNoGroups", {"CaptureDevice.synchronizedStreamsGroups"}, R"(device get groups -> failed
log error: Failed to copy groups from device! {error}
)" + notSynchronized()},
    {"TheGroupTellsNoStreams",
     {"SynchronizedStreamsGroup.streams", "back-cameras"},
     R"(back-cameras get streams -> failed
)" + noGroup()},
    {"TheFirstStreamTellsNoPort", {kReadStream, "back-wide", "PortType", 1}, R"(back-wide get PortType -> failed
back-tele get PortType
back-super-wide get PortType
back-wide get PortType
back-tele get PortType
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
)" + noGroup()},
    {"TheFirstStreamTellsNoPortWhenTheSecondIsLookedFor",
     {kReadStream, "back-wide", "PortType", 2},
     "back-wide get PortType -> failed\n",
     "back-tele get PortType"},
    {"TheMiddleStreamTellsNoPort", {kReadStream, "back-tele", "PortType", 1}, R"(back-tele get PortType -> failed
back-super-wide get PortType
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
)" + noGroup()},
    {"TheLastStreamTellsNoPort",
     {kReadStream, "back-super-wide", "PortType", 1},
     R"(back-super-wide get PortType -> failed
)" + noGroup()},
    {"ControlIsRefused",
     {"CaptureDevice.requestControlOfStreams"},
     R"(device request control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to request control streams (BackFacingCamera, BackFacingTelephotoCamera, BackFacingSuperWideCamera)! {error}
)" + notSynchronized()},
    {"TheActiveStreamsAreRefused",
     {kSetGroup, "back-cameras", "ActiveStreams"},
     R"(back-cameras set ActiveStreams = (stream back-wide (BackFacingCamera), stream back-tele (BackFacingTelephotoCamera), stream back-super-wide (BackFacingSuperWideCamera)) -> failed
log error: Failed to set the active streams {error}!
)" + notSynchronized()},
    {"TheMasterIsNotTold",
     {kReadGroup, "back-cameras", "SynchronizationMaster"},
     R"(back-cameras get SynchronizationMaster -> failed
log error: The sync master port must be provided first!
)" + notSynchronized()},
    {"TheGroupIsRefused",
     {"CaptureDevice.setValue", std::nullopt, "MultiCamConfiguration"},
     R"(device set MultiCamConfiguration = {ActiveSynchronizedStreamsGroups = (group back-cameras)} -> failed
log error: Failed to set the multicam config! {error}
)" + notSynchronized()},
    {"TheFirstStreamRefusesMultipleOutputs",
     {kSetStream, "back-wide", "MultipleOutputSupportEnabled"},
     R"(back-wide set MultipleOutputSupportEnabled = 1 -> failed
log error: Failed to configure BackFacingCamera for multiple output support! {error}
)",
     "back-tele set MultipleOutputSupportEnabled = 1"},
    {"TheMiddleStreamRefusesMultipleOutputs",
     {kSetStream, "back-tele", "MultipleOutputSupportEnabled"},
     R"(back-tele set MultipleOutputSupportEnabled = 1 -> failed
log error: Failed to configure BackFacingTelephotoCamera for multiple output support! {error}
back-super-wide set MultipleOutputSupportEnabled = 1
back-cameras get MasterConfigurationSupportedKeys
log default: Device supports SlaveConfigurationByPortType
back-cameras set MasterConfiguration = {SlaveConfigurationByPortType = {BackFacingSuperWideCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}}}
)",
     "back-wide set FormatIndex = 16"},
    {"TheLastStreamRefusesMultipleOutputs",
     {kSetStream, "back-super-wide", "MultipleOutputSupportEnabled"},
     R"(back-super-wide set MultipleOutputSupportEnabled = 1 -> failed
log error: Failed to configure BackFacingSuperWideCamera for multiple output support! {error}
back-cameras get MasterConfigurationSupportedKeys
log default: Device supports SlaveConfigurationByPortType
back-cameras set MasterConfiguration = {SlaveConfigurationByPortType = {BackFacingTelephotoCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}}}
)",
     "back-wide set FormatIndex = 16"},
    {"TheSupportedKeysAreNotTold",
     {kReadGroup, "back-cameras", "MasterConfigurationSupportedKeys"},
     std::string("back-cameras get MasterConfigurationSupportedKeys -> failed\n") + kSlavesConfiguredByThemselves,
     "back-wide set FormatIndex = 16"},
    {"TheMasterConfigurationIsRefused",
     {kSetGroup, "back-cameras", "MasterConfiguration"},
     R"(back-cameras set MasterConfiguration = {SlaveConfigurationByPortType = {BackFacingTelephotoCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}; BackFacingSuperWideCamera = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}}} -> failed
log error: Failed to set the slave config! {error}
)" + notSynchronized()},
};

INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingSynchronization, testing::ValuesIn(kSynchronizationRows), nameOf);

class FailingSlaveConfiguration : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingSlaveConfiguration, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, withoutMasterConfiguration(cameraSyncScenario()),
                      kHealthyBackRunWithoutMasterConfiguration);
}

// PortType is read three times before the slaves are configured.
const FaultRow kSlaveConfigurationRows[] = {
    {"TheMasterTellsNoPort",
     {kReadStream, "back-wide", "PortType", 4},
     "back-wide get PortType -> failed\n",
     "back-tele get PortType"},
    {"TheFirstSlaveTellsNoPortInItsScan",
     {kReadStream, "back-tele", "PortType", 3},
     "back-tele get PortType -> failed\n",
     "back-super-wide get PortType"},
    {"TheFirstSlaveTellsNoPortInTheOtherScan",
     {kReadStream, "back-tele", "PortType", 4},
     "back-tele get PortType -> failed\n",
     "back-super-wide get PortType"},
    {"TheLastSlaveTellsNoPortInItsScan",
     {kReadStream, "back-super-wide", "PortType", 3},
     "back-super-wide get PortType -> failed\n",
     "back-wide set FormatIndex = 16"},
    {"TheFirstSlaveRefusesMultipleOutputs",
     {kSetStream, "back-tele", "MultipleOutputSupportEnabled"},
     R"(back-tele set MultipleOutputSupportEnabled = 1 -> failed
log error: Failed to configure BackFacingTelephotoCamera for multiple output support! {error}
back-super-wide set MultipleOutputSupportEnabled = 1
back-cameras get MasterConfigurationSupportedKeys
log default: Device does not support SlaveConfigurationByPortType, using SynchronizedStreamsSlaveConfiguration instead.
back-wide get PortType
back-tele get PortType
back-super-wide get PortType
back-super-wide set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}
)",
     "back-wide set FormatIndex = 16"},
    {"TheFirstSlaveRefusesItsConfiguration",
     {kSetStream, "back-tele", "SynchronizedStreamsSlaveConfiguration"},
     R"(back-tele set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1} -> failed
log error: Failed to set the slave config! {error}
)" + notSynchronized()},
    {"TheLastSlaveRefusesItsConfiguration",
     {kSetStream, "back-super-wide", "SynchronizedStreamsSlaveConfiguration"},
     R"(back-super-wide set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1} -> failed
log error: Failed to set the slave config! {error}
)" + notSynchronized()},
};

INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingSlaveConfiguration, testing::ValuesIn(kSlaveConfigurationRows),
                         nameOf);

TEST(CameraSyncExperiment, FailsWhenTheMasterIsNotTheFirstPort) {
  Scenario scenario = cameraSyncScenario();
  scenario.groups.front().master = "back-super-wide";
  expectTold(healthyUpTo(kHealthyBackRun,
                         "device set MultiCamConfiguration = {ActiveSynchronizedStreamsGroups = (group back-cameras)}",
                         "log error: The sync master port must be provided first!\n" + notSynchronized()),
             Side::kBack, scenario);
}

TEST(CameraSyncExperiment, FailsWhenNoGroupHasEveryPort) {
  Scenario scenario = cameraSyncScenario();
  scenario.groups.front().cameras = {"front", "back-wide", "back-tele"};
  expectTold(healthyUpTo(kHealthyBackRun, "back-wide get PortType", R"(front get PortType
back-wide get PortType
front get PortType
back-wide get PortType
back-tele get PortType
front get PortType
back-wide get PortType
back-tele get PortType
)" + noGroup()),
             Side::kBack, scenario);
}

}  // namespace
}  // namespace quazor
