#include "host/xml_text.h"

#include <cstddef>

namespace quazor {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

struct Sequence {
  std::size_t length;
  bool wellFormed;
};

// The character at the front of a text that is not empty, by the Unicode standard's table of well-formed UTF-8; else
// as many bytes as a character could have begun with, at least one.
Sequence firstSequence(std::string_view text) {
  const auto byteAt = [text](std::size_t i) { return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U; };
  const unsigned lead = byteAt(0);
  if (lead < 0x80) return {1, true};
  if (lead < 0xC2 || lead > 0xF4) return {1, false};
  std::size_t length = 2;
  if (lead >= 0xE0) length = 3;
  if (lead >= 0xF0) length = 4;
  // The second byte's range is narrower after these: overlong forms, surrogates, beyond U+10FFFF.
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

bool isAllowed(std::string_view character) {
  const auto lead = static_cast<unsigned char>(character.front());
  if (lead < 0x20) return character == "\t" || character == "\n" || character == "\r";
  return character != "\xEF\xBF\xBE" && character != "\xEF\xBF\xBF";
}

// What stands for the character in XML; empty when it stands for itself.
std::string_view referenceOf(char character, bool inAttribute) {
  switch (character) {
    case '&': return "&amp;";
    case '<': return "&lt;";
    case '>': return "&gt;";
    case '"': return "&quot;";
    case '\r': return "&#13;";  // a reader makes a line feed of a plain one
    case '\t': return inAttribute ? "&#9;" : "";
    case '\n': return inAttribute ? "&#10;" : "";
    default: return "";
  }
}

std::string escaped(std::string_view text, bool inAttribute) {
  std::string xml;
  xml.reserve(text.size());
  while (!text.empty()) {
    const Sequence sequence = firstSequence(text);
    std::string_view character = text.substr(0, sequence.length);
    text.remove_prefix(sequence.length);
    if (!sequence.wellFormed || !isAllowed(character)) character = kReplacement;
    const std::string_view reference = referenceOf(character.front(), inAttribute);
    xml += reference.empty() ? character : reference;
  }
  return xml;
}

}  // namespace

std::string xmlText(std::string_view text) { return escaped(text, false); }

std::string xmlAttribute(std::string_view text) { return escaped(text, true); }

}  // namespace quazor
