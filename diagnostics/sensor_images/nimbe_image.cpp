#include "diagnostics/sensor_images/nimbe_image.h"

#include <bit>
#include <cstring>

namespace quazor {

namespace {

constexpr std::size_t kFrameIDOffset = 4;
constexpr std::size_t kTimestampOffset = 12;
constexpr std::size_t kScanIOffset = 16;
constexpr std::size_t kScanQOffset = 208;
constexpr std::size_t kTemperatureOffset = 788;
constexpr std::size_t kScanBytes = 4 * kNimbeScanSize;

using RecordBytes = std::span<const std::uint8_t, kNimbeImageRecordSize>;

constexpr std::uint32_t reversed(std::uint32_t number) {
  return number << 24 | (number & 0xFF00) << 8 | (number >> 8 & 0xFF00) | number >> 24;
}
static_assert(reversed(0x12345678) == 0x78563412);

// Converts a number from the record's byte order to that of this machine.
constexpr std::uint32_t inOwnOrder(std::uint32_t number) {
  return std::endian::native == std::endian::little ? number : reversed(number);
}

std::uint32_t numberAt(RecordBytes record, std::size_t offset) {
  std::uint32_t number = 0;
  std::memcpy(&number, &record[offset], sizeof number);
  return inOwnOrder(number);
}

constexpr NimbeImageRecord kEmptyRecord{kNimbeImageReportID};

}  // namespace

QZNimbeCorvaneImage::QZNimbeCorvaneImage() : QZNimbeCorvaneImage(kEmptyRecord) {}

QZNimbeCorvaneImage::QZNimbeCorvaneImage(RecordBytes record)
    : _frameID(numberAt(record, kFrameIDOffset)),
      _dScanI(record.subspan<kScanIOffset, kScanBytes>()),
      _dScanQ(record.subspan<kScanQOffset, kScanBytes>()),
      _tmonDataInC(std::bit_cast<float>(numberAt(record, kTemperatureOffset))),
      _timestampInMilliseconds(numberAt(record, kTimestampOffset)) {}

// Copies all samples at once: on most machines the conversion does nothing, and the compiler removes the loop.
QZNimbeCorvaneImage::Scan::Scan(std::span<const std::uint8_t, 4 * kNimbeScanSize> bytes) {
  std::memcpy(samples_.data(), bytes.data(), sizeof samples_);
  for (std::int32_t& sample : samples_) {
    sample = static_cast<std::int32_t>(inOwnOrder(static_cast<std::uint32_t>(sample)));
  }
}

Array QZNimbeCorvaneImage::Scan::array() const {
  return replacement_ ? *replacement_ : Array(samples_.begin(), samples_.end());
}

}  // namespace quazor
