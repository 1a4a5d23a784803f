// Whole runs, call by call: the healthy one, and one for every step that can fail.
#include "contract/message_format.h"
#include "diagnostics/sensor_images/nimbe_image_experiment.h"
#include "tests/support/fake_sensor.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

using std::chrono::milliseconds;

// Stands in a trace for what a refused call gave as its own error, where it gave one.
constexpr std::string_view kCause = "[, caused by BenchErrorDomain code 7: Broken.]";

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

void replaceAll(std::string& text, std::string_view what, std::string_view with) {
  for (std::size_t at = 0; (at = text.find(what, at)) != std::string::npos; at += with.size()) {
    text.replace(at, what.size(), with);
  }
}

// A run with two images within three seconds.
class NimbeImageRun : public testing::Test {
 protected:
  using Change = std::function<void(FakeSensor& sensor)>;

  // Everything that a run does and returns is `trace`, in which "@1" stands for the first image and so on; with an
  // error of the device's own and without, with a place for an error and without.
  static void expectRun(const std::string& trace, const Change& change, bool hasStream = true) {
    for (const bool hasOwnError : {true, false}) {
      for (const ErrorPlace place : {ErrorPlace::kGiven, ErrorPlace::kNone}) {
        std::string expected = trace;
        replaceAll(expected, kCause, hasOwnError ? kCause.substr(1, kCause.size() - 2) : "");
        for (std::uint32_t i = 1; i <= 3; ++i) replaceAll(expected, "@" + std::to_string(i), imageText(i));
        if (place == ErrorPlace::kNone) {
          const std::size_t at = expected.find("\nerror ") + 1;
          expected.replace(at, expected.find('\n', at) - at, "no place for an error");
        }
        EXPECT_EQ(run(change, hasOwnError, place, hasStream), expected);
      }
    }
  }

 private:
  static std::string run(const Change& change, bool hasOwnError, ErrorPlace place, bool hasStream) {
    RunTranscript transcript;
    FakeSensor sensor([&](std::string_view operation, std::string_view object, std::string_view detail,
                          bool succeeded) { transcript.addCall(operation, object, detail, succeeded); });
    if (hasOwnError) sensor.device->ownError = makeError("BenchErrorDomain", 7, "Broken.");
    change(sensor);
    const auto experiment = hasStream ? std::make_shared<QZNimbeImageExperiment>(sensor.platform())
                                      : std::make_shared<QZNimbeImageExperiment>(
                                            sensor.platform(), [](const Platform&) { return nullptr; });
    EXPECT_TRUE(experiment->setupWithParameters({{"images", 2}, {"timeout", 3}}, nullptr, nullptr));
    const std::string told = runAndTell(*experiment, place, transcript);
    EXPECT_EQ(sensor.loop.observers(), 0U);
    EXPECT_TRUE(sensor.loop.lastObserver().expired());
    return told;
  }
};

void sendAt(FakeSensor& sensor, int time, std::uint8_t reportID, const Bytes& report) {
  sensor.loop.at(milliseconds(time), [&sensor, reportID, report] { sensor.device->send(reportID, report); });
}

void failAt(FakeSensor& sensor, int time) {
  sensor.loop.at(milliseconds(time),
                 [&sensor] { sensor.device->sendError(makeError("HidErrorDomain", -536, "The device is gone.")); });
}

const std::string kFound = R"(hid createManager
manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})
manager devices 1
)";
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

TEST_F(NimbeImageRun, ReturnsTheImagesInTheOrderOfTheirArrival) {
  expectRun(kOpened + "loop stop\n" + kClosed + R"(loop run stopped
loop removeObserver common
returned a result
error untouched
images = (@2, @1)
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(2));
              sendAt(sensor, 66, 0x76, imageReport(1));
              sendAt(sensor, 99, 0x76, imageReport(3));
            });
}

TEST_F(NimbeImageRun, ReturnsOneImageMoreThanAskedForWhenItCameWithTheLast) {
  expectRun(kOpened + "loop stop\nloop stop\n" + kClosed + R"(loop run stopped
loop removeObserver common
returned a result
error untouched
images = (@1, @2, @3)
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(1));
              sendAt(sensor, 66, 0x76, imageReport(2));
              sendAt(sensor, 66, 0x76, imageReport(3));
            });
}

TEST_F(NimbeImageRun, PassesOverReportsThatAreNoImages) {
  expectRun(kOpened + "loop stop\n" + kClosed + R"(loop run stopped
loop removeObserver common
returned a result
error untouched
images = (@1, @2)
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 1, 0x75, imageReport(3));
              sendAt(sensor, 2, 0x76, Bytes(791));
              sendAt(sensor, 3, 0x76, imageReport(1));
              sendAt(sensor, 4, 0x77, imageReport(3));
              sendAt(sensor, 5, 0x76, imageReport(2));
            });
}

TEST_F(NimbeImageRun, FailsWithoutAStream) {
  expectRun(R"(returned nothing
error QZNimbeImageExperimentErrorDomain code 3: Failed to create nimbe stream.
)",
            [](FakeSensor&) {}, false);
}

TEST_F(NimbeImageRun, FailsWithoutADevice) {
  expectRun(R"(hid createManager
manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})
manager devices 0
returned nothing
error QZNimbeImageExperimentErrorDomain code 3: Nimbe device match was ambiguous!
)",
            [](FakeSensor& sensor) { sensor.matchingDevices.clear(); });
}

