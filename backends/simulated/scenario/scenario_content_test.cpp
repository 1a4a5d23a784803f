#include "backends/simulated/scenario/scenario_content.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// A phone with two sensors, a display and one more entry.
std::string withEntry(std::string_view entry) {
  return R"({"title": "t", "cameras": {}, "groups": {},
             "hidDevices": {"near": {"usagePage": 1, "usage": 2, "featureReports": {"0xAB": {}, "0x01": {}}},
                            "far": {"usagePage": 1, "usage": 2, "featureReports": {"0xAC": {}, "0x01": {}}}},
             "display": {"properties": {"Power": 1, "Name": "main"}})" +
         (entry.empty() ? "" : ", " + std::string(entry)) + "}";
}
std::string withFaultEntries(std::string_view entries) {
  return withEntry(R"("faults": [{"action": "fail", )" + std::string(entries) + "}]");
}
Scenario read(const std::string& text) {
  const Json document = Json::parse(text);
  return scenarioOf(JsonCursor(document));
}
std::string problemOf(const std::string& text) {
  return thrownText<InputError>([&] { read(text); });
}

TEST(ScenarioContentTest, DevicesAndTheDisplayAreRead) {
  const Scenario scenario = read(withEntry(""));
  ASSERT_THAT(scenario.hidDevices, testing::SizeIs(2));
  EXPECT_EQ(scenario.hidDevices[0].name, "near");
  EXPECT_EQ(scenario.hidDevices[1].name, "far");
  EXPECT_EQ(scenario.hidDevices[1].featureReports.at(0).id, 0xAC);
  EXPECT_EQ(scenario.display.properties, (Dictionary{{"Power", 1}, {"Name", "main"}}));
  const Scenario plain = read(R"({"title": "t", "cameras": {}, "groups": {}})");
  EXPECT_THAT(plain.hidDevices, testing::IsEmpty());
  EXPECT_TRUE(plain.display.present);
}

TEST(ScenarioContentTest, DevicesAreNamedAsCamerasAre) {
  EXPECT_EQ(problemOf(R"({"title": "t", "cameras": {}, "groups": {}, "hidDevices": {"a b": {}}})"),
            "hidDevices.a b: an id may only contain letters, digits, \"-\" and \"_\".");
}

TEST(ScenarioContentTest, FaultsMayNameDevicesReportsAndProperties) {
  for (const char* entries : {
           R"("operation": "HidService.createManager")",
           R"("operation": "HidManager.enumerateDevicesMatching")",
           R"("operation": "HidManager.devices")",
           R"("operation": "HidDevice.open", "object": "far")",
           R"("operation": "HidDevice.setInputReportCallback", "object": "near")",
           R"("operation": "HidDevice.setFeatureReportWithID", "object": "near", "property": "0xAB")",
           R"("operation": "HidDevice.setFeatureReportWithID", "property": "0x01")",
           R"("operation": "HidDevice.scheduleWithRunLoop", "object": "near")",
           R"("operation": "HidDevice.unscheduleFromRunLoop", "object": "near")",
           R"("operation": "HidDevice.close", "object": "near")",
           R"("operation": "FramebufferService.mainDisplay")",
           R"("operation": "Display.registryService")",
           R"("operation": "RegistryService.registryProperty", "property": "Power")",
           R"("operation": "RunLoops.currentRunLoop")",
           R"("operation": "*", "object": "far", "property": "0xAC")",
           R"("operation": "*", "property": "Name")",
       }) {
    EXPECT_EQ(problemOf(withFaultEntries(entries)), "nothing") << entries;
  }
}

TEST(ScenarioContentTest, FaultsThatWouldNeverFireAreRefused) {
  const NamedRefusal kRows[] = {
      {"a device that there is not", R"("operation": "HidDevice.open", "object": "nar")",
       "faults[0].object: \"nar\" is not an object of HidDevice.open; did you mean \"near\"?"},
      {"an operation on no device", R"("operation": "HidService.createManager", "object": "near")",
       "faults[0].object: HidService.createManager has no object; remove this key."},
      {"a feature report that there is not", R"("operation": "HidDevice.setFeatureReportWithID", "property": "0xEE")",
       "faults[0].property: \"0xEE\" is not a property of HidDevice.setFeatureReportWithID; expected one of \"0xAB\", "
       "\"0x01\", \"0xAC\"."},
      {"a property that there is not", R"("operation": "RegistryService.registryProperty", "property": "Colour")",
       "faults[0].property: \"Colour\" is not a property of RegistryService.registryProperty; expected one of "
       "\"Power\", "
       "\"Name\"."},
      {"a property where there is none", R"("operation": "HidDevice.open", "property": "0xAB")",
       "faults[0].property: HidDevice.open has no property; remove this key."},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOf(withFaultEntries(row.text)), row.problem) << row.name;
}

}  // namespace
}  // namespace quazor
