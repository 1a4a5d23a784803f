#include "tests/kernel/usb/uvc_stream.h"

#include "tests/kernel/usb/byte_order.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <algorithm>
#include <array>
#include <cmath>

namespace quazor {
namespace {

constexpr std::chrono::nanoseconds kSecond = std::chrono::seconds(1);
constexpr double kMicroframesPerSecond = 8000;

std::uint64_t ticksAt(std::chrono::nanoseconds time) {
  const auto microseconds = std::chrono::duration_cast<std::chrono::microseconds>(time).count();
  return static_cast<std::uint64_t>(microseconds) * (uvc::kClock / 1'000'000);
}

}  // namespace

UvcStream::UvcStream(const UvcCameraConfig& config)
    : formats_(config.formats), isBulk_(config.isBulk), faults_(config.faults), probed_(defaultMode(0, 0)) {
  mode_ = probed_;
}

UvcStream::Mode UvcStream::defaultMode(std::size_t format, std::size_t frame) const {
  return {format, frame, formats_[format].frames[frame].rates.front()};
}

// What the camera offers that is nearest to a host's wish.
UvcStream::Mode UvcStream::nearestMode(std::span<const std::uint8_t> wanted) const {
  const auto within = [](std::uint64_t number, std::size_t count) {
    return static_cast<std::size_t>(std::clamp<std::uint64_t>(number, 1, count) - 1);
  };
  const std::size_t format = within(wanted[2], formats_.size());
  const std::vector<UvcFrame>& frames = formats_[format].frames;
  const std::size_t frame = within(wanted[3], frames.size());
  const auto interval = static_cast<std::int64_t>(littleAt(wanted, 4, 4));
  const auto distance = [interval](std::uint32_t rate) { return std::abs(intervalOfRate(rate) - interval); };
  return {format, frame, *std::ranges::min_element(frames[frame].rates, {}, distance)};
}

std::uint32_t UvcStream::bytesOf(const Mode& mode) const {
  const UvcFormat& format = formats_[mode.format];
  return pictureBytes(format, format.frames[mode.frame]);
}

// Isochronous: what a packet needs to hold so that a frame takes 90 % of its time.
std::uint32_t UvcStream::payloadSizeOf(const Mode& mode) const {
  if (isBulk_) return uvc::kBulkPayload;
  const double packets = kMicroframesPerSecond / mode.rate * 0.9;
  const auto needed = static_cast<std::uint32_t>(std::ceil(bytesOf(mode) / packets)) + uvc::kHeaderBytes;
  for (const std::uint32_t size : uvc::kPacketSizes) {
    if (needed <= size) return size;
  }
  return *std::ranges::max_element(uvc::kPacketSizes);
}

Bytes UvcStream::textOf(const Mode& mode) const {
  Bytes text{0, 0};  // no hint
  addLittle(text, mode.format + 1, 1);
  addLittle(text, mode.frame + 1, 1);
  addLittle(text, intervalOfRate(mode.rate), 4);
  addZeros(text, 10);  // no key frames, quality, window or delay
  addLittle(text, bytesOf(mode), 4);
  addLittle(text, payloadSizeOf(mode), 4);
  addLittle(text, uvc::kClock, 4);
  append(text, Bytes{uvc::kFrameId | uvc::kEndOfFrame, 1, 1, 1});  // framing, and versions of the payload's format
  return text;
}

ControlAnswer UvcStream::answer(const SetupPacket& setup, std::span<const std::uint8_t> sent) {
  const auto selector = static_cast<std::uint8_t>(setup.value >> 8);
  const bool isCommit = selector == uvc::kCommitControl;
  if (selector != uvc::kProbeControl && !isCommit) return stall();
  ControlAnswer answer;
  switch (setup.request) {
    case uvc::kSetCur:
      if (sent.size() != uvc::kProbeBytes) return stall();
      (isCommit ? mode_ : probed_) = nearestMode(sent);
      committed_ = committed_ || isCommit;
      return answer;
    case uvc::kGetCur: answer.data = textOf(isCommit ? mode_ : probed_); return answer;
    case uvc::kGetMin:
    case uvc::kGetMax: answer.data = textOf(probed_); return answer;
    case uvc::kGetDef: answer.data = textOf(defaultMode(0, 0)); return answer;
    case uvc::kGetLen: addLittle(answer.data, uvc::kProbeBytes, 2); return answer;
    case uvc::kGetInfo: addLittle(answer.data, 3, 1); return answer;
    default: return stall();
  }
}

void UvcStream::start(Time now) {
  streaming_ = true;
  began_ = now;
  number_ = 0;
  sent_ = 0;
}

void UvcStream::stop() {
  streaming_ = false;
  committed_ = false;
}

UvcStream::Time UvcStream::frameTime() const {
  const Time since = (number_ + 1) * kSecond / mode_.rate;
  return began_ + since + (hits(faults_.lateEvery, number_) ? Time(faults_.lateBy) : Time::zero());
}

std::optional<UvcStream::Time> UvcStream::nextPayload() const {
  if (!streaming_ || (faults_.muteAfter && number_ >= *faults_.muteAfter)) return std::nullopt;
  return frameTime();
}

void UvcStream::addHeader(Bytes& payload, Time at, bool isLast) const {
  std::uint8_t flags = uvc::kHasPts | uvc::kHasScr | uvc::kEndOfHeader;
  if (number_ % 2 != 0) flags |= uvc::kFrameId;
  if (isLast) flags |= uvc::kEndOfFrame;
  if (isLast && hits(faults_.damagedEvery, number_)) flags |= uvc::kError;
  payload.push_back(uvc::kHeaderBytes);
  payload.push_back(flags);
  addLittle(payload, ticksAt(frameTime()), 4);
  addLittle(payload, ticksAt(at), 4);
  constexpr std::uint64_t kFrameNumbers = 2048;  // of the bus, a millisecond each
  addLittle(payload, static_cast<std::uint64_t>(at / std::chrono::milliseconds(1)) % kFrameNumbers, 2);
}

std::optional<Bytes> UvcStream::payload(Time at, std::size_t room) {
  const std::optional<Time> from = nextPayload();
  if (!from || at < *from) return std::nullopt;
  const std::size_t size = std::min<std::size_t>(room, payloadSizeOf(mode_));
  if (size <= uvc::kHeaderBytes) return std::nullopt;
  const std::uint32_t whole = bytesOf(mode_);
  const std::uint32_t end = hits(faults_.shortEvery, number_) ? whole / 2 : whole;
  const auto part = static_cast<std::uint32_t>(std::min<std::size_t>(end - sent_, size - uvc::kHeaderBytes));
  const bool isLast = sent_ + part == end;
  Bytes payload;
  payload.reserve(size);
  addHeader(payload, at, isLast);
  // A picture of one brightness, which changes from frame to frame.
  payload.resize(uvc::kHeaderBytes + part, static_cast<std::uint8_t>(number_));
  sent_ += part;
  if (isLast) {
    ++number_;
    sent_ = 0;
  }
  return payload;
}

}  // namespace quazor
