#include "host/text/number_text.h"

#include <charconv>
#include <iterator>

namespace quazor {

std::string significantDigits(double value, int digits) {
  char text[32];  // 17 digits, a sign, a point and an exponent
  const auto [end, ignored] =
      std::to_chars(std::begin(text), std::end(text), value, std::chars_format::general, digits);
  return {text, end};
}

}  // namespace quazor
