// Hexadecimal digits.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace quazor {

// Two lowercase digits per byte.
std::string hexadecimal(std::string_view bytes);
std::string hexadecimal(std::span<const std::uint8_t> bytes);

// Decodes the output of hexadecimal(). Throws InputError, "odd number of hexadecimal digits" or "invalid hexadecimal
// digit"; uppercase digits are not accepted.
std::string parseHexadecimal(std::string_view text);

// "0x00AC": the number with at least `digits` uppercase digits.
std::string hexadecimalNumber(std::uint64_t number, std::size_t digits);

}  // namespace quazor
