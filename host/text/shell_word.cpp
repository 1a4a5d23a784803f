#include "host/text/shell_word.h"

namespace quazor {

std::string shellWord(std::string_view text) {
  constexpr std::string_view kPlain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_./:=,+-";
  if (!text.empty() && text.find_first_not_of(kPlain) == std::string_view::npos) return std::string(text);
  std::string word = "'";
  for (const char unit : text) {
    if (unit == '\'') {
      word += R"('\'')";
    } else {
      word += unit;
    }
  }
  return word + "'";
}

}  // namespace quazor
