#include "base/text/letter_case.h"

namespace quazor {

namespace {

constexpr char kToSmall = 'a' - 'A';

}  // namespace

std::string withSmallLetters(std::string_view text) {
  std::string small(text);
  for (char& unit : small) {
    if (unit >= 'A' && unit <= 'Z') unit = static_cast<char>(unit + kToSmall);
  }
  return small;
}

std::string capitalized(std::string_view text) {
  std::string sentence(text);
  if (!sentence.empty() && sentence.front() >= 'a' && sentence.front() <= 'z') {
    sentence.front() = static_cast<char>(sentence.front() - kToSmall);
  }
  return sentence;
}

}  // namespace quazor
