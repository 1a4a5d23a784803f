#include "backends/linux/capture/camera_buffers.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace quazor {
namespace {

std::chrono::nanoseconds timeOf(const timeval& time) {
  return std::chrono::seconds(time.tv_sec) + std::chrono::microseconds(time.tv_usec);
}

}  // namespace

CameraBuffers::CameraBuffers(std::shared_ptr<V4l2Device> node, std::uint32_t type)
    : node_(std::move(node)), type_(type) {}

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
    v4l2_buffer buffer = bufferOf(index);
    if (!node_->call(VIDIOC_QBUF, "VIDIOC_QBUF", &buffer, error)) return false;
  }
  return true;
}

bool CameraBuffers::map(std::uint32_t index, DiagnosticErrorPtr* error) {
  v4l2_buffer buffer = bufferOf(index);
  if (!node_->call(VIDIOC_QUERYBUF, "VIDIOC_QUERYBUF", &buffer, error)) return false;
  Mapped mapped{nullptr, buffer.length};
  const int result = node_->kernel().map(node_->descriptor(), mapped.length, buffer.m.offset, &mapped.address);
  if (result < 0) {
    failSystemCall(error, "mmap", node_->path(), -result);
    return false;
  }
  mapped_.push_back(mapped);
  return true;
}

v4l2_buffer CameraBuffers::bufferOf(std::uint32_t index) const {
  v4l2_buffer buffer{};
  buffer.index = index;
  buffer.type = type_;
  buffer.memory = V4L2_MEMORY_MMAP;
  return buffer;
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
  for (const Mapped& one : std::exchange(mapped_, {})) node_->kernel().unmap(one.address, one.length);
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
  v4l2_buffer taken = bufferOf(0);
  const int result = node_->call(VIDIOC_DQBUF, &taken);
  if (result != 0) return result;
  buffer.index = taken.index;
  buffer.bytesUsed = taken.bytesused;
  buffer.sequence = taken.sequence;
  buffer.isBad = (taken.flags & V4L2_BUF_FLAG_ERROR) != 0;
  // If the driver does not use the monotonic clock, the time of dequeuing is the best approximation.
  const bool isMonotonic = (taken.flags & V4L2_BUF_FLAG_TIMESTAMP_MASK) == V4L2_BUF_FLAG_TIMESTAMP_MONOTONIC;
  buffer.timestamp = isMonotonic ? timeOf(taken.timestamp) : node_->kernel().now();
  return 0;
}

std::span<const std::uint8_t> CameraBuffers::contents(const DequeuedBuffer& buffer) const {
  if (buffer.index >= mapped_.size()) return {};
  const Mapped& mapped = mapped_[buffer.index];
  return {static_cast<const std::uint8_t*>(mapped.address), std::min<std::size_t>(buffer.bytesUsed, mapped.length)};
}

int CameraBuffers::queue(std::uint32_t index) {
  std::vector<std::uint32_t> waiting = std::exchange(refused_, {});
  waiting.push_back(index);
  int result = 0;
  for (const std::uint32_t one : waiting) {
    v4l2_buffer buffer = bufferOf(one);
    result = node_->call(VIDIOC_QBUF, &buffer);
    if (result != 0) refused_.push_back(one);
  }
  return result;
}

}  // namespace quazor
