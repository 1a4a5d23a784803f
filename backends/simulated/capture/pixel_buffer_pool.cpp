#include "backends/simulated/capture/pixel_buffer_pool.h"

#include "platform/capture_keys.h"

#include <algorithm>
#include <utility>

namespace quazor {

void PixelBufferPool::Buffer::release() {
  std::int64_t references = references_.load(std::memory_order_relaxed);
  do {
    if (references == 0) {
      pool_.strayReleases_.fetch_add(1, std::memory_order_relaxed);
      return;
    }
  } while (!references_.compare_exchange_weak(references, references - 1, std::memory_order_acq_rel));
  if (references == 1) pool_.putBack(*this);
}

std::optional<Value> PixelBufferPool::Buffer::attachment(std::string_view key) const {
  if (key != capture_key::MetadataDictionary) return std::nullopt;
  return metadata_;
}

PixelBuffer& PixelBufferPool::take(std::size_t camera, std::uint64_t frame, std::optional<Value> metadata,
                                   const std::shared_ptr<TracedStream>& traced, std::chrono::nanoseconds captured) {
  Buffer& buffer = takeFree(camera, frame, std::move(metadata));
  buffer.delivery_ = TracedDelivery(traced, frame, captured);
  return buffer;
}

PixelBufferPool::Buffer& PixelBufferPool::takeFree(std::size_t camera, std::uint64_t frame,
                                                   std::optional<Value> metadata) {
  const std::lock_guard lock(mutex_);
  if (free_.empty()) free_.push_back(&buffers_.emplace_back(*this));
  Buffer& buffer = *free_.back();
  free_.pop_back();
  ++taken_;
  buffer.out_ = true;
  buffer.frame_ = {camera, frame};
  buffer.metadata_ = std::move(metadata);
  buffer.references_.store(1, std::memory_order_relaxed);
  return buffer;
}

void PixelBufferPool::putBack(Buffer& buffer) {
  std::exchange(buffer.delivery_, {}).handBack();
  std::optional<Value> metadata;  // destroyed after the lock was released
  const std::lock_guard lock(mutex_);
  metadata.swap(buffer.metadata_);
  buffer.out_ = false;
  free_.push_back(&buffer);
}

std::uint64_t PixelBufferPool::taken() const {
  const std::lock_guard lock(mutex_);
  return taken_;
}

std::vector<PixelBufferPool::Held> PixelBufferPool::held() const {
  const std::lock_guard lock(mutex_);
  std::vector<Held> held;
  for (const Buffer& buffer : buffers_) {
    if (buffer.out_) held.push_back(buffer.frame_);
  }
  std::ranges::sort(held);
  return held;
}

}  // namespace quazor
