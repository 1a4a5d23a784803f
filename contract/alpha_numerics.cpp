#include "contract/alpha_numerics.h"

#include "contract/alpha_numerics_table.h"

#include <algorithm>
#include <cstddef>
#include <optional>

namespace QUAZOR_CONTRACT {

namespace {

// The information in the first byte of a UTF-8 character (the Unicode Standard, chapter 3, table 3-7).
struct LeadByte {
  std::size_t length;  // of the character in bytes; 0 if no character begins with this byte
  char32_t bits;       // the bits of the code point in this byte
  char32_t lowest;     // the first code point that needs that many bytes
};

LeadByte readLeadByte(unsigned char byte) {
  if (byte < 0x80U) return {1, byte, 0};
  if (byte < 0xC0U) return {0, 0, 0};  // continues a character
  if (byte < 0xE0U) return {2, byte & 0x1FU, 0x80};
  if (byte < 0xF0U) return {3, byte & 0x0FU, 0x800};
  if (byte < 0xF8U) return {4, byte & 0x07U, 0x10000};
  return {0, 0, 0};
}

// Removes the first character from `text`, which must not be empty; returns nothing if its bytes do not follow the
// scheme of UTF-8. May return surrogates and numbers beyond the last code point; no range of the table contains them.
std::optional<char32_t> takeCharacter(std::string_view& text) {
  const LeadByte lead = readLeadByte(static_cast<unsigned char>(text.front()));
  if (lead.length == 0 || text.size() < lead.length) return std::nullopt;
  char32_t character = lead.bits;
  for (const char next : text.substr(1, lead.length - 1)) {
    const auto byte = static_cast<unsigned char>(next);
    if ((byte & 0xC0U) != 0x80U) return std::nullopt;
    character = character << 6U | (byte & 0x3FU);
  }
  if (character < lead.lowest) return std::nullopt;
  text.remove_prefix(lead.length);
  return character;
}

bool isAlphaNumericCharacter(char32_t character) {
  const auto ranges = alphaNumericRanges();
  const auto range = std::ranges::lower_bound(ranges, character, {}, &CodePointRange::last);
  return range != ranges.end() && range->first <= character;
}

}  // namespace

bool isAlphaNumeric(std::string_view utf8) {
  while (!utf8.empty()) {
    const std::optional<char32_t> character = takeCharacter(utf8);
    if (!character || !isAlphaNumericCharacter(*character)) return false;
  }
  return true;
}

}  // namespace QUAZOR_CONTRACT
