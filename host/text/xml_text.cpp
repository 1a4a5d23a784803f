#include "host/text/xml_text.h"

#include "base/text/utf8.h"

namespace quazor {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

bool isAllowed(std::string_view character) {
  const auto lead = static_cast<unsigned char>(character.front());
  if (lead < 0x20) return character == "\t" || character == "\n" || character == "\r";
  return character != "\xEF\xBF\xBE" && character != "\xEF\xBF\xBF";
}

// The XML escape of the character; empty if it needs none.
std::string_view referenceOf(char character, bool inAttribute) {
  switch (character) {
    case '&': return "&amp;";
    case '<': return "&lt;";
    case '>': return "&gt;";
    case '"': return "&quot;";
    case '\r': return "&#13;";  // a parser would turn a literal one into a line feed
    case '\t': return inAttribute ? "&#9;" : "";
    case '\n': return inAttribute ? "&#10;" : "";
    default: return "";
  }
}

std::string escaped(std::string_view text, bool inAttribute) {
  std::string xml;
  xml.reserve(text.size());
  while (!text.empty()) {
    const Utf8Sequence sequence = firstUtf8Sequence(text);
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
