// The pixel buffers that handlers get.
#pragma once

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

// Hands out buffers and takes them back with their last reference.
//
// A frame's pixels are not exposed, so what the driver filled goes back to it before the handler is called, and a
// buffer here holds the frame's metadata alone: one that is kept, or never given back, takes nothing from the driver.
//
// Thread: any.
class FramePool final {
 public:
  FramePool() = default;
  FramePool(const FramePool&) = delete;
  FramePool& operator=(const FramePool&) = delete;

  // The process' own. It is never destroyed, as plug-ins may give buffers back at any time, or never.
  static FramePool& shared();

  // A buffer with one reference, the caller's. `metadata` is its attachment MetadataDictionary.
  PixelBuffer& take(Value metadata);
  // How many buffers are out.
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
  };

  mutable std::mutex mutex_;  // guards what follows
  std::deque<Buffer> buffers_;
  std::vector<Buffer*> free_;
};

}  // namespace quazor
