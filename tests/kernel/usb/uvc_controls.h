// UvcControls: the controls of a camera terminal and a processing unit.
#pragma once

#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/uvc_config.h"

#include <cstdint>
#include <span>
#include <string>
#include <vector>

namespace quazor {

struct UvcControl {
  std::string name;
  std::uint8_t entity = 0;
  std::uint8_t selector = 0;
  std::uint8_t bit = 0;  // in the entity's descriptor
  std::uint8_t bytes = 0;
  std::int32_t minimum = 0;
  std::int32_t maximum = 0;
  std::int32_t step = 1;  // of a bitmap: the bits that are supported
  std::int32_t usual = 0;
  bool isBitmap = false;  // has neither minimum nor maximum
};

// The request's name, such as GET_DEF; empty if there is none.
std::string uvcRequestName(std::uint8_t request);
// Whether the cameras have a control and a request of these names.
bool isUvcControlRequest(const std::string& control, const std::string& request);

// Thread: one.
class UvcControls {
 public:
  explicit UvcControls(const UvcFaults& faults);

  // The bits of all controls of an entity.
  static std::uint32_t bitsOf(std::uint8_t entity);
  static const std::vector<UvcControl>& all();

  // Answers a request to an entity, or to the interface itself (entity 0).
  ControlAnswer answer(const SetupPacket& setup, std::span<const std::uint8_t> sent);
  std::int32_t value(const std::string& name) const;

 private:
  struct State {
    const UvcControl* control = nullptr;
    std::int32_t value = 0;
  };

  ControlAnswer refuse(std::uint8_t reason);
  ControlAnswer answerInterface(const SetupPacket& setup);
  ControlAnswer answerControl(State& state, const SetupPacket& setup, std::span<const std::uint8_t> sent);
  ControlAnswer set(State& state, std::span<const std::uint8_t> sent);

  std::set<std::pair<std::string, std::string>> stalls_;
  std::vector<State> states_;
  std::uint8_t lastError_ = 0;
};

}  // namespace quazor
