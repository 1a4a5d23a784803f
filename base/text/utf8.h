// UTF-8 validation.
#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

namespace quazor {

struct Utf8Sequence {
  std::size_t length;  // in bytes
  bool wellFormed;
};

// The character at the beginning of a non-empty text, according to the Unicode standard's table of well-formed UTF-8;
// otherwise the bytes that could be the beginning of a character, at least one.
Utf8Sequence firstUtf8Sequence(std::string_view text);

// The offset of the first byte that is not part of a well-formed character; nothing if the text is valid UTF-8.
std::optional<std::size_t> findInvalidUtf8(std::string_view text);

// True for every byte of a well-formed character except the first.
constexpr bool continuesUtf8(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U; }

}  // namespace quazor
