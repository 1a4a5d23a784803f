// The pixel buffers that handlers receive.
#pragma once

#include "backends/capture/frame_trace.h"
#include "contract/value.h"
#include "platform/pixel_buffer.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// Provides buffers and reclaims them when the last reference is released.
//
// The pixels of a frame are not exposed, so the driver gets its buffer back before the handler is called, and a pixel
// buffer contains only the frame's metadata. A plug-in that keeps a pixel buffer does not take one from the driver.
//
// Thread: any.
class FramePool final {
 public:
  FramePool() = default;
  FramePool(const FramePool&) = delete;
  FramePool& operator=(const FramePool&) = delete;

  // The pool of the process. It is never destroyed, because plug-ins may release buffers at any time, or never.
  static FramePool& shared();

  // A buffer with one reference, owned by the caller. `metadata` becomes its attachment MetadataDictionary. `delivery`
  // ends with the last reference.
  PixelBuffer& take(Value metadata, TracedDelivery delivery = {});
  // The number of buffers in use.
  std::size_t held() const;

 private:
  class Buffer final : public PixelBuffer {
   public:
    explicit Buffer(FramePool& pool) : pool_(pool) {}

    void retain() override { references_.fetch_add(1, std::memory_order_relaxed); }
    void release() override;
    std::optional<Value> attachment(std::string_view key) const override;

   private:
    friend class FramePool;

    FramePool& pool_;
    std::atomic<std::int64_t> references_{0};
    std::optional<Value> metadata_;
    TracedDelivery delivery_;
  };

  mutable std::mutex mutex_;  // guards the members below
  std::deque<Buffer> buffers_;
  std::vector<Buffer*> free_;
};

}  // namespace quazor
