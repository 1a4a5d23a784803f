// PixelBufferPool: the image buffers of the simulated phone.
#pragma once

#include "backends/capture/frame_trace.h"
#include "contract/value.h"
#include "platform/pixel_buffer.h"

#include <atomic>
#include <chrono>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// Provides buffers and reclaims them when the last reference is released. Grows as needed and owns the memory of all
// buffers, so a buffer that is never released is not leaked: held() lists it.
//
// Thread: any. Buffers must not be used after the pool was destroyed.
class PixelBufferPool final {
 public:
  // A buffer that was not released: the index of its camera, and the number of its frame.
  struct Held {
    std::size_t camera = 0;
    std::uint64_t frame = 0;

    // NOLINTNEXTLINE(modernize-use-nullptr): the check takes the 0 of the defaulted comparison for a pointer
    friend auto operator<=>(const Held&, const Held&) = default;
  };

  PixelBufferPool() = default;
  PixelBufferPool(const PixelBufferPool&) = delete;
  PixelBufferPool& operator=(const PixelBufferPool&) = delete;

  // A buffer with one reference, owned by the caller. `metadata` becomes its attachment MetadataDictionary. If there is
  // a stream to tell, the frame, which was `captured` then, is delivered now, and handed back with the last reference.
  PixelBuffer& take(std::size_t camera, std::uint64_t frame, std::optional<Value> metadata,
                    const std::shared_ptr<TracedStream>& traced = nullptr, std::chrono::nanoseconds captured = {});
  // The buffers in use, by camera and frame.
  std::vector<Held> held() const;
  // The total number of buffers provided.
  std::uint64_t taken() const;
  // The number of releases without a matching reference; such a release has no other effect. If the buffer is in use
  // again, a release too many cannot be detected.
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
    bool out_ = false;  // guarded by the pool's mutex, like the members below while the buffer is not in use
    Held frame_;
    std::optional<Value> metadata_;
    TracedDelivery delivery_;  // not guarded: of the thread that takes the buffer, then of the one that puts it back
  };

  Buffer& takeFree(std::size_t camera, std::uint64_t frame, std::optional<Value> metadata);
  void putBack(Buffer& buffer);

  std::atomic<std::uint64_t> strayReleases_{0};
  mutable std::mutex mutex_;  // guards the members below
  std::deque<Buffer> buffers_;
  std::vector<Buffer*> free_;
  std::uint64_t taken_ = 0;
};

}  // namespace quazor
