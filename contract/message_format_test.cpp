#include "contract/message_format.h"

#include "contract/diagnostic_error.h"

#include <gtest/gtest.h>

#include <clocale>
#include <cstdint>
#include <limits>
#include <locale>
#include <string>

namespace quazor {
namespace {

class Lamp final : public Object {
 public:
  explicit Lamp(std::string text) : text_(std::move(text)) {}
  std::string description() const override { return text_; }

 private:
  std::string text_;
};

constexpr double kMaxDouble = std::numeric_limits<double>::max();
constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNan = std::numeric_limits<double>::quiet_NaN();

// The formats that the compiler rejects, and the reasons.
static_assert(checkFormat<>("") == FormatFault::kNone);
static_assert(checkFormat<>("plain, and 100%%") == FormatFault::kNone);
static_assert(checkFormat<>("%%@") == FormatFault::kNone);
static_assert(checkFormat<int, unsigned, double, float, std::string>("%d%lu%lf%lf%@") == FormatFault::kNone);
static_assert(checkFormat<bool>("%@") == FormatFault::kNone);

static_assert(checkFormat<int>("%x") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<int>("%") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<int>("%l") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<int>("%ld") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<std::string>("%s") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<double>("%.2lf") == FormatFault::kUnknownPlaceholder);
static_assert(checkFormat<int>("% d") == FormatFault::kUnknownPlaceholder);

static_assert(checkFormat<>("%@") == FormatFault::kTooFewArguments);
static_assert(checkFormat<int>("%d %d") == FormatFault::kTooFewArguments);
static_assert(checkFormat<int>("") == FormatFault::kTooManyArguments);
static_assert(checkFormat<int, int>("%d%%") == FormatFault::kTooManyArguments);

static_assert(checkFormat<std::string>("%d") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<unsigned>("%d") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<std::int64_t>("%d") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<bool>("%d") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<int>("%lu") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<bool>("%lu") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<int>("%lf") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<Value>("%lf") == FormatFault::kArgumentOfWrongType);
static_assert(checkFormat<int, int>("%d%lu") == FormatFault::kArgumentOfWrongType);
// Small integer types are accepted.
static_assert(checkFormat<short, signed char>("%d%d") == FormatFault::kNone);
static_assert(checkFormat<std::uint8_t, std::uint64_t>("%lu%lu") == FormatFault::kNone);

TEST(FormatMessageTest, InsertsEachArgumentAtItsPlaceholder) {
  EXPECT_EQ(formatMessage(""), "");
  EXPECT_EQ(formatMessage("no placeholder"), "no placeholder");
  EXPECT_EQ(formatMessage("%@", "whole"), "whole");
  EXPECT_EQ(formatMessage("lamp %@ of %lu at %lf in %d", "front", 3U, 0.5, -2), "lamp front of 3 at 0.500000 in -2");
  EXPECT_EQ(formatMessage("%@%@%@", 1, 2, 3), "123");
  EXPECT_EQ(formatMessage("(%@)", std::string(1000, 'x')), "(" + std::string(1000, 'x') + ")");
}

TEST(FormatMessageTest, TwoPercentSignsMakeOne) {
  EXPECT_EQ(formatMessage("%%"), "%");
  EXPECT_EQ(formatMessage("%%%%"), "%%");
  EXPECT_EQ(formatMessage("100%% of %@%%", 7), "100% of 7%");
  EXPECT_EQ(formatMessage("%%@ %%d %%lu"), "%@ %d %lu");
}

TEST(FormatMessageTest, ReadsNoFormatInTextThatIsInserted) {
  for (const char* text : {"%@", "%d", "%%", "%s%n", "%lu", "%", "%l"}) {
    EXPECT_EQ(formatMessage("<%@> %d", text, 1), "<" + std::string(text) + "> 1");
    EXPECT_EQ(formatMessage("<%@> %d", Value(Array{text}), 1), "<(" + std::string(text) + ")> 1");
  }
}

TEST(FormatMessageTest, WritesSignedIntegersInDecimal) {
  EXPECT_EQ(formatMessage("%d", 0), "0");
  EXPECT_EQ(formatMessage("%d", -1), "-1");
  EXPECT_EQ(formatMessage("%d", std::numeric_limits<int>::max()), "2147483647");
  EXPECT_EQ(formatMessage("%d", std::numeric_limits<int>::min()), "-2147483648");
  EXPECT_EQ(formatMessage("%d", static_cast<signed char>('a')), "97");
  EXPECT_EQ(formatMessage("%d", static_cast<short>(-300)), "-300");
}

TEST(FormatMessageTest, WritesUnsignedIntegersInDecimal) {
  EXPECT_EQ(formatMessage("%lu", 0U), "0");
  EXPECT_EQ(formatMessage("%lu", static_cast<unsigned char>('a')), "97");
  EXPECT_EQ(formatMessage("%lu", std::numeric_limits<std::uint64_t>::max()), "18446744073709551615");
}

TEST(FormatMessageTest, WritesFixedPointWithSixDigits) {
  const struct {
    const char* name;
    double number;
    const char* expected;
  } kRows[] = {
      {"zero", 0.0, "0.000000"},
      {"minus zero", -0.0, "-0.000000"},
      {"a third", 1.0 / 3.0, "0.333333"},
      {"rounded up", 2.0 / 3.0, "0.666667"},
      {"an exact tie goes to even", 1.0 / 128, "0.007812"},
      {"carries into the whole part", 0.9999999, "1.000000"},
      {"too small to see", 1e-9, "0.000000"},
      {"negative", -36.6, "-36.600000"},
      {"the smallest", std::numeric_limits<double>::denorm_min(), "0.000000"},
      {"infinity", kInfinity, "inf"},
      {"minus infinity", -kInfinity, "-inf"},
      {"not a number", kNan, "nan"},
  };
  for (const auto& row : kRows) EXPECT_EQ(formatMessage("%lf", row.number), row.expected) << row.name;
  EXPECT_EQ(formatMessage("%lf", 0.25F), "0.250000");
  EXPECT_EQ(formatMessage("%lf", 0.1F), "0.100000");
}

TEST(FormatMessageTest, WritesTheLargestDoublesWithAllTheirDigits) {
  for (const double number : {kMaxDouble, -kMaxDouble}) {
    const std::string text = formatMessage("%lf", number);
    const std::string digits = number < 0 ? text.substr(1) : text;
    EXPECT_EQ(digits.size(), 309U + 7U);
    EXPECT_EQ(digits.substr(0, 16), "1797693134862315");
    EXPECT_EQ(digits.substr(309), ".000000");
    EXPECT_EQ(std::stod(text), number);
  }
}

// Each value is formatted twice: with its own type and as a Value.
TEST(DefaultTextTest, IsTheSameForAnArgumentAndForAValueOfIt) {
  const auto check = [](const auto& argument, const char* expected) {
    EXPECT_EQ(formatMessage("%@", argument), expected);
    EXPECT_EQ(formatMessage("%@", Value(argument)), expected);
    EXPECT_EQ(defaultText(argument), expected);
  };
  check(true, "1");
  check(false, "0");
  check(0, "0");
  check(std::numeric_limits<std::int64_t>::min(), "-9223372036854775808");
  check(std::numeric_limits<std::uint64_t>::max(), "18446744073709551615");
  check("text", "text");
  check("", "");
  check(std::string("text"), "text");
  check(std::string_view("text"), "text");
  check(Array{}, "()");
  check(Array{1}, "(1)");
  check(Array{1, "b", 0.5, true}, "(1, b, 0.5, 1)");
  check(Array{Array{}, Array{1, Array{2}}}, "((), (1, (2)))");
  check(Dictionary{}, "{}");
  check(Dictionary{{"k", 1}}, "{k = 1}");
  check(Dictionary{{"z", "v"}, {"a", Array{1, 2}}, {"d", Dictionary{{"e", Bytes{}}}}},
        "{z = v; a = (1, 2); d = {e = }}");
  check(Bytes{}, "");
  check(Bytes{0x00, 0x0F, 0xA5, 0xFF}, "000fa5ff");
  check(std::make_shared<Lamp>("lamp %@ in front"), "lamp %@ in front");
  check(makeError("LampDomain", -7, "Too dark: %@", 3), "LampDomain code -7: Too dark: 3");
}

TEST(DefaultTextTest, FloatingPointIsTheShortestThatReadsBack) {
  const struct {
    double number;
    const char* expected;
  } kRows[] = {
      {0, "0"},
      {-0.0, "-0"},
      {3, "3"},
      {0.5, "0.5"},
      {36.6, "36.6"},
      {-36.6, "-36.6"},
      {0.1 + 0.2, "0.30000000000000004"},
      {1.0 / 3.0, "0.3333333333333333"},
      {12345, "12345"},
      {100000, "1e+05"},
      {123456789, "123456789"},
      {1e22, "1e+22"},
      {0.001, "0.001"},
      {0.0001, "1e-04"},
      {kMaxDouble, "1.7976931348623157e+308"},
      {-std::numeric_limits<double>::denorm_min(), "-5e-324"},
      {kInfinity, "inf"},
      {-kInfinity, "-inf"},
      {kNan, "nan"},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(formatMessage("%@", row.number), row.expected);
    EXPECT_EQ(formatMessage("%@", Value(row.number)), row.expected);
  }
}

TEST(DefaultTextTest, AFloatIsAsShortAsItsOwnPrecisionAllows) {
  for (const auto& [number, expected] : {std::pair(36.6F, "36.6"), std::pair(0.1F, "0.1"), std::pair(3.0F, "3"),
                                         std::pair(std::numeric_limits<float>::max(), "3.4028235e+38")}) {
    EXPECT_EQ(formatMessage("%@", number), expected);
    EXPECT_EQ(formatMessage("%@", Value(number)), expected);
  }
}

TEST(DefaultTextTest, ADateIsWrittenInUtcToTheSecond) {
  using std::chrono::nanoseconds;
  using std::chrono::seconds;
  const struct {
    const char* name;
    Date date;
    const char* expected;
  } kRows[] = {
      {"the epoch", Date{}, "1970-01-01 00:00:00 +0000"},
      {"a recent date", Date{seconds(1795223280)}, "2026-11-21 01:08:00 +0000"},
      {"a fraction is dropped", Date{seconds(1795223280) + nanoseconds(999'999'999)}, "2026-11-21 01:08:00 +0000"},
      {"a nanosecond before the epoch", Date{nanoseconds(-1)}, "1969-12-31 23:59:59 +0000"},
      {"a second before the epoch", Date{seconds(-1)}, "1969-12-31 23:59:59 +0000"},
      {"a leap day", Date{seconds(951827696)}, "2000-02-29 12:34:56 +0000"},
      {"a date before 1970", Date{seconds(-86400)}, "1969-12-31 00:00:00 +0000"},
      {"the first date", Date::min(), "1677-09-21 00:12:43 +0000"},
      {"the last date", Date::max(), "2262-04-11 23:47:16 +0000"},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(formatMessage("%@", row.date), row.expected) << row.name;
    EXPECT_EQ(formatMessage("%@", Value(row.date)), row.expected) << row.name;
  }
}

TEST(DefaultTextTest, WhatIsAbsentReadsNull) {
  const Value* noValue = nullptr;
  const char* noText = nullptr;
  EXPECT_EQ(formatMessage("%@", noValue), "(null)");
  EXPECT_EQ(formatMessage("%@", noText), "(null)");
  EXPECT_EQ(formatMessage("%@", std::optional<Value>()), "(null)");
  EXPECT_EQ(formatMessage("%@", DiagnosticErrorPtr()), "(null)");
  EXPECT_EQ(formatMessage("%@", std::shared_ptr<Object>()), "(null)");
  EXPECT_EQ(formatMessage("%@", std::shared_ptr<Lamp>()), "(null)");
  EXPECT_EQ(formatMessage("%@", Value(DiagnosticErrorPtr())), "(null)");
  EXPECT_EQ(formatMessage("%@", Array{Value(std::shared_ptr<Object>())}), "((null))");
}

TEST(DefaultTextTest, WhatAPointerOrAnOptionalLeadsToIsWritten) {
  const Value value(36.6);
  const Value* pointer = &value;
  EXPECT_EQ(formatMessage("%@", pointer), "36.6");
  EXPECT_EQ(formatMessage("%@", std::optional<Value>(value)), "36.6");
}

TEST(DefaultTextTest, AListOfTextsIsWrittenAsAnArray) {
  EXPECT_EQ(formatMessage("%@", std::vector<std::string>{}), "()");
  EXPECT_EQ(formatMessage("%@", std::vector<std::string>{"a", "b"}), "(a, b)");
}

TEST(DefaultTextTest, ATextWithANullCharacterStaysWhole) {
  EXPECT_EQ(formatMessage("<%@>", std::string("a\0b", 3)), std::string("<a\0b>", 5));
}

TEST(DefaultTextTest, IsAppendedToWhatIsThere) {
  std::string text = "before ";
  appendDefaultText(text, 5);
  EXPECT_EQ(text, "before 5");
}

// A locale with a decimal comma and grouped digits, which must have no effect.
class CommaPunctuation : public std::numpunct<char> {
  char do_decimal_point() const override { return ','; }
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

void expectPlainNumbers() {
  EXPECT_EQ(formatMessage("%lf %@ %@ %lu %d", 1234567.5, 1234567.5, 0.5F, 1234567U, -1234567),
            "1234567.500000 1234567.5 0.5 1234567 -1234567");
  EXPECT_EQ(defaultText(Value(Array{1234567, 0.5})), "(1234567, 0.5)");
}

TEST(LocaleTest, TheProgramsCppLocaleHasNoInfluence) {
  const std::locale before = std::locale::global(std::locale(std::locale::classic(), new CommaPunctuation));
  expectPlainNumbers();
  std::locale::global(before);
}

TEST(LocaleTest, TheProgramsCLocaleHasNoInfluence) {
  const char* chosen = nullptr;
  for (const char* name : {"de_DE.UTF-8", "de_DE.utf8", "fr_FR.UTF-8", "fr_FR.utf8"}) {
    if (chosen == nullptr) chosen = std::setlocale(LC_ALL, name);
  }
  if (chosen == nullptr) GTEST_SKIP() << "this machine has no locale with a decimal comma";
  const std::string decimalPoint = std::localeconv()->decimal_point;
  expectPlainNumbers();
  std::setlocale(LC_ALL, "C");
  EXPECT_EQ(decimalPoint, ",");
}

}  // namespace
}  // namespace quazor
