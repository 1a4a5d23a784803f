// CameraBuffers: the mapped buffers of one video or metadata node. A buffer of a multi-planar node has several planes.
#pragma once

#include "backends/linux/video/v4l2_device.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

namespace quazor {

// The metadata of a dequeued buffer.
struct DequeuedBuffer {
  std::uint32_t index = 0;
  std::uint32_t bytesUsed = 0;  // in all planes
  std::uint32_t sequence = 0;
  bool isBad = false;                     // the driver found an error in the data
  std::chrono::nanoseconds timestamp{0};  // on the monotonic clock
};

// Requested buffers prevent other processes from setting the node's format until every buffer is unmapped and released.
// release() and the destructor therefore perform all steps even if one of them fails.
//
// Thread: one at a time.
class CameraBuffers final {
 public:
  explicit CameraBuffers(std::shared_ptr<V4l2Device> node);
  CameraBuffers(const CameraBuffers&) = delete;
  CameraBuffers& operator=(const CameraBuffers&) = delete;
  ~CameraBuffers();

  const V4l2Device& node() const { return *node_; }

  // Requests, maps and queues buffers; the driver may give more or fewer than `count`.
  bool prepare(std::uint32_t count, DiagnosticErrorPtr* error);
  bool streamOn(DiagnosticErrorPtr* error);
  // Stops the stream, unmaps the buffers and releases them. If the driver refuses a step, performs the remaining ones
  // and returns false with the first error. Does nothing in a second call.
  bool release(DiagnosticErrorPtr* error);

  // Dequeues a filled buffer. Returns 0 or an error number: EAGAIN if none is ready.
  int dequeue(DequeuedBuffer& buffer);
  // The content of a buffer with one plane, valid until it is queued again.
  std::span<const std::uint8_t> contents(const DequeuedBuffer& buffer) const;
  // Queues the buffer, and those that the driver refused earlier. Returns 0 or the error number for this buffer.
  int queue(std::uint32_t index);

  // The number of buffers.
  std::size_t count() const { return mapped_.size(); }

 private:
  struct Mapped {
    void* address = nullptr;
    std::size_t length = 0;
  };

  // The argument of a buffer call. The kernel follows the pointer to the planes.
  struct BufferCall {
    explicit BufferCall(const CameraBuffers& buffers, std::uint32_t index = 0);
    BufferCall(const BufferCall&) = delete;
    BufferCall& operator=(const BufferCall&) = delete;

    v4l2_buffer buffer{};
    std::array<v4l2_plane, VIDEO_MAX_PLANES> planes{};
  };

  bool map(std::uint32_t index, DiagnosticErrorPtr* error);
  bool mapPlane(std::size_t length, std::uint32_t offset, DiagnosticErrorPtr* error);

  const std::shared_ptr<V4l2Device> node_;
  const std::uint32_t type_;
  std::vector<std::vector<Mapped>> mapped_;  // by buffer index, then by plane
  std::vector<std::uint32_t> refused_;       // indexes of buffers that the driver refused to queue
  bool requested_ = false;
  bool streaming_ = false;
};

}  // namespace quazor
