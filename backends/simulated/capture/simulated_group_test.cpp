#include "backends/simulated/capture/simulated_capture.h"

#include "backends/simulated/phone_for_tests.h"
#include "tests/support/scripted_capture.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

using Code = CaptureErrorCode;

Dictionary masterConfiguration(std::string_view port, Value slave) {
  return {{"SlaveConfigurationByPortType", Dictionary{{std::string(port), std::move(slave)}}}};
}

class SimulatedGroupTest : public ::testing::Test {
 protected:
  std::string set(std::string_view key, const Value& value) {
    return outcome([&](DiagnosticErrorPtr* error) { return user_.back().setValue(value, key, error); });
  }
  std::optional<Value> read(std::string_view key) { return user_.back().valueForProperty(key, nullptr); }

  SimulatedPhone phone_{smallScenario(), PhoneTime::kVirtual, 1};
  PhoneUser user_{phone_};
};

TEST_F(SimulatedGroupTest, DescribesItself) { EXPECT_EQ(user_.back().description(), "group back"); }

TEST_F(SimulatedGroupTest, ValuesThatDoNotFitAreRefusedAndChangeNothing) {
  ASSERT_TRUE(user_.control(user_.streams));
  ASSERT_TRUE(user_.back().setValue(Array{user_.streams[0]}, capture_key::ActiveStreams, nullptr));
  const std::string tele = "BackFacingTelephotoCamera";
  const PhoneUser other(phone_);
  const struct {
    const char* name;
    const char* key;
    Value value;
    Code code;
    const char* message;
  } kRows[] = {
      {"no array", "ActiveStreams", 1, Code::kWrongType,
       "back: ActiveStreams must be an array of streams, not the number 1."},
      {"no stream", "ActiveStreams", Array{"wide"}, Code::kWrongType,
       "back: ActiveStreams must contain streams, not the string wide."},
      {"a stream of nobody", "ActiveStreams", Array{std::make_shared<ScriptedStream>("foreign stream")},
       Code::kWrongType, "back: ActiveStreams must contain streams, not foreign stream."},
      {"a stream of another group", "ActiveStreams", Array{user_.streams[2]}, Code::kForeignObject,
       "back: ActiveStreams must contain streams of the group, not stream front (FrontFacingCamera)."},
      {"a stream of another user", "ActiveStreams", Array{other.streams[0]}, Code::kForeignObject,
       "back: ActiveStreams must contain streams of the group, not stream wide (BackFacingCamera)."},
      {"a stream twice", "ActiveStreams", Array{user_.streams[0], user_.streams[0]}, Code::kOutOfRange,
       "back: ActiveStreams must contain a stream once, not stream wide (BackFacingCamera) twice."},
      {"the master", "SynchronizationMaster", user_.streams[1], Code::kReadOnlyProperty,
       "back: SynchronizationMaster can only be read."},
      {"the supported keys", "MasterConfigurationSupportedKeys", Array{}, Code::kReadOnlyProperty,
       "back: MasterConfigurationSupportedKeys can only be read."},
      {"an unknown property", "Colour", 1, Code::kUnknownProperty,
       "back has no property Colour; it has ActiveStreams, SynchronizationMaster, MasterConfigurationSupportedKeys, "
       "MasterConfiguration."},
      {"a configuration that is no dictionary", "MasterConfiguration", 1, Code::kWrongType,
       "back: MasterConfiguration must be a dictionary, not the number 1."},
      {"a configuration of another kind", "MasterConfiguration", Dictionary{{"Speed", 1}}, Code::kOutOfRange,
       "back: MasterConfiguration must have exactly one entry, SlaveConfigurationByPortType."},
      {"slaves that are no dictionary", "MasterConfiguration", Dictionary{{"SlaveConfigurationByPortType", 1}},
       Code::kWrongType, "back: SlaveConfigurationByPortType must be a dictionary, not the number 1."},
      {"the port of another group", "MasterConfiguration",
       masterConfiguration("FrontFacingCamera", slaveConfiguration()), Code::kOutOfRange,
       "back: SlaveConfigurationByPortType must name ports of the group's slaves, not FrontFacingCamera."},
      {"the port of the master", "MasterConfiguration", masterConfiguration("BackFacingCamera", slaveConfiguration()),
       Code::kOutOfRange,
       "back: SlaveConfigurationByPortType must name ports of the group's slaves, not BackFacingCamera."},
      {"a slave without its entries", "MasterConfiguration", masterConfiguration(tele, Dictionary{}), Code::kOutOfRange,
       "back for BackFacingTelephotoCamera: a slave configuration must have StreamingOutputsEnabled."},
  };
  const Value activeBefore = *read("ActiveStreams");
  for (const auto& row : kRows) {
    EXPECT_EQ(set(row.key, row.value), refusal(row.code, row.message)) << row.name;
  }
  EXPECT_EQ(read("ActiveStreams"), activeBefore);
  EXPECT_EQ(read("MasterConfiguration"), Value(Dictionary{}));
}

