// Buffers of the fake video driver.
#include "tests/support/fake_v4l2_api.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace quazor {
namespace {

// Where buffers and their planes can be mapped.
constexpr std::uint32_t kBufferOffset = 1U << 20;
constexpr std::uint32_t kPlaneOffset = 4096;

// The planes of a buffer have different sizes.
constexpr std::uint32_t planeSize(std::uint32_t plane) { return 64 + 32 * plane; }

std::uint32_t planesOf(const FakeNode& node) { return isMultiplanar(node) ? node.planes : 1; }

// As the kernel does it: the array must have room for all planes.
bool hasPlanes(const FakeNode& node, const v4l2_buffer& buffer) {
  return !isMultiplanar(node) ||
         (buffer.m.planes != nullptr && buffer.length >= node.planes && buffer.length <= VIDEO_MAX_PLANES);
}

bool isValid(const FakeNode& node, const v4l2_buffer& buffer) {
  return buffer.type == bufferTypeOf(node) && buffer.memory == V4L2_MEMORY_MMAP && hasPlanes(node, buffer);
}

}  // namespace

bool isMetadata(const FakeNode& node) { return (node.capabilities & V4L2_CAP_META_CAPTURE) != 0; }

bool isMultiplanar(const FakeNode& node) { return (node.capabilities & V4L2_CAP_VIDEO_CAPTURE_MPLANE) != 0; }

std::uint32_t bufferTypeOf(const FakeNode& node) {
  if (isMetadata(node)) return V4L2_BUF_TYPE_META_CAPTURE;
  return isMultiplanar(node) ? V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE : V4L2_BUF_TYPE_VIDEO_CAPTURE;
}

void FakeV4l2Api::fill(FakeNode& node, std::chrono::nanoseconds timestamp, std::uint32_t flags) {
  const std::uint32_t sequence = node.sequence++;
  if (!node.streaming || node.queued.empty() || node.gone || node.broken) return;
  v4l2_buffer buffer{};
  buffer.index = node.queued.front();
  node.queued.pop_front();
  buffer.sequence = sequence;
  buffer.flags = flags | node.timestampFlags;
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(timestamp);
  buffer.timestamp.tv_sec = seconds.count();
  buffer.timestamp.tv_usec = std::chrono::duration_cast<std::chrono::microseconds>(timestamp - seconds).count();
  buffer.bytesused = isMetadata(node) ? static_cast<std::uint32_t>(node.metadata.size()) : planeSize(0);
  for (auto& [address, mapping] : mappings_) {
    if (isMetadata(node) && mapping.path == node.path) std::ranges::copy(node.metadata, mapping.memory.begin());
  }
  node.filled.push_back(buffer);
}

int FakeV4l2Api::requestBuffers(FakeNode& node, int descriptor, v4l2_requestbuffers& request) {
  if (request.type != bufferTypeOf(node)) return EINVAL;
  if (node.owner >= 0 && node.owner != descriptor) return EBUSY;
  if (node.mapped > 0 || node.streaming) return EBUSY;
  node.buffers = std::min(request.count, node.mostBuffers);
  node.owner = node.buffers == 0 ? -1 : descriptor;
  request.count = node.buffers;
  return 0;
}

int FakeV4l2Api::queryBuffer(const FakeNode& node, v4l2_buffer& buffer) {
  if (!isValid(node, buffer) || buffer.index >= node.buffers) return EINVAL;
  const std::uint32_t offset = buffer.index * kBufferOffset;
  if (!isMultiplanar(node)) {
    buffer.length = planeSize(0);
    buffer.m.offset = offset;
    return 0;
  }
  buffer.length = node.planes;
  for (std::uint32_t plane = 0; plane < node.planes; ++plane) {
    buffer.m.planes[plane].length = planeSize(plane);
    buffer.m.planes[plane].m.mem_offset = offset + plane * kPlaneOffset;
  }
  return 0;
}

int FakeV4l2Api::queue(FakeNode& node, const v4l2_buffer& buffer) {
  if (!isValid(node, buffer)) return EINVAL;
  node.queued.push_back(buffer.index);
  return 0;
}

int FakeV4l2Api::dequeue(FakeNode& node, v4l2_buffer& buffer) {
  if (!isValid(node, buffer)) return EINVAL;
  if (node.broken) return EIO;
  if (!node.streaming) return EINVAL;
  if (node.filled.empty()) return EAGAIN;
  v4l2_plane* const planes = buffer.m.planes;
  buffer = node.filled.front();
  node.filled.pop_front();
  if (!isMultiplanar(node)) return 0;
  buffer.bytesused = 0;
  buffer.length = node.planes;
  buffer.m.planes = planes;
  for (std::uint32_t plane = 0; plane < node.planes; ++plane) planes[plane].bytesused = planeSize(plane);
  return 0;
}

bool FakeV4l2Api::isFree(const FakeNode& node, std::int64_t offset) const {
  return std::ranges::none_of(
      mappings_, [&](const auto& entry) { return entry.second.path == node.path && entry.second.offset == offset; });
}

int FakeV4l2Api::map(int descriptor, std::size_t length, std::int64_t offset, void** address) {
  const std::lock_guard lock(mutex_);
  FakeNode& node = nodes_.at(descriptors_.at(descriptor));
  if (failNextMaps > 0 && mapsBeforeFailure-- <= 0) {
    --failNextMaps;
    return -ENOMEM;
  }
  const auto plane = static_cast<std::uint32_t>(offset % kBufferOffset / kPlaneOffset);
  if (length != planeSize(plane) || plane >= planesOf(node) || !isFree(node, offset)) return -EINVAL;
  Mapping mapping{node.path, offset, std::vector<std::uint8_t>(length)};
  *address = mapping.memory.data();
  mappings_.emplace(*address, std::move(mapping));
  ++node.mapped;
  return 0;
}

void FakeV4l2Api::unmap(void* address, std::size_t /*length*/) {
  const std::lock_guard lock(mutex_);
  FakeNode& node = nodes_.at(mappings_.at(address).path);
  mappings_.erase(address);
  --node.mapped;
  if (node.mapped == 0 && node.owner < 0) node.buffers = 0;
}

}  // namespace quazor
