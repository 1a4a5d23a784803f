#include "backends/simulated/scenario/scenario_sensors.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace quazor {
namespace {

using ::testing::IsEmpty;
using Json = nlohmann::ordered_json;

HidDeviceConfig readDevice(std::string_view text) {
  const Json document = Json::parse(text);
  return readHidDevice("sensor", JsonCursor(document));
}
DisplayConfig readDisplayText(std::string_view text) {
  const Json document = Json::parse(text);
  return readDisplay(JsonCursor(document));
}

TEST(ScenarioSensorsTest, ADeviceIsRead) {
  const HidDeviceConfig device = readDevice(R"({
    "usagePage": 65280, "usage": 36,
    "featureReports": {"0xAB": {"accepts": [0, 1], "streamsAt": 1}, "0x0C": {}, "0xFF": {"streamsAt": 255}},
    "reports": {"rate": 12.5, "count": 7, "reportID": "0x77", "length": 16384,
                "single": {"0": {"reportID": "0x00", "length": 1}, "12": {},
                           "3": {"error": {"domain": "D", "code": -4, "message": "M"}}}},
    "images": {"firstFrameID": 4294967295, "amplitude": -2147483648, "offsetI": 2147483647, "offsetQ": -1,
               "phaseStep": -360, "phaseStepPerImage": 0.5, "temperature": -3.5}})");
  EXPECT_EQ(device.name, "sensor");
  EXPECT_EQ(device.usagePage, 65280);
  EXPECT_EQ(device.usage, 36);
  ASSERT_THAT(device.featureReports, testing::SizeIs(3));
  EXPECT_EQ(device.featureReports[0].id, 0xAB);
  EXPECT_THAT(device.featureReports[0].accepts, testing::ElementsAre(0, 1));
  EXPECT_EQ(device.featureReports[0].streamsAt, 1);
  EXPECT_EQ(device.featureReports[1].id, 0x0C);
  EXPECT_THAT(device.featureReports[1].accepts, IsEmpty());
  EXPECT_EQ(device.featureReports[1].streamsAt, std::nullopt);
  EXPECT_EQ(device.featureReports[2].streamsAt, 255);
  EXPECT_EQ(device.rate, 12.5);
  EXPECT_EQ(device.reportCount, 7U);
  EXPECT_EQ(device.removedAfter, std::nullopt);
  EXPECT_EQ(device.every.reportID, 0x77);
  EXPECT_EQ(device.every.length, 16384U);
  ASSERT_THAT(device.single, testing::SizeIs(3));
  EXPECT_EQ(device.single.at(0).reportID, 0);
  EXPECT_EQ(device.single.at(0).length, 1U);
  EXPECT_EQ(device.single.at(12).length, std::nullopt);
  EXPECT_EQ(device.single.at(3).error, (FaultError{"D", -4, "M"}));
  EXPECT_EQ(device.images.firstFrameID, 4294967295U);
  EXPECT_EQ(device.images.amplitude, -2147483648);
  EXPECT_EQ(device.images.offsetI, 2147483647);
  EXPECT_EQ(device.images.offsetQ, -1);
  EXPECT_EQ(device.images.phaseStep, -360);
  EXPECT_EQ(device.images.phaseStepPerImage, 0.5);
  EXPECT_EQ(device.images.temperature, -3.5F);
}

TEST(ScenarioSensorsTest, ADeviceIsOrdinaryUnlessItSaysMore) {
  const HidDeviceConfig device = readDevice(R"({"usagePage": 0, "usage": 65535})");
  EXPECT_EQ(device.usage, 65535);
  EXPECT_THAT(device.featureReports, IsEmpty());
  EXPECT_EQ(device.rate, 60);
  EXPECT_EQ(device.reportCount, std::nullopt);
  EXPECT_EQ(device.every.reportID, std::nullopt);
  EXPECT_EQ(device.every.length, std::nullopt);
  EXPECT_THAT(device.single, IsEmpty());
  EXPECT_EQ(device.images.firstFrameID, 1U);
  EXPECT_EQ(device.images.amplitude, 1000);
  EXPECT_EQ(device.images.offsetI, 0);
  EXPECT_EQ(device.images.offsetQ, 0);
  EXPECT_EQ(device.images.phaseStep, 7.5);
  EXPECT_EQ(device.images.phaseStepPerImage, 0);
  EXPECT_EQ(device.images.temperature, 25);
}

TEST(ScenarioSensorsTest, ADeviceMayBeRemoved) {
  EXPECT_EQ(readDevice(R"({"usagePage": 1, "usage": 1, "reports": {"removedAfter": 0}})").removedAfter, 0U);
}

TEST(ScenarioSensorsTest, ADisplayIsRead) {
  const DisplayConfig display = readDisplayText(R"({
    "present": false, "registryService": false,
    "properties": {"A": {"B": {"C": 1}, "D": []}, "E": [1, "x", {"F": true}, [2.5]], "G": 18446744073709551615}})");
  EXPECT_FALSE(display.present);
  EXPECT_FALSE(display.registryService);
  EXPECT_EQ(display.properties,
            (Dictionary{{"A", Dictionary{{"B", Dictionary{{"C", 1}}}, {"D", Array{}}}},
                        {"E", Array{Value(1), Value("x"), Value(Dictionary{{"F", true}}), Value(Array{Value(2.5)})}},
                        {"G", std::uint64_t{18446744073709551615U}}}));
}

