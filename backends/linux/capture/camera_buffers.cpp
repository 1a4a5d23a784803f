#include "backends/linux/capture/camera_buffers.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace quazor {
namespace {

// What a driver says beyond a century is nonsense, and its nanoseconds would not fit.
std::chrono::nanoseconds timeOf(const timeval& time) {
  constexpr std::int64_t kMaxSeconds = 4'000'000'000;
  return std::chrono::seconds(std::clamp<std::int64_t>(time.tv_sec, 0, kMaxSeconds)) +
         std::chrono::microseconds(std::clamp<std::int64_t>(time.tv_usec, 0, 999'999));
}

}  // namespace

CameraBuffers::CameraBuffers(std::shared_ptr<V4l2Device> node) : node_(std::move(node)), type_(node_->bufferType()) {}

CameraBuffers::~CameraBuffers() { release(nullptr); }

bool CameraBuffers::prepare(std::uint32_t count, DiagnosticErrorPtr* error) {
  v4l2_requestbuffers request{};
  request.count = count;
  request.type = type_;
  request.memory = V4L2_MEMORY_MMAP;
  if (!node_->call(VIDIOC_REQBUFS, "VIDIOC_REQBUFS", &request, error)) return false;
  requested_ = true;
  if (request.count == 0) {
    failLinux(error, LinuxErrorCode::kSystemCall, "VIDIOC_REQBUFS on " + node_->path() + " provided no buffers.");
    return false;
  }
  for (std::uint32_t index = 0; index < request.count; ++index) {
    if (!map(index, error)) return false;
  }
  for (std::uint32_t index = 0; index < request.count; ++index) {
    BufferCall call(*this, index);
    if (!node_->call(VIDIOC_QBUF, "VIDIOC_QBUF", &call.buffer, error)) return false;
  }
  return true;
}

bool CameraBuffers::map(std::uint32_t index, DiagnosticErrorPtr* error) {
  BufferCall call(*this, index);
  if (!node_->call(VIDIOC_QUERYBUF, "VIDIOC_QUERYBUF", &call.buffer, error)) return false;
  mapped_.emplace_back();
  if (!node_->isMultiplanar()) return mapPlane(call.buffer.length, call.buffer.m.offset, error);
  const std::size_t count = std::min<std::size_t>(call.buffer.length, call.planes.size());
  return std::ranges::all_of(std::span(call.planes).first(count), [&](const v4l2_plane& plane) {
    return mapPlane(plane.length, plane.m.mem_offset, error);
  });
}

// Maps a plane of the last buffer.
bool CameraBuffers::mapPlane(std::size_t length, std::uint32_t offset, DiagnosticErrorPtr* error) {
  Mapped mapped{nullptr, length};
  const int result = node_->kernel().map(node_->descriptor(), length, offset, &mapped.address);
  if (result < 0) {
    failSystemCall(error, "mmap", node_->path(), -result);
    return false;
  }
  mapped_.back().push_back(mapped);
  return true;
}

CameraBuffers::BufferCall::BufferCall(const CameraBuffers& buffers, std::uint32_t index) {
  buffer.index = index;
  buffer.type = buffers.type_;
  buffer.memory = V4L2_MEMORY_MMAP;
  if (!buffers.node_->isMultiplanar()) return;
  buffer.m.planes = planes.data();
  buffer.length = static_cast<std::uint32_t>(planes.size());
}

bool CameraBuffers::streamOn(DiagnosticErrorPtr* error) {
  int type = static_cast<int>(type_);
  streaming_ = node_->call(VIDIOC_STREAMON, "VIDIOC_STREAMON", &type, error);
  return streaming_;
}

bool CameraBuffers::release(DiagnosticErrorPtr* error) {
  bool succeeded = true;
  const auto firstError = [&] { return succeeded ? error : nullptr; };
  if (std::exchange(streaming_, false)) {
    int type = static_cast<int>(type_);
    if (!node_->call(VIDIOC_STREAMOFF, "VIDIOC_STREAMOFF", &type, firstError())) succeeded = false;
  }
  for (const std::vector<Mapped>& planes : std::exchange(mapped_, {})) {
    for (const Mapped& one : planes) node_->kernel().unmap(one.address, one.length);
  }
  refused_.clear();
  if (std::exchange(requested_, false)) {
    v4l2_requestbuffers request{};
    request.type = type_;
    request.memory = V4L2_MEMORY_MMAP;
    if (!node_->call(VIDIOC_REQBUFS, "VIDIOC_REQBUFS", &request, firstError())) succeeded = false;
  }
  return succeeded;
}

int CameraBuffers::dequeue(DequeuedBuffer& buffer) {
  BufferCall call(*this);
  const v4l2_buffer& taken = call.buffer;
  const int result = node_->call(VIDIOC_DQBUF, &call.buffer);
  if (result != 0) return result;
  buffer.index = taken.index;
  buffer.bytesUsed = taken.bytesused;  // 0 for a multi-planar node
  for (const v4l2_plane& plane : call.planes) buffer.bytesUsed += plane.bytesused;
  buffer.sequence = taken.sequence;
  buffer.isBad = (taken.flags & V4L2_BUF_FLAG_ERROR) != 0;
  // If the driver does not use the monotonic clock, the time of dequeuing is the best approximation.
  const bool isMonotonic = (taken.flags & V4L2_BUF_FLAG_TIMESTAMP_MASK) == V4L2_BUF_FLAG_TIMESTAMP_MONOTONIC;
  buffer.timestamp = isMonotonic ? timeOf(taken.timestamp) : node_->kernel().now();
  return 0;
}

std::span<const std::uint8_t> CameraBuffers::contents(const DequeuedBuffer& buffer) const {
  if (buffer.index >= mapped_.size() || mapped_[buffer.index].size() != 1) return {};
  const Mapped& mapped = mapped_[buffer.index].front();
  return {static_cast<const std::uint8_t*>(mapped.address), std::min<std::size_t>(buffer.bytesUsed, mapped.length)};
}

int CameraBuffers::queue(std::uint32_t index) {
  std::vector<std::uint32_t> waiting = std::exchange(refused_, {});
  waiting.push_back(index);
  int result = 0;
  for (const std::uint32_t one : waiting) {
    BufferCall call(*this, one);
    result = node_->call(VIDIOC_QBUF, &call.buffer);
    if (result != 0) refused_.push_back(one);
  }
  return result;
}

}  // namespace quazor
