// Complete runs, call by call: the healthy one, and one for every step that can fail.
#include "contract/message_format.h"
#include "diagnostics/sensor_images/nimbe_image_experiment.h"
#include "tests/support/call_failures.h"
#include "tests/support/fake_sensor.h"
#include "tests/support/run_transcript.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <optional>
#include <ostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using std::chrono::milliseconds;

// How the image of imageReport(frameID) reads in the result.
std::string imageText(std::uint32_t frameID) {
  Array inPhase;
  Array quadrature;
  for (int i = 0; i < 48; ++i) {
    inPhase.emplace_back(i - 24);
    quadrature.emplace_back(1000 * i);
  }
  const std::string id = std::to_string(frameID);
  const std::string timestamp = std::to_string(33 * frameID);
  return "{frameID = " + id + "; dScanI = " + defaultText(inPhase) + "; dScanQ = " + defaultText(quadrature) +
         "; tmonDataInC = 36.6; timestampInMilliseconds = " + timestamp + "}";
}

using Change = std::function<void(FakeSensor& sensor)>;

// A run with two images within three seconds: everything that it does and returns is `trace`, in which "@1" stands for
// the first image and so on.
struct Run {
  const char* name;
  std::string trace;
  Change change;
  bool hasStream = true;
};
void PrintTo(const Run& run, std::ostream* out) { *out << run.name; }

class NimbeImageRun : public testing::TestWithParam<Run> {
 protected:
  static std::string run(bool hasOwnError, ErrorPlace place) {
    RunTranscript transcript;
    FakeSensor sensor([&](std::string_view operation, std::string_view object, std::string_view detail,
                          bool succeeded) { transcript.addCall(operation, object, detail, succeeded); });
    if (hasOwnError) sensor.device->ownError = makeError("BenchErrorDomain", 7, "Broken.");
    GetParam().change(sensor);
    const auto experiment = GetParam().hasStream ? std::make_shared<QZNimbeImageExperiment>(sensor.platform())
                                                 : std::make_shared<QZNimbeImageExperiment>(
                                                       sensor.platform(), [](const Platform&) { return nullptr; });
    EXPECT_TRUE(experiment->setupWithParameters({{"images", 2}, {"timeout", 3}}, nullptr, nullptr));
    const std::string told = runAndTell(*experiment, place, transcript);
    EXPECT_EQ(sensor.loop.observers(), 0U);
    EXPECT_TRUE(sensor.loop.lastObserver().expired());
    return told;
  }
};

// With an error of the device's own and without, with a place for an error and without.
TEST_P(NimbeImageRun, IsToldExactly) {
  for (const bool hasOwnError : {true, false}) {
    std::string expected = GetParam().trace;
    replaceAll(expected, "{cause}", benchCause(hasOwnError));
    for (std::uint32_t i = 1; i <= 3; ++i) replaceAll(expected, "@" + std::to_string(i), imageText(i));
    EXPECT_EQ(run(hasOwnError, ErrorPlace::kGiven), expected);
    EXPECT_EQ(run(hasOwnError, ErrorPlace::kNone), toldWithoutPlace(expected));
  }
}

// What the sensor sends, and when: the report of an image unless another one is given.
struct Sent {
  int milliseconds;
  std::uint32_t frameID;
  std::uint8_t reportID = 0x76;
  std::optional<Bytes> report = {};
};
Change sends(std::vector<Sent> reports, std::optional<int> failure = std::nullopt) {
  return [reports = std::move(reports), failure](FakeSensor& sensor) {
    for (const Sent& sent : reports) {
      sensor.loop.at(milliseconds(sent.milliseconds), [&sensor, sent] {
        sensor.device->send(sent.reportID, sent.report ? *sent.report : imageReport(sent.frameID));
      });
    }
    if (!failure) return;
    sensor.loop.at(milliseconds(*failure),
                   [&sensor] { sensor.device->sendError(makeError("HidErrorDomain", -536, "The device is gone.")); });
  };
}

Change unscheduledAt(int time) {
  return [time](FakeSensor& sensor) {
    sensor.loop.at(milliseconds(time),
                   [&sensor] { sensor.device->unscheduleFromRunLoop(sensor.loop, kRunLoopDefaultMode); });
  };
}

const std::string kMatching = R"(hid createManager
manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})
)";
const std::string kFound = kMatching + "manager devices 1\n";
const std::string kOpened = kFound + R"(sensor open
sensor setInputReportCallback
sensor setFeatureReport 171 = ab01
sensor setFeatureReport 172 = ac01
sensor schedule default
loop makeObserver of 268435455, repeating, order 0
loop addObserver common
loop runInMode default 3000000000 ns
)";
const std::string kClosed = R"(sensor removeInputReportCallback
sensor unschedule default
sensor close 0
)";

std::string ended(const char* how) { return std::string("loop run ") + how + "\nloop removeObserver common\n"; }
std::string images(const std::string& list) { return "returned a result\nerror untouched\nimages = (" + list + ")\n"; }
std::string failure(const std::string& error) {
  return "returned nothing\nerror QZNimbeImageExperimentErrorDomain code " + error + '\n';
}
const std::string kGone = "returned nothing\nerror HidErrorDomain code -536: The device is gone.\n";
const std::string kTimedOut = failure("6: Timed out after 3 seconds.");

