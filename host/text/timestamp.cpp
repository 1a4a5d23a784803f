#include "host/text/timestamp.h"

#include <charconv>
#include <chrono>
#include <cstdint>
#include <system_error>

namespace quazor {

namespace {

constexpr std::string_view kForm = "0000-00-00T00:00:00.000000000Z";

std::string padded(std::uint64_t number, std::size_t width) {
  const std::string digits = std::to_string(number);
  return digits.size() < width ? std::string(width - digits.size(), '0') + digits : digits;
}

// Parses the decimal digits at that place of a text that matches kForm.
std::int64_t numberAt(std::string_view text, std::size_t begin, std::size_t length) {
  std::int64_t number = 0;
  std::from_chars(text.data() + begin, text.data() + begin + length, number);
  return number;
}

bool hasForm(std::string_view text) {
  if (text.size() != kForm.size()) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool digit = text[i] >= '0' && text[i] <= '9';
    if (kForm[i] == '0' ? !digit : text[i] != kForm[i]) return false;
  }
  return true;
}

}  // namespace

Date dateNow() { return std::chrono::time_point_cast<Date::duration>(std::chrono::system_clock::now()); }

std::string timestampText(Date date) {
  using namespace std::chrono;
  const auto day = floor<days>(date);
  const year_month_day calendar(day);
  const hh_mm_ss time(date - day);
  return padded(static_cast<std::uint64_t>(static_cast<int>(calendar.year())), 4) + "-" +
         padded(static_cast<unsigned>(calendar.month()), 2) + "-" + padded(static_cast<unsigned>(calendar.day()), 2) +
         "T" + padded(static_cast<std::uint64_t>(time.hours().count()), 2) + ":" +
         padded(static_cast<std::uint64_t>(time.minutes().count()), 2) + ":" +
         padded(static_cast<std::uint64_t>(time.seconds().count()), 2) + "." +
         padded(static_cast<std::uint64_t>(time.subseconds().count()), 9) + "Z";
}

std::optional<Date> parseTimestamp(std::string_view text) {
  using namespace std::chrono;
  if (!hasForm(text)) return std::nullopt;
  const year_month_day calendar(year(static_cast<int>(numberAt(text, 0, 4))),
                                month(static_cast<unsigned>(numberAt(text, 5, 2))),
                                day(static_cast<unsigned>(numberAt(text, 8, 2))));
  const std::int64_t hour = numberAt(text, 11, 2);
  const std::int64_t minute = numberAt(text, 14, 2);
  const std::int64_t second = numberAt(text, 17, 2);
  // The range of 64-bit nanoseconds in complete years.
  constexpr int kFirstYear = 1678;
  constexpr int kLastYear = 2261;
  const int ofYear = static_cast<int>(calendar.year());
  if (!calendar.ok() || ofYear < kFirstYear || ofYear > kLastYear || hour > 23 || minute > 59 || second > 59) {
    return std::nullopt;
  }
  return Date(sys_days(calendar)) + hours(hour) + minutes(minute) + seconds(second) +
         nanoseconds(numberAt(text, 20, 9));
}

}  // namespace quazor
