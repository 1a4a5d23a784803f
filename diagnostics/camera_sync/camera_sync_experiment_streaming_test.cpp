// Whole runs on a simulated phone that fail, or stumble, once the cameras have been synchronised.
#include "diagnostics/camera_sync/camera_sync_experiment.h"

#include "contract/message_format.h"
#include "tests/support/call_failures.h"
#include "tests/sweeps/camera_sync_bench.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <iterator>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

struct BackCamera {
  const char* name;  // that the rows of a failure are called by
  const char* id;
  const char* port;
  int format;
};
constexpr BackCamera kBackCameras[] = {{"TheFirst", "back-wide", "BackFacingCamera", 16},
                                       {"TheMiddle", "back-tele", "BackFacingTelephotoCamera", 14},
                                       {"TheLast", "back-super-wide", "BackFacingSuperWideCamera", 9}};

constexpr const char* kStopped = "back-super-wide stop\nback-tele stop\nback-wide stop\n";
constexpr const char* kGivenBack = "device relinquish control (back-wide, back-tele, back-super-wide)\n";

// A refused format index: code 209; a refused frame rate: no error at all.
class FailingConfiguration : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingConfiguration, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, cameraSyncScenario(), kHealthyBackRun);
  expectToldWithFault(GetParam(), Side::kBack, withoutMasterConfiguration(cameraSyncScenario()),
                      kHealthyBackRunWithoutMasterConfiguration);
}

std::vector<FaultRow> configurationRows() {
  std::vector<FaultRow> rows;
  for (const BackCamera& camera : kBackCameras) {
    const std::string format = std::to_string(camera.format);
    const struct {
      const char* name;
      const char* key;
      const char* words;
      std::string value;
      std::string error;
    } settings[] = {
        {"Format", "FormatIndex", "format index", format,
         "error QZCapturePlugInErrorDomain code 209: Failed to set format index to " + format + "{cause}\n"},
        {"Minimum", "MinimumFrameRate", "min frame rate", "30", "error emptied\n"},
        {"Maximum", "MaximumFrameRate", "max frame rate", "30", "error emptied\n"},
    };
    for (const auto& setting : settings) {
      rows.push_back({std::string(camera.name) + setting.name,
                      {kSetStream, camera.id, setting.key},
                      formatMessage("%@ set %@ = %@ -> failed\nlog error: Failed to set the %@ to %@ on %@! {error}\n",
                                    camera.id, setting.key, setting.value, setting.words, setting.value, camera.port) +
                          kGivenBack + "returned nothing\n" + setting.error});
    }
  }
  return rows;
}

INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingConfiguration, testing::ValuesIn(configurationRows()), nameOf);

class FailingStream : public testing::TestWithParam<FaultRow> {};

TEST_P(FailingStream, IsToldExactly) {
  expectToldWithFault(GetParam(), Side::kBack, cameraSyncScenario(), kHealthyBackRun);
}

// All streams are stopped, those that never started too; the phone refuses to stop these.
std::vector<FaultRow> startRows() {
  std::vector<FaultRow> rows;
  for (std::size_t failing = 0; failing < std::size(kBackCameras); ++failing) {
    const BackCamera& camera = kBackCameras[failing];
    const std::string message = formatMessage("Failed to start steam at %@ port! {error}", camera.port);
    std::string stops;
    for (std::size_t i = std::size(kBackCameras); i-- > 0;) {
      stops += std::string(kBackCameras[i].id) + (i >= failing ? " stop -> failed\n" : " stop\n");
    }
    rows.push_back({std::string(camera.name) + "Start",
                    {"CaptureStream.start", camera.id},
                    formatMessage("%@ start -> failed\nlog error: %@\n", camera.id, message) + stops + kGivenBack +
                        "returned nothing\nerror QZCapturePlugInErrorDomain code 204: " + message + "{cause}\n"});
  }
  return rows;
}

