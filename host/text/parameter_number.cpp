#include "host/text/parameter_number.h"

#include "contract/message_format.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <system_error>

namespace quazor {

namespace {

template <class Number>
std::optional<Number> parseWhole(std::string_view text, std::errc* error) {
  Number number{};
  const char* const end = text.data() + text.size();
  const std::from_chars_result result = std::from_chars(text.data(), end, number);
  *error = result.ptr != end ? std::errc::invalid_argument : result.ec;
  return *error == std::errc() ? std::optional(number) : std::nullopt;
}

}  // namespace

std::optional<Value> parseNumber(std::string_view text, std::string* problem) {
  if (text.empty()) {
    *problem = "a number is missing";
    return std::nullopt;
  }
  std::errc error{};
  if (const auto number = parseWhole<std::int64_t>(text, &error)) return Value(*number);
  if (const auto number = parseWhole<std::uint64_t>(text, &error)) return Value(*number);
  const std::optional<double> number = parseWhole<double>(text, &error);
  if (number && std::isfinite(*number)) return Value(*number);
  if (number) {
    *problem = formatMessage("'%@' is not a finite number", text);
  } else if (error == std::errc::result_out_of_range) {
    *problem = formatMessage("'%@' is outside the range of numbers", text);
  } else {
    *problem = formatMessage("'%@' is not a number", text);
  }
  return std::nullopt;
}

}  // namespace quazor