TEST_F(NimbeImageRun, FailsWithTwoDevices) {
  expectRun(R"(hid createManager
manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})
manager devices 2
returned nothing
error QZNimbeImageExperimentErrorDomain code 3: Nimbe device match was ambiguous!
)",
            [](FakeSensor& sensor) { sensor.matchingDevices.push_back(sensor.device); });
}

TEST_F(NimbeImageRun, FailsWhenTheDeviceDoesNotOpen) {
  expectRun(kFound + R"(sensor open -> failed
returned nothing
error QZNimbeImageExperimentErrorDomain code 3: Could not open Nimbe device.)" +
                std::string(kCause) + "\n",
            [](FakeSensor& sensor) { sensor.device->opens = false; });
}

TEST_F(NimbeImageRun, FailsWhenThePowerModeIsRefused) {
  expectRun(kFound + R"(sensor open
sensor setInputReportCallback
sensor setFeatureReport 171 = ab01 -> failed
returned nothing
error QZNimbeImageExperimentErrorDomain code 4: Failed to override power mode to active!)" +
                std::string(kCause) + "\n",
            [](FakeSensor& sensor) { sensor.device->refusedReports = {0xAB}; });
}

TEST_F(NimbeImageRun, FailsWhenTheStreamingModeIsRefused) {
  expectRun(kFound + R"(sensor open
sensor setInputReportCallback
sensor setFeatureReport 171 = ab01
sensor setFeatureReport 172 = ac01 -> failed
returned nothing
error QZNimbeImageExperimentErrorDomain code 5: Failed to set streaming mode to images only!)" +
                std::string(kCause) + "\n",
            [](FakeSensor& sensor) { sensor.device->refusedReports = {0xAC}; });
}

TEST_F(NimbeImageRun, FailsWhenTheTimeIsUpAndDropsItsImages) {
  expectRun(kOpened + kClosed + R"(loop run timed out
loop removeObserver common
returned nothing
error QZNimbeImageExperimentErrorDomain code 6: Timed out after 3 seconds.
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(1));
              sendAt(sensor, 3001, 0x76, imageReport(2));
            });
}

TEST_F(NimbeImageRun, FailsWithTheVeryErrorOfTheDevice) {
  expectRun(kOpened + kClosed + "loop stop\n" + kClosed + R"(loop run stopped
loop removeObserver common
returned nothing
error HidErrorDomain code -536: The device is gone.
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(1));
              failAt(sensor, 50);
            });
}

TEST_F(NimbeImageRun, FailsWithTheErrorOfTheDeviceAlsoAfterItsLastImage) {
  expectRun(kOpened + "loop stop\n" + kClosed + "loop stop\n" + kClosed + R"(loop run stopped
loop removeObserver common
returned nothing
error HidErrorDomain code -536: The device is gone.
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(1));
              sendAt(sensor, 66, 0x76, imageReport(2));
              failAt(sensor, 66);
            });
}

// The time is looked at first.
TEST_F(NimbeImageRun, FailsForTheTimeWhenTheDeviceFailsAtItsEnd) {
  expectRun(kOpened + kClosed + "loop stop\n" + kClosed + R"(loop run timed out
loop removeObserver common
returned nothing
error QZNimbeImageExperimentErrorDomain code 6: Timed out after 3 seconds.
)",
            [](FakeSensor& sensor) { failAt(sensor, 3000); });
}

TEST_F(NimbeImageRun, ReturnsWhatItHasWhenTheDeviceHasLeftTheLoop) {
  expectRun(kOpened + "sensor unschedule default\n" + kClosed + R"(loop run finished
loop removeObserver common
returned a result
error untouched
images = (@1)
)",
            [](FakeSensor& sensor) {
              sendAt(sensor, 33, 0x76, imageReport(1));
              sensor.loop.at(milliseconds(40),
                             [&sensor] { sensor.device->unscheduleFromRunLoop(sensor.loop, kRunLoopDefaultMode); });
            });
}

TEST_F(NimbeImageRun, ReturnsAnEmptyListWhenNothingWasEverToCome) {
  expectRun(kOpened + "sensor unschedule default\n" + kClosed + R"(loop run finished
loop removeObserver common
returned a result
error untouched
images = ()
)",
            [](FakeSensor& sensor) {
              sensor.loop.at(milliseconds(0),
                             [&sensor] { sensor.device->unscheduleFromRunLoop(sensor.loop, kRunLoopDefaultMode); });
            });
}

TEST_F(NimbeImageRun, LetsTheExceptionOfAMissingHidManagerThrough) {
  RunTranscript transcript;
  FakeSensor sensor([&](std::string_view operation, std::string_view object, std::string_view detail, bool succeeded) {
    transcript.addCall(operation, object, detail, succeeded);
  });
  sensor.hasHidManager = false;
  const auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor.platform());
  ASSERT_TRUE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, nullptr));
  const std::size_t before = transcript.text().size();
  DiagnosticErrorPtr error = callersOwnError();
  try {
    static_cast<void>(experiment->run(&error));
    ADD_FAILURE() << "nothing was raised";
  } catch (const std::logic_error& raised) {
    EXPECT_STREQ(raised.what(), "No HID Manager available?!");
  }
  EXPECT_EQ(transcript.text().substr(before), "hid createManager -> failed\n");
  EXPECT_EQ(error, callersOwnError());
}

}  // namespace
}  // namespace quazor
