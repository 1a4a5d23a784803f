#include "tests/kernel/usb/uvc_controls.h"

#include "tests/kernel/usb/usb_host_for_tests.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::ElementsAre;

class UvcControlsTest : public ::testing::Test {
 protected:
  ControlAnswer ask(std::uint8_t entity, std::uint8_t selector, std::uint8_t what, Bytes sent = {}) {
    const std::uint8_t type = what == uvc::kSetCur ? 0x21 : 0xA1;
    const auto value = static_cast<std::uint16_t>(selector << 8);
    const auto index = static_cast<std::uint16_t>(entity << 8);
    return controls_.answer(request(type, what, value, index, 8), sent);
  }
  // Why the last request was refused.
  std::uint8_t reason() { return ask(0, uvc::kErrorCodeControl, uvc::kGetCur).data.at(0); }

  UvcControls controls_{UvcFaults()};
};

TEST_F(UvcControlsTest, DescribesAControl) {
  const auto text = [&](std::uint8_t what) { return ask(uvc::kProcessing, 2, what).data; };
  EXPECT_THAT(text(uvc::kGetMin), ElementsAre(0x80, 0xFF));
  EXPECT_THAT(text(uvc::kGetMax), ElementsAre(0x7F, 0x00));
  EXPECT_THAT(text(uvc::kGetRes), ElementsAre(1, 0));
  EXPECT_THAT(text(uvc::kGetDef), ElementsAre(0, 0));
  EXPECT_THAT(text(uvc::kGetLen), ElementsAre(2, 0));
  EXPECT_THAT(text(uvc::kGetInfo), ElementsAre(3));
  EXPECT_THAT(ask(uvc::kCameraTerminal, 4, uvc::kGetMax).data, ElementsAre(0x2C, 1, 0, 0));
}

TEST_F(UvcControlsTest, KeepsWhatIsSet) {
  EXPECT_EQ(ask(uvc::kProcessing, 2, uvc::kSetCur, {0xF6, 0xFF}).outcome, ControlOutcome::kDone);
  EXPECT_EQ(controls_.value("brightness"), -10);
  EXPECT_THAT(ask(uvc::kProcessing, 2, uvc::kGetCur).data, ElementsAre(0xF6, 0xFF));
  EXPECT_EQ(ask(uvc::kCameraTerminal, 4, uvc::kSetCur, {44, 1, 0, 0}).outcome, ControlOutcome::kDone);
  EXPECT_EQ(controls_.value("exposure-time"), 300);
}

TEST_F(UvcControlsTest, TheExposureModeIsOneOfItsBits) {
  EXPECT_EQ(controls_.value("exposure-mode"), 8);
  EXPECT_EQ(ask(uvc::kCameraTerminal, 2, uvc::kGetMin).outcome, ControlOutcome::kStall);
  EXPECT_THAT(ask(uvc::kCameraTerminal, 2, uvc::kGetRes).data, ElementsAre(9));
  for (const std::uint8_t value : Bytes{0, 2, 9, 0x80}) {
    EXPECT_EQ(ask(uvc::kCameraTerminal, 2, uvc::kSetCur, {value}).outcome, ControlOutcome::kStall) << int{value};
    EXPECT_EQ(reason(), uvc::kOutOfRange);
  }
  EXPECT_EQ(ask(uvc::kCameraTerminal, 2, uvc::kSetCur, {1}).outcome, ControlOutcome::kDone);
  EXPECT_EQ(controls_.value("exposure-mode"), 1);
}

TEST_F(UvcControlsTest, RefusesWithAReasonThatIsReadOnce) {
  EXPECT_EQ(ask(uvc::kProcessing, 3, uvc::kSetCur, {0, 1}).outcome, ControlOutcome::kStall);
  EXPECT_EQ(controls_.value("contrast"), 32);
  EXPECT_EQ(reason(), uvc::kOutOfRange);
  EXPECT_EQ(reason(), uvc::kNoError);
  EXPECT_EQ(ask(uvc::kProcessing, 3, uvc::kSetCur, {1}).outcome, ControlOutcome::kStall) << "too short";
  EXPECT_EQ(ask(uvc::kProcessing, 1, uvc::kGetCur).outcome, ControlOutcome::kStall);
  EXPECT_EQ(reason(), uvc::kInvalidControl);
  EXPECT_EQ(ask(9, 1, uvc::kGetCur).outcome, ControlOutcome::kStall);
  EXPECT_EQ(reason(), uvc::kInvalidUnit);
  EXPECT_EQ(ask(uvc::kProcessing, 2, 0x99).outcome, ControlOutcome::kStall);
  EXPECT_EQ(reason(), uvc::kInvalidRequest);
}

TEST_F(UvcControlsTest, TheInterfaceHasOnlyTheReason) {
  EXPECT_THAT(ask(0, uvc::kErrorCodeControl, uvc::kGetInfo).data, ElementsAre(1));
  EXPECT_EQ(ask(0, uvc::kErrorCodeControl, uvc::kSetCur, {1}).outcome, ControlOutcome::kStall);
  EXPECT_EQ(ask(0, 1, uvc::kGetCur).outcome, ControlOutcome::kStall);
}

TEST_F(UvcControlsTest, StallsTheRequestThatIsChosen) {
  UvcFaults faults;
  faults.stalls = {{"contrast", "GET_DEF"}};
  controls_ = UvcControls(faults);
  EXPECT_EQ(ask(uvc::kProcessing, 3, uvc::kGetDef).outcome, ControlOutcome::kStall);
  EXPECT_EQ(reason(), uvc::kInvalidRequest);
  EXPECT_EQ(ask(uvc::kProcessing, 3, uvc::kGetMin).outcome, ControlOutcome::kDone);
  EXPECT_EQ(ask(uvc::kProcessing, 2, uvc::kGetDef).outcome, ControlOutcome::kDone);
}

TEST(UvcControlNamesTest, AreKnown) {
  EXPECT_TRUE(isUvcControlRequest("contrast", "GET_DEF"));
  EXPECT_FALSE(isUvcControlRequest("contrast", "GET_ALL"));
  EXPECT_FALSE(isUvcControlRequest("colour", "GET_DEF"));
  EXPECT_EQ(uvcRequestName(0x87), "GET_DEF");
  EXPECT_EQ(uvcRequestName(0x88), "");
}

}  // namespace
}  // namespace quazor
