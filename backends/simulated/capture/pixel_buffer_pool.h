// PixelBufferPool: the image buffers of the simulated phone.
#pragma once

#include "contract/value.h"
#include "platform/pixel_buffer.h"

#include <atomic>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// Hands out buffers and takes them back with their last reference. It grows as needed and owns the memory of all of
// them, so a buffer that is never given back is not lost: it is told by held().
//
// Thread: any. Buffers must not be used when the pool is gone.
class PixelBufferPool final {
 public:
  // A buffer that has not come back: the index of the camera it came from, and the frame's number.
  struct Held {
    std::size_t camera = 0;
    std::uint64_t frame = 0;

    friend auto operator<=>(const Held&, const Held&) = default;
  };

  PixelBufferPool() = default;
  PixelBufferPool(const PixelBufferPool&) = delete;
  PixelBufferPool& operator=(const PixelBufferPool&) = delete;

  // A buffer with one reference, the caller's. `metadata` is its attachment MetadataDictionary.
  PixelBuffer& take(std::size_t camera, std::uint64_t frame, std::optional<Value> metadata);
  // The buffers that are out, by camera and frame.
  std::vector<Held> held() const;
  // How many buffers have been handed out in all.
  std::uint64_t taken() const;
  // How often a buffer was released that nobody held; such a release has no other effect. A release too many of a
  // buffer that is out again by then cannot be told from a rightful one.
  std::uint64_t strayReleases() const { return strayReleases_.load(std::memory_order_relaxed); }

 private:
  class Buffer final : public PixelBuffer {
   public:
    explicit Buffer(PixelBufferPool& pool) : pool_(pool) {}

    void retain() override { references_.fetch_add(1, std::memory_order_relaxed); }
    void release() override;
    std::optional<Value> attachment(std::string_view key) const override;

   private:
    friend class PixelBufferPool;

    PixelBufferPool& pool_;
    std::atomic<std::int64_t> references_{0};
    bool out_ = false;  // guarded by the pool's mutex, as is what follows while the buffer is not out
    Held frame_;
    std::optional<Value> metadata_;
  };

  void putBack(Buffer& buffer);

  std::atomic<std::uint64_t> strayReleases_{0};
  mutable std::mutex mutex_;  // guards what follows
  std::deque<Buffer> buffers_;
  std::vector<Buffer*> free_;
  std::uint64_t taken_ = 0;
};

}  // namespace quazor
