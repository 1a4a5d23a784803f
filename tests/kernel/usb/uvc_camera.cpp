#include "tests/kernel/usb/uvc_camera.h"

#include "tests/kernel/usb/byte_order.h"
#include "tests/kernel/usb/uvc_constants.h"
#include "tests/kernel/usb/uvc_descriptors.h"

#include <utility>

namespace quazor {
namespace {

constexpr std::chrono::nanoseconds kMicroframe = std::chrono::microseconds(125);

}  // namespace

UvcCamera::UvcCamera(const UvcCameraConfig& config)
    : faults_(config.faults), isBulk_(config.isBulk), descriptors_(uvcDescriptors(config)) {
  for (std::size_t i = 0; i < config.functions; ++i) {
    functions_.push_back({UvcControls(config.faults), UvcStream(config), 0, {}, {}});
  }
}

const UvcCamera::Function* UvcCamera::ofEndpoint(std::uint8_t endpoint) const {
  const std::size_t number = endpoint - std::size_t{endpointOf(0)};
  return number < functions_.size() ? &functions_[number] : nullptr;
}

UvcCamera::Function* UvcCamera::ofEndpoint(std::uint8_t endpoint) {
  return const_cast<Function*>(std::as_const(*this).ofEndpoint(endpoint));
}

UvcCamera::Function* UvcCamera::ofInterface(std::uint8_t interface) {
  const std::size_t number = interface / 2U;
  return number < functions_.size() ? &functions_[number] : nullptr;
}

void UvcCamera::reach(UvcMoment moment) { unplugged_ = unplugged_ || faults_.unpluggedAt == moment; }

void UvcCamera::start(Function& function, Time now) {
  function.stream.start(now);
  function.busTime = now;
  ++function.streams;
  reach(UvcMoment::kStart);
}

void UvcCamera::stop(Function& function) {
  if (!function.stream.isStreaming()) return;
  function.stream.stop();
  reach(UvcMoment::kStop);
}

ControlAnswer UvcCamera::control(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) {
  const std::uint8_t recipient = setup.type & usb::kRecipientMask;
  const std::uint8_t kind = setup.type & usb::kTypeMask;
  if (kind == usb::kClass && recipient == usb::kToInterface) return answerClass(setup, sent, now);
  if (kind == usb::kStandard && setup.request == usb::kSetInterface) return setInterface(setup, now);
  // The host stops the stream of a bulk camera in this way.
  Function* const function = ofEndpoint(static_cast<std::uint8_t>(setup.index));
  if (kind == usb::kStandard && setup.request == usb::kClearFeature && recipient == usb::kToEndpoint &&
      function != nullptr) {
    stop(*function);
  }
  return answerStandard(descriptors_, setup).value_or(stall());
}

ControlAnswer UvcCamera::setInterface(const SetupPacket& setup, Time now) {
  const auto interface = static_cast<std::uint8_t>(setup.index);
  Function* const function = ofInterface(interface);
  const bool isStreaming = interface % 2 != 0;
  const std::size_t alternates = isStreaming && !isBulk_ ? std::size(uvc::kPacketSizes) : 0;
  if (function == nullptr || setup.value > alternates) return stall();
  if (setup.value > 0) {
    start(*function, now);
  } else if (isStreaming) {
    stop(*function);
  }
  return {};
}

ControlAnswer UvcCamera::answerClass(const SetupPacket& setup, std::span<const std::uint8_t> sent, Time now) {
  const auto interface = static_cast<std::uint8_t>(setup.index);
  Function* const function = ofInterface(interface);
  if (function == nullptr) return stall();
  if (interface % 2 == 0) return function->controls.answer(setup, sent);
  const ControlAnswer answer = function->stream.answer(setup, sent);
  if (setup.request == uvc::kSetCur && setup.value == uvc::kCommitValue && answer.outcome == ControlOutcome::kDone) {
    reach(UvcMoment::kCommit);
    if (isBulk_) start(*function, now);
  }
  return answer;
}

std::optional<TransferData> UvcCamera::transfer(const UsbipSubmit& submit, Time now) {
  Function* const function = ofEndpoint(submit.endpoint);
  if (function == nullptr || !function->stream.isStreaming()) return std::nullopt;
  if (faults_.unpluggedAfter && function->stream.frames() >= *faults_.unpluggedAfter) {
    unplugged_ = true;
    return std::nullopt;
  }
  std::optional<TransferData> given;
  if (isBulk_) {
    std::optional<Bytes> payload = function->stream.payload(now, submit.length);
    if (payload) given = TransferData{*std::move(payload), {}};
  } else {
    function->span = submit.packets.size() * kMicroframe;
    if (now >= function->busTime + function->span) given = packetsOf(*function, submit);
  }
  return given;
}

// The packets of the transfer's time; those in which the camera sends nothing are empty.
TransferData UvcCamera::packetsOf(Function& function, const UsbipSubmit& submit) {
  TransferData given;
  for (const std::uint32_t room : submit.packets) {
    function.busTime += kMicroframe;
    const std::optional<Bytes> payload = function.stream.payload(function.busTime, room);
    given.packets.push_back(payload ? static_cast<std::uint32_t>(payload->size()) : 0);
    if (payload) append(given.data, *payload);
  }
  return given;
}

std::optional<UvcCamera::Time> UvcCamera::due(std::uint8_t endpoint) const {
  const Function* const function = ofEndpoint(endpoint);
  if (function == nullptr || !function->stream.isStreaming()) return std::nullopt;
  return isBulk_ ? function->stream.nextPayload() : function->busTime + function->span;
}

std::string UvcCamera::activity() const {
  std::string text = "{\"functions\": [";
  for (const Function& one : functions_) {
    if (&one != &functions_.front()) text += ", ";
    text +=
        "{\"streams\": " + std::to_string(one.streams) + ", \"frames\": " + std::to_string(one.stream.frames()) + "}";
  }
  return text + "], \"unplugged\": " + (unplugged_ ? "true" : "false") + "}";
}

}  // namespace quazor
