// Hexadecimal digits.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace quazor {

// Two lowercase digits for each byte.
std::string hexadecimal(std::string_view bytes);
std::string hexadecimal(std::span<const std::uint8_t> bytes);

// The bytes that hexadecimal() wrote. Throws InputError, "hexadecimal digits are not in pairs" or "a hexadecimal digit
// is wrong", also for uppercase digits.
std::string parseHexadecimal(std::string_view text);

// "0x00AC": the number in at least `digits` uppercase digits.
std::string hexadecimalNumber(std::uint64_t number, std::size_t digits);

}  // namespace quazor