std::vector<FaultRow> errorCountersRows() {
  std::vector<FaultRow> rows;
  for (const BackCamera& camera : kBackCameras) {
    rows.push_back(
        {std::string(camera.name) + "ErrorCounters",
         {kReadStream, camera.id, "ErrorCounters"},
         formatMessage("%@ get ErrorCounters -> failed\n"
                       "log error: Failed to get error counters of steam at %@ port! {error}\n",
                       camera.id, camera.port) +
             kStopped + kGivenBack + "returned nothing\n" +
             formatMessage("error QZCapturePlugInErrorDomain code 210: No error counters for port %@!{cause}\n",
                           camera.port)});
  }
  return rows;
}

// A stream that did not stop cannot be given back; there is a result all the same.
FaultRow stopRow(const char* name, const char* camera, const char* laterStops) {
  return {name,
          {"CaptureStream.stop", camera},
          formatMessage("%@ stop -> failed\nlog error: Failed to stop steam! {error}\n%@"
                        "device relinquish control (back-wide, back-tele, back-super-wide) -> failed\n"
                        "log error: Failed to relinquish steam! SimulatedCaptureErrorDomain code 10: %@ is running; "
                        "stop it before giving it back.\n",
                        camera, laterStops, camera),
          "returned a result"};
}

const FaultRow kStreamingRows[] = {
    {"TheSessionStatus",
     {"CaptureDevice.valueForProperty", std::nullopt, "MulticamSessionStatus"},
     std::string("device get MulticamSessionStatus -> failed\n") + kStopped + kGivenBack +
         R"(log error: Failed to copy session status! {error}
returned nothing
error QZCapturePlugInErrorDomain code 215: Failed to copy sesison status!{cause}
)"},
    stopRow("TheFirstStop", "back-super-wide", "back-tele stop\nback-wide stop\n"),
    stopRow("TheMiddleStop", "back-tele", "back-wide stop\n"),
    stopRow("TheLastStop", "back-wide", ""),
    {"TheGivingBack",
     {"CaptureDevice.relinquishControlOfStreams"},
     R"(device relinquish control (back-wide, back-tele, back-super-wide) -> failed
log error: Failed to relinquish steam! {error}
)",
     "returned a result"},
};

INSTANTIATE_TEST_SUITE_P(Starts, FailingStream, testing::ValuesIn(startRows()), nameOf);
INSTANTIATE_TEST_SUITE_P(ErrorCounters, FailingStream, testing::ValuesIn(errorCountersRows()), nameOf);
INSTANTIATE_TEST_SUITE_P(CameraSyncExperiment, FailingStream, testing::ValuesIn(kStreamingRows), nameOf);

TEST(CameraSyncExperiment, FailsAtTheFirstCameraThatTheStatusLeavesOut) {
  for (const BackCamera& camera : kBackCameras) {
    SCOPED_TRACE(camera.id);
    Scenario scenario = cameraSyncScenario();
    cameraOf(scenario, camera.id).inSessionStatus = false;
    expectTold(
        healthyUpTo(kHealthyBackRun, camera.id + std::string(" get ErrorCounters"),
                    formatMessage("log error: No status available for port %@\n", camera.port) + kStopped + kGivenBack +
                        formatMessage("returned nothing\n"
                                      "error QZCapturePlugInErrorDomain code 215: Status for port %@ not available!\n",
                                      camera.port)),
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

)" + std::string(kStopped) + kGivenBack +
                             "returned nothing\nerror emptied\n"),
             Side::kBack, scenario);
}

TEST(CameraSyncExperiment, MeasuresDroppedFramesAsTheyCome) {
  Scenario scenario = cameraSyncScenario();
  cameraOf(scenario, "front-infrared").droppedFrames = {0, 5, 6};
  std::string told = kHealthyFrontRun;
  replaceAll(told, "  Frames: 57\n  Total: 60\n", "  Frames: 54\n  Total: 57\n");
  replaceAll(told, "FrontInfrared.Frames = 57 frames", "FrontInfrared.Frames = 54 frames");
  EXPECT_NE(told, kHealthyFrontRun);
  expectTold(told, Side::kFront, scenario);
}

// What the phone itself refuses is told as what a fault refuses.
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
