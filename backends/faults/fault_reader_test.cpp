#include "backends/faults/fault_reader.h"

#include "base/text/input_error.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;

FaultTargets smallTargets() {
  FaultTargets targets;
  targets.streams = {"wide", "tele"};
  targets.groups = {"back"};
  targets.hidDevices = {"near"};
  targets.registryProperties = {"Power"};
  targets.featureReports = {"0xAB"};
  return targets;
}

// The first fault of `text`, converted back to JSON, or the error message.
std::string read(const std::string& text, const FaultTargets& targets = smallTargets()) {
  const nlohmann::ordered_json document = nlohmann::ordered_json::parse(text);
  try {
    return faultJson(readFaults(JsonCursor(document), targets).at(0)).dump();
  } catch (const InputError& problem) {
    return problem.what();
  }
}

TEST(FaultReader, WhatIsWrittenIsRead) {
  for (const char* text :
       {R"([{"operation":"*","action":"nothing"}])",
        R"([{"operation":"*","object":"back","property":"0xAB","action":"hang"}])",
        R"([{"operation":"CaptureDevice.setValue","property":"MultiCamConfiguration","action":"fail"}])",
        R"([{"operation":"CaptureStream.setValue","object":"tele","property":"FormatIndex","occurrence":2,)"
        R"("action":"fail","error":{"domain":"D","code":-7,"message":"Broken."}}])",
        R"([{"operation":"SynchronizedStreamsGroup.streams","object":"back","action":"delay","seconds":0.5}])",
        R"([{"operation":"HidDevice.setFeatureReportWithID","object":"near","property":"0xAB","action":"nothing"}])",
        R"([{"operation":"RegistryService.registryProperty","property":"Power","action":"nothing"}])"}) {
    EXPECT_EQ('[' + read(text) + ']', text);
  }
}

TEST(FaultReader, TheOrderIsKept) {
  const nlohmann::ordered_json document = nlohmann::ordered_json::parse(
      R"([{"operation":"CaptureStream.stop","action":"fail"},{"operation":"CaptureStream.start","action":"fail"}])");
  std::vector<std::string> operations;
  for (const Fault& fault : readFaults(JsonCursor(document), smallTargets())) operations.push_back(fault.operation);
  EXPECT_THAT(operations, ElementsAre("CaptureStream.stop", "CaptureStream.start"));
}

TEST(FaultReader, NamesThatThePlatformDoesNotHaveAreRefused) {
  EXPECT_EQ(read(R"([{"operation":"CaptureStream.start","object":"back","action":"fail"}])"),
            R"([0].object: "back" is not an object of CaptureStream.start; expected one of "wide", "tele".)");
  EXPECT_EQ(read(R"([{"operation":"HidDevice.open","object":"far","action":"fail"}])"),
            R"([0].object: "far" is not an object of HidDevice.open; expected one of "near".)");
  EXPECT_EQ(
      read(R"([{"operation":"CaptureDevice.setValue","property":"Power","action":"fail"}])"),
      R"([0].property: "Power" is not a property of CaptureDevice.setValue; expected one of "MultiCamConfiguration", )"
      R"("MulticamSessionStatus".)");
}

TEST(FaultReader, AListThatIsNotThereTakesAnyName) {
  FaultTargets targets = smallTargets();
  targets.hidDevices.reset();
  targets.featureReports.reset();
  targets.registryProperties.reset();
  const std::string open =
      R"({"operation":"HidDevice.setFeatureReportWithID","object":"far","property":"0x0C","action":"fail"})";
  EXPECT_EQ(read('[' + open + ']', targets), open);
  const std::string every = R"({"operation":"*","object":"far","property":"Hue","action":"fail"})";
  EXPECT_EQ(read('[' + every + ']', targets), every);
  const std::string published = R"({"operation":"RegistryService.registryProperty","property":"Hue","action":"fail"})";
  EXPECT_EQ(read('[' + published + ']', targets), published);
  EXPECT_EQ(read(R"([{"operation":"HidDevice.setFeatureReportWithID","property":"0xc","action":"fail"}])", targets),
            R"([0].property: "0xc" is not a feature report's ID; write it with two digits, like "0x0A".)");
  EXPECT_EQ(read(R"([{"operation":"CaptureStream.start","object":"far","action":"fail"}])", targets),
            R"([0].object: "far" is not an object of CaptureStream.start; expected one of "wide", "tele".)");
}

TEST(FaultReader, APlatformWithoutObjectsOfAKindTakesNoObject) {
  FaultTargets targets = smallTargets();
  targets.groups.clear();
  EXPECT_EQ(read(R"([{"operation":"SynchronizedStreamsGroup.streams","object":"back","action":"fail"}])", targets),
            "[0].object: SynchronizedStreamsGroup.streams has no object; remove this key.");
}

}  // namespace
}  // namespace quazor
