#include "backends/simulated/capture/simulated_capture.h"

#include "backends/simulated/phone_for_tests.h"
#include "platform/pixel_buffer.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>

namespace quazor {
namespace {

using Code = CaptureErrorCode;

// Only the camera "wide" has a projector here.
class OutputPropertiesTest : public ::testing::Test {
 protected:
  static Scenario scenario() {
    Scenario scenario = smallScenario();
    scenario.cameras[0].projector.emplace();
    return scenario;
  }
  std::string set(std::string_view key, const Value& value) {
    return outcome([&](DiagnosticErrorPtr* error) { return user_.wide().setValue(value, key, error); });
  }
  std::string read(std::string_view key) { return defaultText(user_.wide().valueForProperty(key, nullptr)); }

  SimulatedPhone phone_{scenario(), PhoneTime::kVirtual, 1};
  PhoneUser user_{phone_};
};

const std::shared_ptr<PixelBufferHandler> kFrames =
    std::make_shared<PixelBufferHandler>([](PixelBuffer&, MediaTime) {});
const std::shared_ptr<EventHandler> kEvents =
    std::make_shared<EventHandler>([](std::int32_t, MediaTime, const Value*) {});

Dictionary light(Value mode, Value pattern, Value current) {
  return {{"Mode", mode}, {"StructuredLightPattern", pattern}, {"StructuredLightCurrent", current}};
}

Dictionary primary(Value value) { return {{"PrimaryScaler", value}}; }

TEST_F(OutputPropertiesTest, WrongValuesAreRefusedAndChangeNothing) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  const struct {
    const char* name;
    const char* key;
    Value value;
    std::string refused;
  } kRows[] = {
      {"exposure", "AEEnabled", 1, refusal(Code::kWrongType, "wide: AEEnabled must be a boolean, not the number 1.")},
      {"light", "InfraredLightSourceConfiguration", 3,
       refusal(Code::kWrongType, "wide: InfraredLightSourceConfiguration must be a dictionary, not the number 3.")},
      {"light without its current", "InfraredLightSourceConfiguration",
       Dictionary{{"Mode", 1}, {"StructuredLightPattern", 1}},
       refusal(Code::kOutOfRange, "wide: InfraredLightSourceConfiguration must have StructuredLightCurrent.")},
      {"light with more", "InfraredLightSourceConfiguration", Dictionary{{"Mode", 1}, {"Color", 1}},
       refusal(Code::kOutOfRange,
               "wide: InfraredLightSourceConfiguration has no entry Color; it may have (Mode, "
               "StructuredLightPattern, StructuredLightCurrent).")},
      {"light mode of a wrong type", "InfraredLightSourceConfiguration", light(true, 1, 1),
       refusal(Code::kWrongType, "wide: Mode must be an integer from 0 to 255, not the boolean 1.")},
      {"light current too high", "InfraredLightSourceConfiguration", light(1, 1, 256),
       refusal(Code::kOutOfRange,
               "wide: StructuredLightCurrent must be an integer from 0 to 255, not the number 256.")},
      {"light pattern below 0", "InfraredLightSourceConfiguration", light(1, -1, 1),
       refusal(Code::kOutOfRange, "wide: StructuredLightPattern must be an integer from 0 to 255, not the number -1.")},
      {"configurations", "VideoOutputConfigurations", Array{},
       refusal(Code::kWrongType, "wide: VideoOutputConfigurations must be a dictionary, not an array.")},
      {"configuration of an unknown output", "VideoOutputConfigurations", Dictionary{{"Secondary", Dictionary{}}},
       refusal(Code::kOutOfRange,
               "wide: VideoOutputConfigurations has no entry Secondary; it may have (PrimaryScaler).")},
      {"configuration of a wrong type", "VideoOutputConfigurations", primary(true),
       refusal(Code::kWrongType, "wide: PrimaryScaler must be a dictionary, not the boolean 1.")},
      {"configuration with more", "VideoOutputConfigurations", primary(Dictionary{{"Crop", 1}}),
       refusal(Code::kOutOfRange, "wide: PrimaryScaler has no entry Crop; it may have (AttachRaw).")},
      {"configuration with a wrong entry", "VideoOutputConfigurations", primary(Dictionary{{"AttachRaw", "yes"}}),
       refusal(Code::kWrongType, "wide: AttachRaw must be a boolean, not the string yes.")},
      {"enabled", "VideoOutputsEnabled", primary(1),
       refusal(Code::kWrongType, "wide: PrimaryScaler must be a boolean, not the number 1.")},
      {"enabled output unknown", "VideoOutputsEnabled", Dictionary{{"Secondary", true}},
       refusal(Code::kOutOfRange, "wide: VideoOutputsEnabled has no entry Secondary; it may have (PrimaryScaler).")},
      {"handlers", "VideoOutputHandlers", primary(kFrames),
       refusal(Code::kWrongType, "wide: PrimaryScaler must be a dictionary, not " + kFrames->description() + ".")},
      {"handler of a wrong kind", "VideoOutputHandlers", primary(Dictionary{{"EventHandler", kFrames}}),
       refusal(Code::kWrongType,
               "wide: EventHandler must be a handler of its kind, not " + kFrames->description() + ".")},
      {"frame handler of a wrong kind", "VideoOutputHandlers", primary(Dictionary{{"PixelBufferHandler", kEvents}}),
       refusal(Code::kWrongType,
               "wide: PixelBufferHandler must be a handler of its kind, not " + kEvents->description() + ".")},
      {"handler that is none", "VideoOutputHandlers", primary(Dictionary{{"PixelBufferHandler", 1}}),
       refusal(Code::kWrongType, "wide: PixelBufferHandler must be a handler of its kind, not the number 1.")},
      {"handler unknown", "VideoOutputHandlers", primary(Dictionary{{"SampleHandler", kFrames}}),
       refusal(Code::kOutOfRange,
               "wide: PrimaryScaler has no entry SampleHandler; it may have (PixelBufferHandler, EventHandler).")},
  };
  for (const auto& row : kRows) {
    const std::string before = read(row.key);
    EXPECT_EQ(set(row.key, row.value), row.refused) << row.name;
    EXPECT_EQ(read(row.key), before) << row.name;
  }
}

TEST_F(OutputPropertiesTest, ACameraWithoutAProjectorHasNoLightToConfigure) {
  ASSERT_TRUE(user_.control({user_.streams[1]}));
  const std::string refused =
      refusal(Code::kUnsupported, "tele has no projector, and no InfraredLightSourceConfiguration.");
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return user_.tele().setValue(light(0, 0, 0), "InfraredLightSourceConfiguration", error);
            }),
            refused);
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return user_.tele().valueForProperty("InfraredLightSourceConfiguration", error);
            }),
            refused);
}

TEST_F(OutputPropertiesTest, FaultsReachThem) {
  ASSERT_TRUE(user_.control({user_.streams[0]}));
  Fault fault;
  fault.operation = "CaptureStream.setValue";
  fault.property = "AEEnabled";
  fault.action = FaultAction::kFail;
  phone_.addFault(fault);
  EXPECT_EQ(set("AEEnabled", false), refusal(Code::kInjected, "CaptureStream.setValue of wide for AEEnabled failed."));
  EXPECT_EQ(set("VideoOutputsEnabled", primary(true)), "done");
}

}  // namespace
}  // namespace quazor