const Run kRuns[] = {
    {"ReturnsTheImagesInTheOrderOfTheirArrival",
     kOpened + "loop stop\n" + kClosed + ended("stopped") + images("@2, @1"), sends({{33, 2}, {66, 1}, {99, 3}})},
    {"ReturnsOneImageMoreThanAskedForWhenItCameWithTheLast",
     kOpened + "loop stop\nloop stop\n" + kClosed + ended("stopped") + images("@1, @2, @3"),
     sends({{33, 1}, {66, 2}, {66, 3}})},
    {"PassesOverReportsThatAreNoImages", kOpened + "loop stop\n" + kClosed + ended("stopped") + images("@1, @2"),
     sends({{1, 3, 0x75}, {2, 3, 0x76, Bytes(791)}, {3, 1}, {4, 3, 0x77}, {5, 2}})},
    {"FailsWithoutAStream", failure("3: Failed to create nimbe stream."), [](FakeSensor&) {}, false},
    {"FailsWithoutADevice", kMatching + "manager devices 0\n" + failure("3: Nimbe device match was ambiguous!"),
     [](FakeSensor& sensor) { sensor.matchingDevices.clear(); }},
    {"FailsWithTwoDevices", kMatching + "manager devices 2\n" + failure("3: Nimbe device match was ambiguous!"),
     [](FakeSensor& sensor) { sensor.matchingDevices.push_back(sensor.device); }},
    {"FailsWhenTheDeviceDoesNotOpen",
     kFound + "sensor open -> failed\n" + failure("3: Could not open Nimbe device.{cause}"),
     [](FakeSensor& sensor) { sensor.device->opens = false; }},
    {"FailsWhenThePowerModeIsRefused",
     kFound + "sensor open\nsensor setInputReportCallback\nsensor setFeatureReport 171 = ab01 -> failed\n" +
         failure("4: Failed to override power mode to active!{cause}"),
     [](FakeSensor& sensor) { sensor.device->refusedReports = {0xAB}; }},
    {"FailsWhenTheStreamingModeIsRefused",
     kFound +
         "sensor open\nsensor setInputReportCallback\nsensor setFeatureReport 171 = ab01\n"
         "sensor setFeatureReport 172 = ac01 -> failed\n" +
         failure("5: Failed to set streaming mode to images only!{cause}"),
     [](FakeSensor& sensor) { sensor.device->refusedReports = {0xAC}; }},
    {"FailsWhenTheTimeIsUpAndDropsItsImages", kOpened + kClosed + ended("timed out") + kTimedOut,
     sends({{33, 1}, {3001, 2}})},
    {"FailsWithTheVeryErrorOfTheDevice", kOpened + kClosed + "loop stop\n" + kClosed + ended("stopped") + kGone,
     sends({{33, 1}}, 50)},
    {"FailsWithTheErrorOfTheDeviceAlsoAfterItsLastImage",
     kOpened + "loop stop\n" + kClosed + "loop stop\n" + kClosed + ended("stopped") + kGone,
     sends({{33, 1}, {66, 2}}, 66)},
    // The time is looked at first.
    {"FailsForTheTimeWhenTheDeviceFailsAtItsEnd",
     kOpened + kClosed + "loop stop\n" + kClosed + ended("timed out") + kTimedOut, sends({}, 3000)},
    {"ReturnsWhatItHasWhenTheDeviceHasLeftTheLoop",
     kOpened + "sensor unschedule default\n" + kClosed + ended("finished") + images("@1"),
     [](FakeSensor& sensor) {
       sends({{33, 1}})(sensor);
       unscheduledAt(40)(sensor);
     }},
    {"ReturnsAnEmptyListWhenNothingWasEverToCome",
     kOpened + "sensor unschedule default\n" + kClosed + ended("finished") + images(""), unscheduledAt(0)},
};

INSTANTIATE_TEST_SUITE_P(Runs, NimbeImageRun, testing::ValuesIn(kRuns),
                         [](const testing::TestParamInfo<Run>& run) { return run.param.name; });

TEST(NimbeImageRunAlone, LetsTheExceptionOfAMissingHidManagerThrough) {
  RunTranscript transcript;
  FakeSensor sensor([&](std::string_view operation, std::string_view object, std::string_view detail, bool succeeded) {
    transcript.addCall(operation, object, detail, succeeded);
  });
  sensor.hasHidManager = false;
  const auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor.platform());
  ASSERT_TRUE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, nullptr));
  const std::size_t before = transcript.text().size();
  DiagnosticErrorPtr error = callersOwnError();
  EXPECT_EQ(thrownText<std::logic_error>([&] { return experiment->run(&error); }), "No HID Manager available?!");
  EXPECT_EQ(transcript.text().substr(before), "hid createManager -> failed\n");
  EXPECT_EQ(error, callersOwnError());
}

}  // namespace
}  // namespace quazor
