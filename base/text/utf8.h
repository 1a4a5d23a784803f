// What of a text is UTF-8.
#pragma once

#include <cstddef>
#include <string_view>

namespace quazor {

struct Utf8Sequence {
  std::size_t length;  // in bytes
  bool wellFormed;
};

// The character at the front of a text that is not empty, by the Unicode standard's table of well-formed UTF-8; else
// as many bytes as a character could have begun with, at least one.
Utf8Sequence firstUtf8Sequence(std::string_view text);

}  // namespace quazor
