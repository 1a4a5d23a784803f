// Complete runs on a simulated phone with failures after the cameras have been synchronised.
#include "diagnostics/camera_sync/camera_sync_experiment.h"

#include "tests/sweeps/camera_sync_bench.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

constexpr const char* kStart = "CaptureStream.start";
constexpr const char* kStop = "CaptureStream.stop";

// A rejected format index gives code 209; a rejected frame rate gives no error.
class FailingConfiguration : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingConfiguration, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, cameraSyncScenario(), kHealthyBackRun);
  expectToldWithFault(GetParam(), Side::kBack, withoutMasterConfiguration(cameraSyncScenario()),
                      kHealthyBackRunWithoutMasterConfiguration);
}

const FaultRow kConfigurationRows[] = {
    {"TheFirstFormat", {kSetStream, "back-wide", "FormatIndex"}, R"(back-wide set FormatIndex = 16 -> failed
log error: Failed to set the format index to 16 on BackFacingCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 209: Failed to set format index to 16{cause}
)"},
    {"TheFirstMinimum", {kSetStream, "back-wide", "MinimumFrameRate"}, R"(back-wide set MinimumFrameRate = 30 -> failed
log error: Failed to set the min frame rate to 30 on BackFacingCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
    {"TheFirstMaximum", {kSetStream, "back-wide", "MaximumFrameRate"}, R"(back-wide set MaximumFrameRate = 30 -> failed
log error: Failed to set the max frame rate to 30 on BackFacingCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
    {"TheMiddleFormat", {kSetStream, "back-tele", "FormatIndex"}, R"(back-tele set FormatIndex = 14 -> failed
log error: Failed to set the format index to 14 on BackFacingTelephotoCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 209: Failed to set format index to 14{cause}
)"},
    {"TheMiddleMinimum", {kSetStream, "back-tele", "MinimumFrameRate"}, R"(back-tele set MinimumFrameRate = 30 -> failed
log error: Failed to set the min frame rate to 30 on BackFacingTelephotoCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
    {"TheMiddleMaximum", {kSetStream, "back-tele", "MaximumFrameRate"}, R"(back-tele set MaximumFrameRate = 30 -> failed
log error: Failed to set the max frame rate to 30 on BackFacingTelephotoCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
    {"TheLastFormat", {kSetStream, "back-super-wide", "FormatIndex"}, R"(back-super-wide set FormatIndex = 9 -> failed
log error: Failed to set the format index to 9 on BackFacingSuperWideCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 209: Failed to set format index to 9{cause}
)"},
    {"TheLastMinimum",
     {kSetStream, "back-super-wide", "MinimumFrameRate"},
     R"(back-super-wide set MinimumFrameRate = 30 -> failed
log error: Failed to set the min frame rate to 30 on BackFacingSuperWideCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
    {"TheLastMaximum",
     {kSetStream, "back-super-wide", "MaximumFrameRate"},
     R"(back-super-wide set MaximumFrameRate = 30 -> failed
log error: Failed to set the max frame rate to 30 on BackFacingSuperWideCamera! {error}
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error emptied
)"},
};

INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingConfiguration, testing::ValuesIn(kConfigurationRows), nameOf);

class FailingStream : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingStream, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, cameraSyncScenario(), kHealthyBackRun);
}

// All streams are stopped, those that never started too; the phone refuses to stop these.
const FaultRow kStreamingRows[] = {
    {"TheFirstStart", {kStart, "back-wide"}, R"(back-wide start -> failed
log error: Failed to start steam at BackFacingCamera port! {error}
back-super-wide stop -> failed
back-tele stop -> failed
back-wide stop -> failed
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 204: Failed to start steam at BackFacingCamera port! {error}{cause}
)"},
    {"TheMiddleStart", {kStart, "back-tele"}, R"(back-tele start -> failed
log error: Failed to start steam at BackFacingTelephotoCamera port! {error}
back-super-wide stop -> failed
back-tele stop -> failed
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 204: Failed to start steam at BackFacingTelephotoCamera port! {error}{cause}
)"},
    {"TheLastStart", {kStart, "back-super-wide"}, R"(back-super-wide start -> failed
log error: Failed to start steam at BackFacingSuperWideCamera port! {error}
back-super-wide stop -> failed
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 204: Failed to start steam at BackFacingSuperWideCamera port! {error}{cause}
)"},
    {"TheSessionStatus",
     {"CaptureDevice.valueForProperty", std::nullopt, "MulticamSessionStatus"},
     R"(device get MulticamSessionStatus -> failed
back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
log error: Failed to copy session status! {error}
returned nothing
error QZCapturePlugInErrorDomain code 215: Failed to copy sesison status!{cause}
)"},
    {"TheFirstErrorCounters", {kReadStream, "back-wide", "ErrorCounters"}, R"(back-wide get ErrorCounters -> failed
log error: Failed to get error counters of steam at BackFacingCamera port! {error}
back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 210: No error counters for port BackFacingCamera!{cause}
)"},
    {"TheMiddleErrorCounters", {kReadStream, "back-tele", "ErrorCounters"}, R"(back-tele get ErrorCounters -> failed
log error: Failed to get error counters of steam at BackFacingTelephotoCamera port! {error}
back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 210: No error counters for port BackFacingTelephotoCamera!{cause}
)"},
    {"TheLastErrorCounters",
     {kReadStream, "back-super-wide", "ErrorCounters"},
     R"(back-super-wide get ErrorCounters -> failed
log error: Failed to get error counters of steam at BackFacingSuperWideCamera port! {error}
back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 210: No error counters for port BackFacingSuperWideCamera!{cause}
)"},
    // A stream that did not stop cannot be given back; there is a result all the same.
    {"TheFirstStop",
     {kStop, "back-super-wide"},
     R"(back-super-wide stop -> failed
log error: Failed to stop steam! {error}
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to relinquish steam! SimulatedCaptureErrorDomain code 10: back-super-wide is running; stop it before releasing control.
)",
     "returned a result"},
    {"TheMiddleStop",
     {kStop, "back-tele"},
     R"(back-tele stop -> failed
log error: Failed to stop steam! {error}
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to relinquish steam! SimulatedCaptureErrorDomain code 10: back-tele is running; stop it before releasing control.
)",
     "returned a result"},
    {"TheLastStop",
     {kStop, "back-wide"},
     R"(back-wide stop -> failed
log error: Failed to stop steam! {error}
device relinquish control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to relinquish steam! SimulatedCaptureErrorDomain code 10: back-wide is running; stop it before releasing control.
)",
     "returned a result"},
    {"TheGivingBack",
     {"CaptureDevice.relinquishControlOfStreams"},
     R"(device relinquish control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to relinquish steam! {error}
)",
     "returned a result"},
};

INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingStream, testing::ValuesIn(kStreamingRows), nameOf);

TEST(CameraSyncExperiment, FailsAtTheFirstCameraThatTheStatusLeavesOut) {
  const struct {
    const char* camera;
    const char* line;  // of the healthy run, where it goes wrong
    std::string told;
  } rows[] = {
      {"back-wide", "back-wide get ErrorCounters", "log error: No status available for port BackFacingCamera\n"},
      {"back-tele", "back-tele get ErrorCounters",
       "log error: No status available for port BackFacingTelephotoCamera\n"},
      {"back-super-wide", "back-super-wide get ErrorCounters",
       "log error: No status available for port BackFacingSuperWideCamera\n"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.camera);
    Scenario scenario = cameraSyncScenario();
    cameraOf(scenario, row.camera).inSessionStatus = false;
    const std::string& port = cameraOf(scenario, row.camera).port;
    expectTold(healthyUpTo(kHealthyBackRun, row.line,
                           row.told + R"(back-super-wide stop
back-tele stop
back-wide stop
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 215: Status for port )" +
                               port + " not available!\n"),
               Side::kBack, scenario);
  }
}

TEST(CameraSyncExperiment, FailsWithoutAnErrorWhenACameraRecordedNoFrame) {
  Scenario scenario = cameraSyncScenario();
  cameraOf(scenario, "back-tele").deliversFrames = false;
  expectTold(healthyUpTo(kHealthyBackRun, "log default: BackFacingTelephotoCamera",
                         R"(log error: BackFacingTelephotoCamera did not record any frames!
log default: BackFacingTelephotoCamera
  Offset: 0
  Frames: 0
  Total: 0
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
returned nothing
error emptied
)"),
             Side::kBack, scenario);
}

TEST(CameraSyncExperiment, MeasuresDroppedFramesAsTheyCome) {
  Scenario scenario = cameraSyncScenario();
  cameraOf(scenario, "front-infrared").droppedFrames = {0, 5, 6};
  expectTold(healthyUpTo(kHealthyFrontRun, "log default: FrontFacingInfraredCamera",
                         R"(log default: FrontFacingInfraredCamera
  Offset: 3
  Frames: 54
  Total: 57
  ErrorCounters: {I2CErrorCount = 55}

front-infrared stop
front stop
device relinquish control (front, front-infrared)
returned a result
error untouched
Front.FrameOffset = 0 frames
Front.Frames = 60 frames
FrontInfrared.FrameOffset = 3 frames
FrontInfrared.Frames = 54 frames
ErrorCounters = {Front = {I2CErrorCount = 44}; FrontInfrared = {I2CErrorCount = 55}}
)"),
             Side::kFront, scenario);
}

// A rejection by the phone is reported like an injected fault.
TEST(CameraSyncExperiment, TellsThePhonesOwnRefusals) {
  Scenario scenario = cameraSyncScenario();
  cameraOf(scenario, "back-tele").formats.resize(14);
  expectTold(healthyUpTo(kHealthyBackRun, "back-tele set FormatIndex = 14", R"(back-tele set FormatIndex = 14 -> failed
log error: Failed to set the format index to 14 on BackFacingTelephotoCamera! SimulatedCaptureErrorDomain code 6: back-tele: FormatIndex must be an integer from 0 to 13, not the number 14.
device relinquish control (back-wide, back-tele, back-super-wide)
returned nothing
error QZCapturePlugInErrorDomain code 209: Failed to set format index to 14, caused by SimulatedCaptureErrorDomain code 6: back-tele: FormatIndex must be an integer from 0 to 13, not the number 14.
)"),
             Side::kBack, scenario);
}

}  // namespace
}  // namespace quazor
