#include "backends/linux/capture/camera_pairing.h"

#include "contract/message_format.h"

#include <utility>

namespace quazor {

void FramePairing::addFrame(CapturedFrame frame, std::chrono::nanoseconds now) {
  frames_.push_back({std::move(frame), now + kMaxWait});
}

void FramePairing::addMetadata(BufferStamp stamp, std::vector<std::uint8_t> contents) {
  last_ = stamp;
  metadata_.push_back({stamp, std::move(contents)});
  if (metadata_.size() > kMaxMetadata) metadata_.pop_front();  // the camera may have stopped delivering frames
}

int FramePairing::order(const BufferStamp& metadata, const CapturedFrame& frame) const {
  if (pairing_ == MetadataPairing::kSequence) {
    constexpr std::uint32_t kBackwards = 1U << 31;  // numbers wrap around
    const std::uint32_t step = metadata.sequence - frame.sequence;
    return step == 0 ? 0 : step < kBackwards ? 1 : -1;
  }
  if (metadata.timestamp < frame.timestamp - kTolerance) return -1;
  return metadata.timestamp > frame.timestamp + kTolerance ? 1 : 0;
}

std::optional<CapturedFrame> FramePairing::next(std::chrono::nanoseconds now) {
  if (frames_.empty()) return std::nullopt;
  CapturedFrame& frame = frames_.front().frame;
  while (!metadata_.empty() && order(metadata_.front().stamp, frame) < 0) metadata_.pop_front();
  const bool isLater = !metadata_.empty() && order(metadata_.front().stamp, frame) > 0;
  if (metadata_.empty() || isLater) {
    if (!isLater && !ended_ && now < frames_.front().until) return std::nullopt;
  } else {
    frame.paired = std::move(metadata_.front().contents);
    metadata_.pop_front();
  }
  CapturedFrame ready = std::move(frame);
  frames_.pop_front();
  return ready;
}

std::string FramePairing::whyUnpaired(const CapturedFrame& frame) const {
  if (!last_) return "the metadata node has delivered no buffer";
  if (pairing_ == MetadataPairing::kSequence) {
    return formatMessage(
        "no metadata buffer has its sequence number %@; the last one has %@. If the driver numbers both separately, "
        "set \"pairing\" of the binding's \"metadata\" to \"timestamp\"",
        frame.sequence, last_->sequence);
  }
  return formatMessage(
      "no metadata buffer has its time stamp; that of the last one differs by %@ microseconds, with the sequence "
      "number %@ to the frame's %@. If the driver stamps both differently, set \"pairing\" of the binding's "
      "\"metadata\" to \"sequence\"",
      std::chrono::duration_cast<std::chrono::microseconds>(last_->timestamp - frame.timestamp).count(),
      last_->sequence, frame.sequence);
}

std::optional<std::chrono::nanoseconds> FramePairing::deadline() const {
  if (frames_.empty()) return std::nullopt;
  return frames_.front().until;
}

}  // namespace quazor
