#include "base/text/base64.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace quazor {

std::string base64(std::string_view bytes) {
  constexpr std::string_view kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  constexpr std::size_t kGroup = 3;  // bytes, which are four digits
  std::string text;
  text.reserve((bytes.size() + kGroup - 1) / kGroup * 4);
  for (std::size_t at = 0; at < bytes.size(); at += kGroup) {
    const std::size_t count = std::min(kGroup, bytes.size() - at);
    std::uint32_t bits = 0;
    for (std::size_t i = 0; i < kGroup; ++i) {
      bits = bits << 8U | (i < count ? static_cast<unsigned char>(bytes[at + i]) : 0U);
    }
    for (std::size_t digit = 0; digit < 4; ++digit) {
      text += digit <= count ? kDigits[bits >> (18 - 6 * digit) & 0x3FU] : '=';
    }
  }
  return text;
}

}  // namespace quazor
