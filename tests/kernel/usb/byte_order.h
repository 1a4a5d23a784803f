// Numbers of up to eight bytes in the byte order of a protocol: USB's is little-endian, that of USB/IP big-endian.
#pragma once

#include "contract/value.h"

#include <cstddef>
#include <cstdint>
#include <span>

namespace quazor {

inline void addLittle(Bytes& to, std::uint64_t number, std::size_t bytes) {
  for (std::size_t i = 0; i < bytes; ++i) to.push_back(static_cast<std::uint8_t>(number >> (8 * i)));
}

inline void addBig(Bytes& to, std::uint64_t number, std::size_t bytes) {
  for (std::size_t i = bytes; i-- > 0;) to.push_back(static_cast<std::uint8_t>(number >> (8 * i)));
}

// The number at the offset, which must be within `from`.
inline std::uint64_t littleAt(std::span<const std::uint8_t> from, std::size_t offset, std::size_t bytes) {
  std::uint64_t number = 0;
  for (std::size_t i = bytes; i-- > 0;) number = number << 8 | from[offset + i];
  return number;
}

inline std::uint64_t bigAt(std::span<const std::uint8_t> from, std::size_t offset, std::size_t bytes) {
  std::uint64_t number = 0;
  for (std::size_t i = 0; i < bytes; ++i) number = number << 8 | from[offset + i];
  return number;
}

inline void addZeros(Bytes& to, std::size_t bytes) { to.insert(to.end(), bytes, 0); }
inline void append(Bytes& to, std::span<const std::uint8_t> more) { to.insert(to.end(), more.begin(), more.end()); }

}  // namespace quazor
