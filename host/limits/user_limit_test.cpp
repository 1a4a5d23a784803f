#include "host/limits/user_limit.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <random>
#include <string>
#include <string_view>

namespace quazor {
namespace {

TEST(UserLimit, HasACanonicalText) {
  struct Row {
    const char* text;
    const char* canonical;
  };
  constexpr Row kRows[] = {
      {"BackTele.Total >= 90", "BackTele.Total >= 90"},
      {"  BackTele.Total>=90  ", "BackTele.Total >= 90"},
      {"BackTele.Total >= 90 frames", "BackTele.Total >= 90 frames"},
      {"CameraSyncDiagnostic.Back:BackTele.Total < 1e3", "CameraSyncDiagnostic.Back:BackTele.Total < 1000"},
      {"Camera*:*.Total<=+7", "Camera*:*.Total <= 7"},
      {"*.FrameOffset in [-2, 2]", "*.FrameOffset in [-2, 2]"},
      {"*.FrameOffset in(-2,2] ms", "*.FrameOffset in (-2, 2] ms"},
      {"A in [ 0 , 0.5 )", "A in [0, 0.5)"},
      {"A == 5 +- 0.25", "A == 5 +- 0.25"},
      {"A==5ms", nullptr},
      {"A==5+-1", "A == 5 +- 1"},
      {"A == 5 ms +- 1", "A == 5 ms +- 1"},
      {"A == 5 +- 0", "A == 5"},
      {"A == 90 +- 1 frames", "A == 90 frames +- 1"},
      {"A == 90 frames +- 1 frames", "A == 90 frames +- 1"},
      {"A == 5 +- 0 \"ms\"", "A == 5 ms"},
      {"A == 5 \xc2\xb1 1", "A == 5 +- 1"},
      {"A==5\xc2\xb1"
       "1 ms",
       "A == 5 ms +- 1"},
      {"A == 5 ms\xc2\xb1 1", "A == 5 ms +- 1"},
      {"A == B \xc2\xb1 1", "A == B +- 1"},
      {"A > \"B \xc2\xb1 1\"", "A > \"B \xc2\xb1 1\""},
      {"A > 5 \"+/-\"", "A > 5 \"+/-\""},
      {"BackTele.Total == BackWide.Total +- 1", "BackTele.Total == BackWide.Total +- 1"},
      {"A > B", "A > B"},
      {R"(A > "nan")", R"(A > "nan")"},
      {R"(A > "*.B")", R"(A > "*.B")"},
      {"nan > nano", "nan > nano"},
      {"A in 5 > 3", "\"A in 5\" > 3"},
      {"Number Vok INT_SUPPLY_LATCH == 0 events", "Number Vok INT_SUPPLY_LATCH == 0 events"},
      {"number in use > 3", "\"number in use\" > 3"},
      {R"("A: \"1\" \\" > "2 B")", R"("A: \"1\" \\" > "2 B")"},
      {R"("D:1":"R<1" > 2 "+-")", R"("D:1":"R<1" > 2 "+-")"},
      {R"("plain" > 2 "ms")", "plain > 2 ms"},
      {"A > -0.5", "A > -0.5"},
      {"A > 5e-324", "A > 5e-324"},
  };
  for (const Row& row : kRows) {
    if (row.canonical == nullptr) {
      EXPECT_THROW(parseUserLimit(row.text), InputError) << row.text;
      continue;
    }
    const UserLimit limit = parseUserLimit(row.text);
    EXPECT_EQ(canonicalText(limit), row.canonical) << row.text;
    EXPECT_EQ(parseUserLimit(row.canonical), limit) << row.text;
  }
}

TEST(UserLimit, IsRefusedWithTheReason) {
  constexpr RefusedText kRows[] = {
      {"", "the name of a result is missing"},
      {"A", "expected <, <=, >, >=, == or 'in [LOWER, UPPER]' after the name of the result, not the end"},
      {"A = 5", "expected <, <=, >, >=, == or 'in [LOWER, UPPER]' after the name of the result, not '= 5'"},
      {"A != 5", "expected <, <=, >, >=, == or 'in [LOWER, UPPER]' after the name of the result, not '!= 5'"},
      {"A ==", "a number or the name of a result is missing"},
      {":A > 1", "the name of a result is missing"},
      {"D: > 1", "the name of a result is missing"},
      {"A > 5ms", "'5ms' is not a number"},
      {"A > -inf", "'-inf' is not a finite number"},
      {"A > 1e999", "'1e999' is outside the range of numbers"},
      {"A > 5 +- 1", "a tolerance needs the operator =="},
      {"A > B +- 1", "a tolerance needs the operator =="},
      {"A == 5 +- -1", "the tolerance is negative"},
      {"A == 5 +-", "a number is missing"},
      {"A == 5 s +- 1 ms", "the number is in 's' but its tolerance is in 'ms'"},
      {"A == B +- 1 ms", "unexpected text 'ms' at the end"},
      {"A == 5 +/- 1", "a tolerance is written +-, not +/-"},
      {"A==5+/-1 ms", "a tolerance is written +-, not +/-"},
      {"A == 5 ms +/- 1", "a tolerance is written +-, not +/-"},
      {"A == B +/- 1", "a tolerance is written +-, not +/-"},
      {"A > 5 \xc2\xb1 1", "a tolerance needs the operator =="},
      {"A in [1, 2", "a bracket is missing after the upper bound"},
      {"A in [1 2]", "a comma is missing between the two bounds"},
      {"A in [2, 1]", "no number lies between 2 and 1"},
      {"A in (1, 1]", "no number lies between 1 and 1"},
      {"\"A > 1", "a quotation mark is missing"},
      {"A > \"B", "a quotation mark is missing"},
      {"\"\" > 1", "the name of a result is missing"},
      {"A in 80..90", "an interval is written in brackets: in [80, 90]"},
      {"A in 80 .. 90", "an interval is written in brackets: in [80, 90]"},
      {"A in 80,90 ms", "an interval is written in brackets: in [80, 90]"},
      {"\"A\" in -0.5 .. .5", "an interval is written in brackets: in [-0.5, 0.5]"},
      {"A in 80", "an interval is written in brackets: in [LOWER, UPPER]"},
      {"A in 90..80", "an interval is written in brackets: in [LOWER, UPPER]"},
      {"A in use", "expected <, <=, >, >=, == or 'in [LOWER, UPPER]' after the name of the result, not the end"},
      {"A >= nan", "'nan' is not a finite number; a result of this name is written in double quotes"},
      {"A < Infinity", "'Infinity' is not a finite number; a result of this name is written in double quotes"},
      {"*.Total == *.Total",
       "the limit compares with one result, so '*.Total' cannot be a pattern; a result of this name is written in "
       "double quotes"},
      {"A > 1 > 2", "unexpected text '> 2' at the end"},
  };
  for (const RefusedText& row : kRows) {
    EXPECT_EQ(thrownText<InputError>([&row] { return parseUserLimit(row.text); }), row.problem) << row.text;
  }
}

// Draws names and units from characters that need quotation marks, and others.
std::string randomText(std::mt19937& random, bool mayBeEmpty) {
  constexpr std::string_view kUnits = "ab1 .*?[]in\"\\:<>=!+-,()\t/\xc3\xa9\xc2\xb1";
  std::string text;
  const std::size_t length = std::uniform_int_distribution<std::size_t>(mayBeEmpty ? 0 : 1, 6)(random);
  while (text.size() < length) text += kUnits[std::uniform_int_distribution<std::size_t>(0, kUnits.size() - 1)(random)];
  return text;
}

double randomNumber(std::mt19937& random) {
  if (random() % 2 == 0) return static_cast<double>(static_cast<std::int32_t>(random()) % 100);
  return std::ldexp(static_cast<double>(static_cast<std::int32_t>(random())),
                    std::uniform_int_distribution<int>(-900, 900)(random));
}

UserLimit randomLimit(std::mt19937& random) {
  UserLimit limit;
  limit.diagnostic = randomText(random, true);
  limit.result = randomText(random, false);
  const auto unit = [&random]() -> std::optional<std::string> {
    return random() % 2 == 0 ? std::nullopt : std::optional(randomText(random, true));
  };
  const auto comparison = static_cast<LimitOperator>(random() % 5);
  const double tolerance =
      comparison == LimitOperator::kEqual && random() % 2 == 0 ? std::fabs(randomNumber(random)) : 0;
  switch (random() % 3) {
    case 0: limit.condition = NumberCondition{comparison, randomNumber(random), tolerance, unit()}; break;
    case 1: limit.condition = RelationCondition{comparison, randomText(random, false), tolerance}; break;
    default: {
      const double lower = randomNumber(random);
      limit.condition =
          IntervalCondition{lower, lower + std::fabs(lower) + 1, random() % 2 == 0, random() % 2 == 0, unit()};
    }
  }
  return limit;
}

TEST(UserLimit, IsReadBackFromItsCanonicalText) {
  std::mt19937 random(14);
  for (int i = 0; i < 20'000; ++i) {
    const UserLimit limit = randomLimit(random);
    const std::string text = canonicalText(limit);
    ASSERT_EQ(parseUserLimit(text), limit) << text;
  }
}

TEST(UserLimit, HasALabelWithItsNameAndSource) {
  UserLimit limit = parseUserLimit("D*:\"A:B\" > 1 V");
  limit.source = "command line";
  EXPECT_EQ(labelOf(limit), "\"A:B\" > 1 V (command line)");
  limit.name = "enough";
  EXPECT_EQ(labelOf(limit), "enough: \"A:B\" > 1 V (command line)");
}

TEST(UserLimit, NamesItsSeverity) {
  EXPECT_EQ(limitSeverityNamed("fail"), LimitSeverity::kFail);
  EXPECT_EQ(limitSeverityNamed("warn"), LimitSeverity::kWarn);
  EXPECT_EQ(limitSeverityNamed("warning"), std::nullopt);
}

}  // namespace
}  // namespace quazor
