// One scan image of the display sensor: the raw record sent by the sensor, and the values parsed from it.
#pragma once

#include "contract/value.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <utility>

namespace quazor {

// The record is a complete input report with ID 0x76, beginning with the ID byte, packed and little-endian:
//
//   offset  size
//        0     1  report ID
//        1     3  reserved
//        4     4  frame ID, unsigned
//        8     4  reserved
//       12     4  timestamp in milliseconds, unsigned
//       16   192  scan block 1, channel I: 48 signed samples of 4 bytes
//      208   192  scan block 1, channel Q: 48 signed samples of 4 bytes
//      400   384  scan block 2, of the same shape
//      784     4  reserved
//      788     4  temperature in degrees Celsius, a 32-bit IEEE float
//
// Only the frame ID, the timestamp, scan block 1 and the temperature are read.
inline constexpr std::uint8_t kNimbeImageReportID = 0x76;
inline constexpr std::size_t kNimbeImageRecordSize = 792;
inline constexpr std::size_t kNimbeScanSize = 48;
using NimbeImageRecord = std::array<std::uint8_t, kNimbeImageRecordSize>;

// The values of one record. The samples are stored as plain numbers and converted to Values on demand.
// Thread: one at a time; any number may read while none writes.
class QZNimbeCorvaneImage {
 public:
  // The image of a record whose bytes after the report ID are all zero.
  QZNimbeCorvaneImage();
  // Parses a record without keeping a reference to it.
  explicit QZNimbeCorvaneImage(std::span<const std::uint8_t, kNimbeImageRecordSize> record);

  // An unsigned number.
  const Value& frameID() const { return _frameID; }
  void setFrameID(Value frameID) { _frameID = std::move(frameID); }
  // 48 signed numbers each, in sample order: in phase, and in quadrature.
  Array dScanI() const { return _dScanI.array(); }
  void setDScanI(Array samples) { _dScanI.replace(std::move(samples)); }
  Array dScanQ() const { return _dScanQ.array(); }
  void setDScanQ(Array samples) { _dScanQ.replace(std::move(samples)); }
  // In degrees Celsius, a 32-bit float.
  const Value& tmonDataInC() const { return _tmonDataInC; }
  void setTmonDataInC(Value temperature) { _tmonDataInC = std::move(temperature); }
  // An unsigned number.
  const Value& timestampInMilliseconds() const { return _timestampInMilliseconds; }
  void setTimestampInMilliseconds(Value timestamp) { _timestampInMilliseconds = std::move(timestamp); }

 private:
  // The samples of one channel, or the array that replaced them.
  class Scan {
   public:
    explicit Scan(std::span<const std::uint8_t, 4 * kNimbeScanSize> bytes);

    Array array() const;
    void replace(Array samples) { replacement_ = std::move(samples); }

   private:
    std::array<std::int32_t, kNimbeScanSize> samples_;
    std::optional<Array> replacement_;
  };

  Value _frameID;
  Scan _dScanI;
  Scan _dScanQ;
  Value _tmonDataInC;
  Value _timestampInMilliseconds;
};

}  // namespace quazor
