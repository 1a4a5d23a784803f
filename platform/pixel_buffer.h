// PixelBuffer: the image buffer of one captured frame; and the handlers that receive frames and events.
#pragma once

#include "contract/contract.h"
#include "contract/value.h"
#include "platform/media_time.h"

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace QUAZOR_CONTRACT {

// References are counted manually, as in the hardware's buffer pool: a handler that needs the buffer after its call
// takes a reference, and the buffer returns to its pool when the last reference is released.
// Thread: any.
class QUAZOR_EXPORT PixelBuffer {
 public:
  PixelBuffer() = default;
  PixelBuffer(const PixelBuffer&) = delete;
  PixelBuffer& operator=(const PixelBuffer&) = delete;

  virtual void retain() = 0;
  virtual void release() = 0;
  // Returns the frame's attachment `key` (platform/capture_keys.h), or nothing. REQUIRES: the caller holds a reference;
  // the returned value remains valid without it. Attachments do not change.
  virtual std::optional<Value> attachment(std::string_view key) const = 0;

 protected:
  virtual ~PixelBuffer();
};

// Called with every frame of an output, on any thread of the capture service, perhaps several at once. The buffer is
// valid only during the call. Must return quickly, because it delays further frames. May release the last reference to
// its own stream.
// Thread: any of the capture service, perhaps several at once.
class QUAZOR_EXPORT PixelBufferHandler final : public Object {
 public:
  using Function = std::function<void(PixelBuffer& buffer, MediaTime presentationTime)>;

  explicit PixelBufferHandler(Function function) : function_(std::move(function)) {}
  ~PixelBufferHandler() override;

  void operator()(PixelBuffer& buffer, MediaTime presentationTime) const { function_(buffer, presentationTime); }
  std::string description() const override;

 private:
  Function function_;
};

// Called for every event of an output, under the same rules as PixelBufferHandler. `info` may be null.
// Thread: any, as PixelBufferHandler.
class QUAZOR_EXPORT EventHandler final : public Object {
 public:
  using Function = std::function<void(std::int32_t event, MediaTime time, const Value* info)>;

  explicit EventHandler(Function function) : function_(std::move(function)) {}
  ~EventHandler() override;

  void operator()(std::int32_t event, MediaTime time, const Value* info) const { function_(event, time, info); }
  std::string description() const override;

 private:
  Function function_;
};

}  // namespace QUAZOR_CONTRACT
