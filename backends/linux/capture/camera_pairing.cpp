#include "backends/linux/capture/camera_pairing.h"

#include <utility>

namespace quazor {

void FramePairing::addFrame(CapturedFrame frame, std::chrono::nanoseconds now) {
  frames_.push_back({std::move(frame), now + kMaxWait});
}

void FramePairing::addMetadata(std::chrono::nanoseconds timestamp, std::vector<std::uint8_t> contents) {
  metadata_.push_back({timestamp, std::move(contents)});
  if (metadata_.size() > kMaxMetadata) metadata_.pop_front();  // the camera may have stopped delivering frames
}

std::optional<CapturedFrame> FramePairing::next(std::chrono::nanoseconds now) {
  if (frames_.empty()) return std::nullopt;
  CapturedFrame& frame = frames_.front().frame;
  while (!metadata_.empty() && metadata_.front().timestamp < frame.timestamp - kTolerance) metadata_.pop_front();
  const bool isLater = !metadata_.empty() && metadata_.front().timestamp > frame.timestamp + kTolerance;
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

std::optional<std::chrono::nanoseconds> FramePairing::deadline() const {
  if (frames_.empty()) return std::nullopt;
  return frames_.front().until;
}

}  // namespace quazor
