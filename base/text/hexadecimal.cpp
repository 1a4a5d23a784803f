#include "base/text/hexadecimal.h"

#include "base/text/input_error.h"

namespace quazor {

namespace {

constexpr std::string_view kLowercaseDigits = "0123456789abcdef";
constexpr std::string_view kUppercaseDigits = "0123456789ABCDEF";

unsigned numberOfDigit(char digit) {
  const std::size_t number = kLowercaseDigits.find(digit);
  if (number == std::string_view::npos) throw InputError("invalid hexadecimal digit");
  return static_cast<unsigned>(number);
}

}  // namespace

std::string hexadecimal(std::string_view bytes) {
  std::string text;
  text.reserve(2 * bytes.size());
  for (const char byte : bytes) {
    text += kLowercaseDigits[static_cast<std::uint8_t>(byte) >> 4U];
    text += kLowercaseDigits[static_cast<std::uint8_t>(byte) & 0x0FU];
  }
  return text;
}

std::string hexadecimal(std::span<const std::uint8_t> bytes) {
  return hexadecimal(std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
}

std::string parseHexadecimal(std::string_view text) {
  if (text.size() % 2 != 0) throw InputError("odd number of hexadecimal digits");
  std::string bytes;
  bytes.reserve(text.size() / 2);
  for (std::size_t i = 0; i < text.size(); i += 2) {
    bytes += static_cast<char>(numberOfDigit(text[i]) << 4U | numberOfDigit(text[i + 1]));
  }
  return bytes;
}

std::string hexadecimalNumber(std::uint64_t number, std::size_t digits) {
  std::string text;
  for (; number != 0 || text.size() < digits; number >>= 4U) text.insert(0, 1, kUppercaseDigits[number & 0x0FU]);
  return "0x" + text;
}

}  // namespace quazor
