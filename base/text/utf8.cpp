#include "base/text/utf8.h"

namespace quazor {

Utf8Sequence firstUtf8Sequence(std::string_view text) {
  const auto byteAt = [text](std::size_t i) { return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U; };
  const unsigned lead = byteAt(0);
  if (lead < 0x80) return {1, true};
  if (lead < 0xC2 || lead > 0xF4) return {1, false};
  std::size_t length = 2;
  if (lead >= 0xE0) length = 3;
  if (lead >= 0xF0) length = 4;
  // After these first bytes the range of the second byte is narrower: overlong forms, surrogates, beyond U+10FFFF.
  unsigned low = 0x80;
  unsigned high = 0xBF;
  if (lead == 0xE0) low = 0xA0;
  if (lead == 0xED) high = 0x9F;
  if (lead == 0xF0) low = 0x90;
  if (lead == 0xF4) high = 0x8F;
  for (std::size_t i = 1; i < length; ++i) {
    const unsigned byte = byteAt(i);
    if (byte < low || byte > high) return {i, false};
    low = 0x80;
    high = 0xBF;
  }
  return {length, true};
}

std::optional<std::size_t> findInvalidUtf8(std::string_view text) {
  std::size_t at = 0;
  while (at < text.size()) {
    const Utf8Sequence sequence = firstUtf8Sequence(text.substr(at));
    if (!sequence.wellFormed) return at;
    at += sequence.length;
  }
  return std::nullopt;
}

}  // namespace quazor
