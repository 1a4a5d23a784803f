// What of a text is UTF-8.
#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

namespace quazor {

struct Utf8Sequence {
  std::size_t length;  // in bytes
  bool wellFormed;
};

// The character at the front of a text that is not empty, by the Unicode standard's table of well-formed UTF-8; else
// as many bytes as a character could have begun with, at least one.
Utf8Sequence firstUtf8Sequence(std::string_view text);

// Where the first byte is that is not part of a well-formed character; nothing when the whole text is UTF-8.
std::optional<std::size_t> findInvalidUtf8(std::string_view text);

// True of every byte of a well-formed character but its first.
constexpr bool continuesUtf8(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U; }

}  // namespace quazor