TEST_F(SimulatedGroupTest, AnUnknownPropertyIsNotRead) {
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return user_.back().valueForProperty("Colour", error); }),
            refusal(Code::kUnknownProperty,
                    "back has no property Colour; it has ActiveStreams, SynchronizationMaster, "
                    "MasterConfigurationSupportedKeys, MasterConfiguration."));
}

TEST_F(SimulatedGroupTest, OnlyStreamsUnderControlBecomeActive) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  EXPECT_EQ(set("ActiveStreams", Array{user_.streams[0], user_.streams[1]}),
            refusal(Code::kNotControlled, "tele is not under control; request control of it first."));
  EXPECT_EQ(read("ActiveStreams"), Value(Array{}));
}

TEST_F(SimulatedGroupTest, TheMasterConfigurationNeedsActiveStreamsUnderControl) {
  const Value configuration(masterConfiguration("BackFacingTelephotoCamera", slaveConfiguration()));
  EXPECT_EQ(set("MasterConfiguration", configuration),
            refusal(Code::kWrongState, "back has no active streams; set ActiveStreams first."));
  ASSERT_TRUE(user_.control(user_.backStreams()));
  ASSERT_EQ(set("ActiveStreams", Array{user_.streams[0], user_.streams[1]}), "done");
  ASSERT_TRUE(user_.device->relinquishControlOfStreams({user_.streams[1]}, nullptr));
  EXPECT_EQ(set("MasterConfiguration", configuration),
            refusal(Code::kNotControlled, "tele is not under control; request control of it first."));
}

TEST_F(SimulatedGroupTest, ARunningStreamHoldsOffSettings) {
  ASSERT_TRUE(user_.configureSession() && user_.tele().start(nullptr));
  EXPECT_EQ(set("ActiveStreams", Array{}),
            refusal(Code::kWrongState, "back: ActiveStreams cannot be set while tele is running."));
  EXPECT_EQ(set("MasterConfiguration", Dictionary{}),
            refusal(Code::kWrongState, "back: MasterConfiguration cannot be set while tele is running."));
}

TEST(SimulatedGroupConfig, AGroupWithoutTheMasterConfigurationSaysSoAndRefusesIt) {
  Scenario scenario = smallScenario();
  scenario.groups[0].masterConfiguration = false;
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  ASSERT_TRUE(user.configureSession());
  EXPECT_EQ(user.back().valueForProperty(capture_key::MasterConfigurationSupportedKeys, nullptr), Value(Array{}));
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return user.back().setValue(Dictionary{}, capture_key::MasterConfiguration, error);
            }),
            refusal(Code::kUnsupported, "back does not support SlaveConfigurationByPortType in MasterConfiguration."));
}

}  // namespace
}  // namespace quazor
