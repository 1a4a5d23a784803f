#include "backends/simulated/capture/simulated_capture.h"

#include "backends/simulated/phone_for_tests.h"

#include <gtest/gtest.h>

#include <functional>
#include <limits>
#include <string>

namespace quazor {
namespace {

using Code = CaptureErrorCode;

Dictionary without(Dictionary entries, std::string_view key) {
  entries.erase(key);
  return entries;
}

Dictionary with(Dictionary entries, std::string_view key, Value value) {
  entries.set(key, std::move(value));
  return entries;
}

class SimulatedStreamTest : public ::testing::Test {
 protected:
  std::string set(std::string_view key, const Value& value) {
    return outcome([&](DiagnosticErrorPtr* error) { return user_.wide().setValue(value, key, error); });
  }
  std::string read(std::string_view key) { return defaultText(user_.wide().valueForProperty(key, nullptr)); }
  std::string start() {
    return outcome([&](DiagnosticErrorPtr* error) { return user_.wide().start(error); });
  }
  std::string stop() {
    return outcome([&](DiagnosticErrorPtr* error) { return user_.wide().stop(error); });
  }

  SimulatedPhone phone_{smallScenario(), PhoneTime::kVirtual, 1};
  PhoneUser user_{phone_};
};

TEST_F(SimulatedStreamTest, DescribesItself) {
  EXPECT_EQ(user_.wide().description(), "stream wide (BackFacingCamera)");
}

TEST_F(SimulatedStreamTest, PropertiesReadTheirDefaultsWithoutControl) {
  const struct {
    const char* key;
    const char* text;
  } kRows[] = {
      {"PortType", "BackFacingCamera"},
      {"CameraName", "wide"},
      {"FormatIndex", "0"},
      {"MinimumFrameRate", "30"},
      {"MaximumFrameRate", "30"},
      {"MultipleOutputSupportEnabled", "0"},
      {"SynchronizedStreamsSlaveConfiguration", "{}"},
      {"ErrorCounters",
       "{I2CErrorCount = 0; MIPIErrorCount = 0; LPDPErrorCount = 0; UARTErrorCount = 0; SIFErrorCount = 0; "
       "ProjectorErrorCount = 0}"},
  };
  for (const auto& row : kRows) EXPECT_EQ(read(row.key), row.text) << row.key;
}

TEST_F(SimulatedStreamTest, ValuesThatDoNotFitAreRefusedAndChangeNothing) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  constexpr const char* kIndex = "wide: FormatIndex must be an integer from 0 to 1, not ";
  constexpr const char* kRate = "wide: MaximumFrameRate must be a number above 0 and at most 30, not ";
  const struct {
    const char* key;
    Value value;
    Code code;
    std::string message;
  } kRows[] = {
      {"FormatIndex", 2, Code::kOutOfRange, std::string(kIndex) + "the number 2."},
      {"FormatIndex", -1, Code::kOutOfRange, std::string(kIndex) + "the number -1."},
      {"FormatIndex", std::numeric_limits<std::uint64_t>::max(), Code::kOutOfRange,
       std::string(kIndex) + "the number 18446744073709551615."},
      {"FormatIndex", 1.0, Code::kWrongType, std::string(kIndex) + "the number 1."},
      {"FormatIndex", true, Code::kWrongType, std::string(kIndex) + "the boolean 1."},
      {"FormatIndex", "1", Code::kWrongType, std::string(kIndex) + "the string 1."},
      {"MaximumFrameRate", 0, Code::kOutOfRange, std::string(kRate) + "the number 0."},
      {"MaximumFrameRate", -30, Code::kOutOfRange, std::string(kRate) + "the number -30."},
      {"MaximumFrameRate", 30.5, Code::kOutOfRange, std::string(kRate) + "the number 30.5."},
      {"MaximumFrameRate", std::numeric_limits<double>::quiet_NaN(), Code::kOutOfRange,
       std::string(kRate) + "the number nan."},
      {"MaximumFrameRate", true, Code::kWrongType, std::string(kRate) + "the boolean 1."},
      {"MaximumFrameRate", Array{}, Code::kWrongType, std::string(kRate) + "an array."},
      {"MinimumFrameRate", 31, Code::kOutOfRange,
       "wide: MinimumFrameRate must be a number above 0 and at most 30, not the number 31."},
      {"MultipleOutputSupportEnabled", 1, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not the number 1."},
      {"MultipleOutputSupportEnabled", Bytes{}, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not bytes."},
      {"MultipleOutputSupportEnabled", Date{}, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not a date."},
      {"MultipleOutputSupportEnabled", DiagnosticErrorPtr{}, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not an error."},
      {"MultipleOutputSupportEnabled", std::shared_ptr<Object>{}, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not no object."},
      {"MultipleOutputSupportEnabled", user_.streams[1], Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not stream tele (BackFacingTelephotoCamera)."},
      {"MultipleOutputSupportEnabled", Dictionary{}, Code::kWrongType,
       "wide: MultipleOutputSupportEnabled must be a boolean, not a dictionary."},
      {"PortType", "FrontFacingCamera", Code::kReadOnlyProperty, "wide: PortType can only be read."},
      {"ErrorCounters", Dictionary{}, Code::kReadOnlyProperty, "wide: ErrorCounters can only be read."},
  };
  for (const auto& row : kRows) {
    const std::string before = read(row.key);
    EXPECT_EQ(set(row.key, row.value), refusal(row.code, row.message)) << row.key;
    EXPECT_EQ(read(row.key), before) << row.key;
  }
}

TEST_F(SimulatedStreamTest, SlaveConfigurationsNeedTheirFourEntries) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  const struct {
    const char* name;
    Value value;
    Code code;
    const char* message;
  } kRows[] = {
      {"no dictionary", 1, Code::kWrongType, "wide: a slave configuration must be a dictionary, not the number 1."},
      {"an entry missing", without(slaveConfiguration(), "TimeMachineEnabled"), Code::kOutOfRange,
       "wide: a slave configuration must have TimeMachineEnabled."},
      {"an entry that is no boolean", with(slaveConfiguration(), "FrameSkippingEnabled", 0), Code::kWrongType,
       "wide: FrameSkippingEnabled must be a boolean, not the number 0."},
      {"the ratio missing", without(slaveConfiguration(), "MasterToSlaveFrameRateRatio"), Code::kOutOfRange,
       "wide: a slave configuration must have MasterToSlaveFrameRateRatio, an integer above 0."},
      {"a ratio of zero", with(slaveConfiguration(), "MasterToSlaveFrameRateRatio", 0), Code::kOutOfRange,
       "wide: a slave configuration must have MasterToSlaveFrameRateRatio, an integer above 0."},
      {"a negative ratio", with(slaveConfiguration(), "MasterToSlaveFrameRateRatio", -1), Code::kOutOfRange,
       "wide: a slave configuration must have MasterToSlaveFrameRateRatio, an integer above 0."},
      {"a ratio that is no integer", with(slaveConfiguration(), "MasterToSlaveFrameRateRatio", 1.0), Code::kWrongType,
       "wide: a slave configuration must have MasterToSlaveFrameRateRatio, an integer above 0."},
      {"an entry more", with(slaveConfiguration(), "Speed", 1), Code::kOutOfRange,
       "wide: a slave configuration has no entry Speed."},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(set("SynchronizedStreamsSlaveConfiguration", row.value), refusal(row.code, row.message)) << row.name;
  }
}

TEST_F(SimulatedStreamTest, AnUnknownPropertyIsNeitherReadNorSet) {
  const std::string expected =
      refusal(Code::kUnknownProperty,
              "wide has no property Colour; it has PortType, CameraName, FormatIndex, MinimumFrameRate, "
              "MaximumFrameRate, MultipleOutputSupportEnabled, SynchronizedStreamsSlaveConfiguration, ErrorCounters, "
              "AEEnabled, "
              "InfraredLightSourceConfiguration, VideoOutputConfigurations, VideoOutputsEnabled, VideoOutputHandlers.");
  EXPECT_EQ(set("Colour", 1), expected);
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return user_.wide().valueForProperty("Colour", error); }),
            expected);
}

TEST_F(SimulatedStreamTest, TheMinimumMayBeSetBeforeTheMaximumAndIsJudgedWhenTheStreamStarts) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  EXPECT_EQ(set("MinimumFrameRate", 25), "done");
  EXPECT_EQ(set("MaximumFrameRate", 20), "done");
  EXPECT_EQ(start(),
            refusal(Code::kWrongState, "wide cannot start: MinimumFrameRate is 25, above the MaximumFrameRate 20."));
  EXPECT_EQ(set("MaximumFrameRate", 25), "done");
  EXPECT_EQ(start(), "done");
}

TEST_F(SimulatedStreamTest, AMinimumThatWasNotSetFollowsTheMaximum) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  EXPECT_EQ(set("MaximumFrameRate", 20), "done");
  EXPECT_EQ(read("MinimumFrameRate"), "20");
  EXPECT_EQ(start(), "done");
}

TEST_F(SimulatedStreamTest, ARateThatTheFormatDoesNotReachIsJudgedWhenTheStreamStarts) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  EXPECT_EQ(set("FormatIndex", 1), "done");
  EXPECT_EQ(set("MaximumFrameRate", 60), "done");
  EXPECT_EQ(set("FormatIndex", 0), "done");
  EXPECT_EQ(start(),
            refusal(Code::kWrongState, "wide cannot start: MaximumFrameRate is 60, and format 0 has at most 30."));
}

TEST(SimulatedStreamConfig, ACameraWithoutMultipleOutputsRefusesToEnableThem) {
  Scenario scenario = smallScenario();
  scenario.cameras[0].multipleOutputs = false;
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  ASSERT_TRUE(user.control({user.streams[0]}));
  const auto set = [&](bool value) {
    return outcome([&](DiagnosticErrorPtr* error) {
      return user.wide().setValue(value, capture_key::MultipleOutputSupportEnabled, error);
    });
  };
  EXPECT_EQ(set(true), refusal(Code::kUnsupported, "wide does not support multiple outputs."));
  EXPECT_EQ(set(false), "done");
}

TEST(SimulatedStreamConfig, CountersThatCannotBeReadAreRefused) {
  Scenario scenario = smallScenario();
  scenario.cameras[0].errorCounters.reset();
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return user.wide().valueForProperty(capture_key::ErrorCounters, error);
            }),
            refusal(Code::kUnreadableProperty, "wide: ErrorCounters cannot be read."));
}

}  // namespace
}  // namespace quazor
