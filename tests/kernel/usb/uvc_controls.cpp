#include "tests/kernel/usb/uvc_controls.h"

#include "tests/kernel/usb/byte_order.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

constexpr std::array<std::pair<std::uint8_t, std::string_view>, 8> kRequests{{{uvc::kSetCur, "SET_CUR"},
                                                                              {uvc::kGetCur, "GET_CUR"},
                                                                              {uvc::kGetMin, "GET_MIN"},
                                                                              {uvc::kGetMax, "GET_MAX"},
                                                                              {uvc::kGetRes, "GET_RES"},
                                                                              {uvc::kGetLen, "GET_LEN"},
                                                                              {uvc::kGetInfo, "GET_INFO"},
                                                                              {uvc::kGetDef, "GET_DEF"}}};

constexpr std::uint8_t kReadable = 1;
constexpr std::uint8_t kWritable = 2;

ControlAnswer numberAnswer(std::int32_t number, std::size_t bytes) {
  ControlAnswer answer;
  addLittle(answer.data, static_cast<std::uint32_t>(number), bytes);
  return answer;
}

// The signed number of one, two or four bytes.
std::int32_t signedNumber(std::span<const std::uint8_t> from) {
  const auto number = static_cast<std::uint32_t>(littleAt(from, 0, from.size()));
  switch (from.size()) {
    case 1: return static_cast<std::int8_t>(number);
    case 2: return static_cast<std::int16_t>(number);
    default: return static_cast<std::int32_t>(number);
  }
}

}  // namespace

std::string uvcRequestName(std::uint8_t request) {
  const auto found = std::ranges::find(kRequests, request, &std::pair<std::uint8_t, std::string_view>::first);
  return found == kRequests.end() ? std::string() : std::string(found->second);
}

bool isUvcControlRequest(const std::string& control, const std::string& request) {
  return std::ranges::find(UvcControls::all(), control, &UvcControl::name) != UvcControls::all().end() &&
         std::ranges::find(kRequests, request, &std::pair<std::uint8_t, std::string_view>::second) != kRequests.end();
}

const std::vector<UvcControl>& UvcControls::all() {
  // Exposure modes: 1 is manual, 8 leaves the aperture to the user. Exposure times are in 100 microseconds.
  static const std::vector<UvcControl> controls{
      {"exposure-mode", uvc::kCameraTerminal, 2, 1, 1, 0, 0, 1 | 8, 8, true},
      {"exposure-priority", uvc::kCameraTerminal, 3, 2, 1, 0, 1, 1, 0, false},
      {"exposure-time", uvc::kCameraTerminal, 4, 3, 4, 1, 300, 1, 150, false},
      {"brightness", uvc::kProcessing, 2, 0, 2, -128, 127, 1, 0, false},
      {"contrast", uvc::kProcessing, 3, 1, 2, 0, 255, 1, 32, false},
      {"gain", uvc::kProcessing, 4, 9, 2, 0, 255, 1, 0, false},
      {"power-line", uvc::kProcessing, 5, 10, 1, 0, 2, 1, 1, false},
      {"saturation", uvc::kProcessing, 7, 3, 2, 0, 255, 1, 64, false},
      {"sharpness", uvc::kProcessing, 8, 4, 2, 0, 255, 1, 3, false},
  };
  return controls;
}

std::uint32_t UvcControls::bitsOf(std::uint8_t entity) {
  std::uint32_t bits = 0;
  for (const UvcControl& one : all()) bits |= one.entity == entity ? 1U << one.bit : 0U;
  return bits;
}

UvcControls::UvcControls(const UvcFaults& faults) : stalls_(faults.stalls) {
  for (const UvcControl& one : all()) states_.push_back({&one, one.usual});
}

std::int32_t UvcControls::value(const std::string& name) const {
  for (const State& state : states_) {
    if (state.control->name == name) return state.value;
  }
  throw std::invalid_argument("there is no control " + name);
}

ControlAnswer UvcControls::refuse(std::uint8_t reason) {
  lastError_ = reason;
  return stall();
}

ControlAnswer UvcControls::answer(const SetupPacket& setup, std::span<const std::uint8_t> sent) {
  const auto entity = static_cast<std::uint8_t>(setup.index >> 8);
  const auto selector = static_cast<std::uint8_t>(setup.value >> 8);
  if (entity == 0) return answerInterface(setup);
  bool isEntity = false;
  for (State& state : states_) {
    isEntity = isEntity || state.control->entity == entity;
    if (state.control->entity == entity && state.control->selector == selector) {
      return answerControl(state, setup, sent);
    }
  }
  return refuse(isEntity ? uvc::kInvalidControl : uvc::kInvalidUnit);
}

ControlAnswer UvcControls::answerInterface(const SetupPacket& setup) {
  if (setup.value >> 8 != uvc::kErrorCodeControl) return refuse(uvc::kInvalidControl);
  switch (setup.request) {
    case uvc::kGetCur: return numberAnswer(std::exchange(lastError_, uvc::kNoError), 1);
    case uvc::kGetInfo: return numberAnswer(kReadable, 1);
    default: return refuse(uvc::kInvalidRequest);
  }
}

ControlAnswer UvcControls::answerControl(State& state, const SetupPacket& setup, std::span<const std::uint8_t> sent) {
  const UvcControl& control = *state.control;
  if (stalls_.contains({control.name, uvcRequestName(setup.request)})) return refuse(uvc::kInvalidRequest);
  switch (setup.request) {
    case uvc::kSetCur: return set(state, sent);
    case uvc::kGetCur: return numberAnswer(state.value, control.bytes);
    case uvc::kGetMin:
      return control.isBitmap ? refuse(uvc::kInvalidRequest) : numberAnswer(control.minimum, control.bytes);
    case uvc::kGetMax:
      return control.isBitmap ? refuse(uvc::kInvalidRequest) : numberAnswer(control.maximum, control.bytes);
    case uvc::kGetRes: return numberAnswer(control.step, control.bytes);
    case uvc::kGetLen: return numberAnswer(control.bytes, 2);
    case uvc::kGetInfo: return numberAnswer(kReadable | kWritable, 1);
    case uvc::kGetDef: return numberAnswer(control.usual, control.bytes);
    default: return refuse(uvc::kInvalidRequest);
  }
}

ControlAnswer UvcControls::set(State& state, std::span<const std::uint8_t> sent) {
  const UvcControl& control = *state.control;
  if (sent.size() != control.bytes) return refuse(uvc::kOutOfRange);
  const std::int32_t value = signedNumber(sent);
  const bool isOneBit = value > 0 && (value & (value - 1)) == 0;
  const bool fits =
      control.isBitmap ? isOneBit && (value & control.step) != 0 : value >= control.minimum && value <= control.maximum;
  if (!fits) return refuse(uvc::kOutOfRange);
  state.value = value;
  return {};
}

}  // namespace quazor
