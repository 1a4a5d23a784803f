#include "backends/linux/capture/camera_frames.h"

#include "platform/capture_keys.h"

#include <utility>

namespace quazor {

FramePool& FramePool::shared() {
  static FramePool& pool = *new FramePool;
  return pool;
}

PixelBuffer& FramePool::take(Value metadata, TracedDelivery delivery) {
  const std::lock_guard lock(mutex_);
  if (free_.empty()) free_.push_back(&buffers_.emplace_back(*this));
  Buffer& buffer = *free_.back();
  free_.pop_back();
  buffer.metadata_ = std::move(metadata);
  buffer.delivery_ = std::move(delivery);
  buffer.references_.store(1, std::memory_order_relaxed);
  return buffer;
}

std::size_t FramePool::held() const {
  const std::lock_guard lock(mutex_);
  return buffers_.size() - free_.size();
}

void FramePool::Buffer::release() {
  if (references_.fetch_sub(1, std::memory_order_acq_rel) != 1) return;
  std::exchange(delivery_, {}).handBack();
  const std::optional<Value> metadata = std::exchange(metadata_, std::nullopt);  // destroyed without the lock
  const std::lock_guard lock(pool_.mutex_);
  pool_.free_.push_back(this);
}

std::optional<Value> FramePool::Buffer::attachment(std::string_view key) const {
  return key == capture_key::MetadataDictionary ? metadata_ : std::nullopt;
}

}  // namespace quazor
