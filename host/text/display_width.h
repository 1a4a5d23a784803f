// How many columns of a terminal a text takes.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace quazor {

// A character or colour sequence at the beginning of a text.
struct Glyph {
  std::string_view bytes;
  std::size_t width;  // in columns
};

// The first glyph of a text that is not empty. East Asian wide characters take two columns; combining marks, invisible
// characters and colour sequences none; each byte that is not UTF-8 takes one.
Glyph firstGlyph(std::string_view text);

// The number of columns of one line of text, independent of the locale.
std::size_t widthOf(std::string_view text);

// The longest beginning of the text that takes at most `width` columns, with the marks of its last character.
std::string_view prefixOfWidth(std::string_view text, std::size_t width);

// The text if it takes at most `width` columns, else its beginning and "...".
std::string shortened(const std::string& text, std::size_t width);

}  // namespace quazor
