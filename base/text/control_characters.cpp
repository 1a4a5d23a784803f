#include "base/text/control_characters.h"

#include "base/text/utf8.h"

namespace quazor {

bool isControlCharacter(std::string_view character) {
  const auto byteAt = [character](std::size_t i) { return static_cast<unsigned char>(character[i]); };
  if (character.size() == 1) return byteAt(0) < 0x20 || byteAt(0) == 0x7F;
  return character.size() == 2 && byteAt(0) == 0xC2 && byteAt(1) >= 0x80 && byteAt(1) < 0xA0;
}

bool hasControlCharacter(std::string_view text) {
  while (!text.empty()) {
    const std::size_t length = firstUtf8Sequence(text).length;
    if (isControlCharacter(text.substr(0, length))) return true;
    text.remove_prefix(length);
  }
  return false;
}

}  // namespace quazor
