#include "host/text/parameter_number.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <optional>
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

Value parseNumber(std::string_view text) {
  if (text.empty()) throw InputError("a number is missing");
  std::errc error{};
  if (const auto number = parseWhole<std::int64_t>(text, &error)) return *number;
  if (const auto number = parseWhole<std::uint64_t>(text, &error)) return *number;
  const std::optional<double> number = parseWhole<double>(text, &error);
  if (error == std::errc::result_out_of_range) {
    throw InputError(formatMessage("'%@' is outside the range of numbers", text));
  }
  if (!number) throw InputError(formatMessage("'%@' is not a number", text));
  if (!std::isfinite(*number)) throw InputError(formatMessage("'%@' is not a finite number", text));
  return *number;
}

}  // namespace quazor