TEST(ScenarioSensorsTest, ADisplayIsThereUnlessItSaysOtherwise) {
  const DisplayConfig display = readDisplayText("{}");
  EXPECT_TRUE(display.present);
  EXPECT_TRUE(display.registryService);
  EXPECT_THAT(display.properties, IsEmpty());
}

TEST(ScenarioSensorsTest, DevicesThatCannotBeAreRefused) {
  const auto with = [](std::string_view entry) {
    return R"({"usagePage": 1, "usage": 1, )" + std::string(entry) + "}";
  };
  const NamedRefusal kRows[] = {
      {"no usage page", R"({"usage": 1})", "the document: the key \"usagePage\" is missing."},
      {"a usage too high", R"({"usagePage": 1, "usage": 65536})",
       "usage: must be an integer from 0 to 65535, not 65536."},
      {"an unknown key", with(R"("report": {})"), "the document: unknown key \"report\"; did you mean \"reports\"?"},
      {"an ID in small letters", with(R"("featureReports": {"0xab": {}})"),
       "featureReports.0xab: \"0xab\" is not a report ID; write it with two digits, like \"0x0A\"."},
      {"an ID without its prefix", with(R"("reports": {"reportID": "76"})"),
       "reports.reportID: \"76\" is not a report ID; write it with two digits, like \"0x0A\"."},
      {"an ID that is a number", with(R"("reports": {"reportID": 118})"),
       "reports.reportID: must be a non-empty string, not 118."},
      {"a value above a byte", with(R"("featureReports": {"0xAB": {"streamsAt": 256}})"),
       "featureReports.0xAB.streamsAt: must be an integer from 0 to 255, not 256."},
      {"a value twice", with(R"("featureReports": {"0xAB": {"accepts": [1, 1]}})"),
       "featureReports.0xAB.accepts[1]: the value is listed twice; remove one."},
      {"no value", with(R"("featureReports": {"0xAB": {"accepts": []}})"),
       "featureReports.0xAB.accepts: a feature report must accept at least one value."},
      {"a value that is refused", with(R"("featureReports": {"0xAB": {"accepts": [0], "streamsAt": 1}})"),
       "featureReports.0xAB.streamsAt: must be one of the values that the report accepts."},
      {"a rate too high", with(R"("reports": {"rate": 1001})"),
       "reports.rate: must be a number above 0 and at most 1000.0, not 1001."},
      {"a removal and an end", with(R"("reports": {"count": 3, "removedAfter": 1})"),
       "reports.removedAfter: \"removedAfter\" already ends the reports; remove \"count\"."},
      {"an empty report", with(R"("reports": {"length": 0})"),
       "reports.length: must be an integer from 1 to 16384, not 0."},
      {"a report without a number", with(R"("reports": {"single": {"first": {}}})"),
       "reports.single.first: the key must be the number of a report, from 0 to 1000000000."},
      {"an error for all reports", with(R"("reports": {"error": {"domain": "D", "code": 1, "message": "M"}})"),
       "reports: unknown key \"error\"; expected one of \"rate\", \"count\", \"removedAfter\", \"reportID\", "
       "\"length\", "
       "\"single\"."},
      {"an error with a shape",
       with(R"("reports": {"single": {"1": {"length": 3, "error": {"domain": "D", "code": 1, "message": "M"}}}})"),
       "reports.single.1.error: an error replaces the report, so it cannot have \"reportID\" or \"length\"."},
      {"an error with an ID",
       with(
           R"("reports": {"single": {"1": {"reportID": "0x01", "error": {"domain": "D", "code": 1, "message": "M"}}}})"),
       "reports.single.1.error: an error replaces the report, so it cannot have \"reportID\" or \"length\"."},
      {"an amplitude too large", with(R"("images": {"amplitude": 2147483648})"),
       "images.amplitude: must be a signed 32-bit integer, not 2147483648."},
      {"an angle too large", with(R"("images": {"phaseStep": 360.5})"),
       "images.phaseStep: must be a number from -360.0 to 360.0, not 360.5."},
      {"an angle too small", with(R"("images": {"phaseStepPerImage": -361})"),
       "images.phaseStepPerImage: must be a number from -360.0 to 360.0, not -361."},
      {"a temperature in words", with(R"("images": {"temperature": "hot"})"),
       "images.temperature: must be a number from -1000.0 to 1000.0, not \"hot\"."},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(thrownText<InputError>([&] { readDevice(row.text); }), row.problem) << row.name;
  }
}

TEST(ScenarioSensorsTest, DisplaysThatCannotBeAreRefused) {
  const NamedRefusal kRows[] = {
      {"an unknown key", R"({"powered": true})",
       "the document: unknown key \"powered\"; expected one of \"present\", \"registryService\", \"properties\"."},
      {"a presence that is a number", R"({"present": 1})", "present: must be true or false, not 1."},
      {"properties in a list", R"({"properties": []})", "properties: must be an object, not an array."},
      {"no value", R"({"properties": {"A": [1, null]}})",
       "properties.A[1]: must be a number, a string, true or false, not null."},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(thrownText<InputError>([&] { readDisplayText(row.text); }), row.problem) << row.name;
  }
}

}  // namespace
}  // namespace quazor
