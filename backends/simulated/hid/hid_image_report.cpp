#include "backends/simulated/hid/hid_image_report.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <numbers>

namespace quazor {
namespace {

constexpr std::size_t kFrameID = 4;
constexpr std::size_t kTimestamp = 12;
constexpr std::size_t kFirstBlock = 16;
constexpr std::size_t kSecondBlock = 400;
constexpr std::size_t kTemperature = 788;
constexpr std::size_t kSamples = 48;
constexpr std::size_t kQ = 4 * kSamples;  // offset in a block, after the I samples
constexpr std::uint8_t kReserved = 0xA5;

void write32(Bytes& bytes, std::size_t at, std::uint32_t value) {
  for (std::size_t i = 0; i < 4; ++i) bytes[at + i] = static_cast<std::uint8_t>(value >> (8 * i));
}

std::int32_t sampleOf(double value) {
  constexpr double kMinimum = std::numeric_limits<std::int32_t>::min();
  constexpr double kMaximum = std::numeric_limits<std::int32_t>::max();
  return static_cast<std::int32_t>(std::clamp(std::round(value), kMinimum, kMaximum));
}

void writeBlocks(Bytes& bytes, const HidImages& images, std::uint64_t number) {
  const double start = static_cast<double>(number) * images.phaseStepPerImage;
  for (std::size_t sample = 0; sample < kSamples; ++sample) {
    const double angle = (start + static_cast<double>(sample) * images.phaseStep) * std::numbers::pi / 180;
    const auto i = static_cast<std::uint32_t>(sampleOf(images.offsetI + images.amplitude * std::cos(angle)));
    const auto q = static_cast<std::uint32_t>(sampleOf(images.offsetQ + images.amplitude * std::sin(angle)));
    write32(bytes, kFirstBlock + 4 * sample, i);
    write32(bytes, kFirstBlock + kQ + 4 * sample, q);
    write32(bytes, kSecondBlock + 4 * sample, 0 - i);
    write32(bytes, kSecondBlock + kQ + 4 * sample, 0 - q);
  }
}

}  // namespace

Bytes hidInputReport(const HidImages& images, const HidReportShape& shape, std::uint64_t number,
                     std::chrono::nanoseconds now) {
  Bytes bytes(kHidImageReportLength, kReserved);
  bytes[0] = shape.reportID.value_or(kHidImageReportID);
  write32(bytes, kFrameID, images.firstFrameID + static_cast<std::uint32_t>(number));
  write32(bytes, kTimestamp, static_cast<std::uint32_t>(std::chrono::floor<std::chrono::milliseconds>(now).count()));
  writeBlocks(bytes, images, number);
  write32(bytes, kTemperature, std::bit_cast<std::uint32_t>(images.temperature));
  if (shape.length) bytes.resize(*shape.length);
  return bytes;
}

}  // namespace quazor
