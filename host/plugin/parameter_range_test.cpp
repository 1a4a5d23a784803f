#include "host/plugin/parameter_range.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace quazor {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNotANumber = std::numeric_limits<double>::quiet_NaN();

QZParameterRange parsed(const std::string& text) {
  const JsonDocument document(text, "r.json");
  return rangeFrom(JsonCursor(document));
}

std::string problemOf(const QZParameterRange& range) {
  return thrownText<InputError>(
      [&] {
        validateRange(range);
        return 0;
      },
      "fine");
}

TEST(ParameterRange, SaysWhatItAccepts) {
  struct Row {
    const char* json;
    const char* text;
  };
  constexpr Row kRows[] = {
      {R"({})", "a number"},
      {R"({"unit": "s"})", "a number of s"},
      {R"({"minimum": 0, "unit": "s"})", ">= 0 s"},
      {R"({"exclusiveMinimum": 0.5, "maximum": 5})", "> 0.5 and <= 5"},
      {R"({"minimum": 1, "exclusiveMaximum": 5, "integer": true, "unit": "frames"})", "an integer >= 1 and < 5 frames"},
      {R"({"integer": true})", "an integer"},
      {R"({"maximum": -1, "integer": false})", "<= -1"},
  };
  for (const Row& row : kRows) {
    const QZParameterRange range = parsed(row.json);
    EXPECT_EQ(rangeText(range), row.text);
    EXPECT_EQ(rangeText(rangeFrom(JsonCursor(rangeJson(range)))), row.text);
  }
  EXPECT_EQ(parsed(R"({"default": 2.5})").defaultValue(), 2.5);
  EXPECT_EQ(rangeJson(parsed(R"({"default": 2.5})")), nlohmann::ordered_json({{"default", 2.5}}));
}

TEST(ParameterRange, AcceptsOnlyWhatIsInside) {
  struct Row {
    const char* json;
    Value value;
    bool isAccepted;
  };
  const Row rows[] = {
      {R"({})", Value(-1e300), true},
      {R"({})", Value(kNotANumber), false},
      {R"({})", Value("3"), false},
      {R"({"minimum": 0})", Value(0), true},
      {R"({"minimum": 0})", Value(-0.0), true},
      {R"({"minimum": 0})", Value(-1), false},
      {R"({"minimum": 0})", Value(-5e-324), false},
      {R"({"minimum": 0})", Value(kNotANumber), false},
      {R"({"minimum": 0})", Value(kInfinity), true},
      {R"({"exclusiveMinimum": 0})", Value(0), false},
      {R"({"exclusiveMinimum": 0})", Value(5e-324), true},
      {R"({"maximum": 2})", Value(2), true},
      {R"({"maximum": 2})", Value(2.0000000000000004), false},
      {R"({"exclusiveMaximum": 2})", Value(2), false},
      {R"({"integer": true})", Value(2.5), false},
      {R"({"integer": true})", Value(2.0), true},
      // Doubles do not hold these integers.
      {R"({"maximum": 9007199254740992})", Value(std::int64_t{9007199254740993}), false},
      {R"({"exclusiveMinimum": 18446744073709549568})", Value(std::uint64_t{18446744073709551615U}), true},
      {R"({"minimum": -9223372036854775808})", Value(std::numeric_limits<std::int64_t>::min()), true},
  };
  for (const Row& row : rows) EXPECT_EQ(accepts(parsed(row.json), row.value), row.isAccepted) << row.json;
}

TEST(ParameterRange, IsNonsenseIfNothingFits) {
  const auto range = [](double minimum, bool isOpen, double maximum, bool isOpenAbove, bool isInteger) {
    QZParameterRange made;
    made.setMinimum(minimum, isOpen);
    made.setMaximum(maximum, isOpenAbove);
    if (isInteger) made.setInteger();
    return problemOf(made);
  };
  EXPECT_EQ(range(5, false, 2, false, false), "no number is >= 5 and <= 2");
  EXPECT_EQ(range(2, false, 2, false, false), "fine");
  EXPECT_EQ(range(2, true, 2, false, false), "no number is > 2 and <= 2");
  EXPECT_EQ(range(2, false, 2, true, false), "no number is >= 2 and < 2");
  EXPECT_EQ(range(2, true, 3, true, false), "fine");
  EXPECT_EQ(range(2, true, 3, true, true), "no number is an integer > 2 and < 3");
  EXPECT_EQ(range(2, true, 3, false, true), "fine");
  EXPECT_EQ(range(2.5, false, 2.75, false, true), "no number is an integer >= 2.5 and <= 2.75");
  EXPECT_EQ(range(kNotANumber, false, 3, false, false), "its minimum is nan, but must be a finite number");
  EXPECT_EQ(range(0, false, kInfinity, false, false), "its maximum is inf, but must be a finite number");
}

TEST(ParameterRange, HasADefaultThatFitsAndAUnitOfOneLine) {
  QZParameterRange range;
  range.setMinimum(1);
  range.setDefault(0);
  EXPECT_EQ(problemOf(range), "its default 0 is not >= 1");
  range.setDefault(kNotANumber);
  EXPECT_EQ(problemOf(range), "its default is nan, but must be a finite number");
  range.setDefault(1);
  range.setUnit("s\n");
  EXPECT_EQ(problemOf(range), "its unit is not one line of UTF-8");
  range.setUnit("s\xC2\x9B");
  EXPECT_EQ(problemOf(range), "its unit is not one line of UTF-8");
  range.setUnit("\xFF");
  EXPECT_EQ(problemOf(range), "its unit is not one line of UTF-8");
  range.setUnit("\xC2\xB5s");
  EXPECT_EQ(problemOf(range), "fine");
}

TEST(ParameterRange, BelongsToADeclaredParameter) {
  QZDescription description("About it.");
  description.addParameter(QZNumberParameter("How long.", true), "duration");
  description.addParameter(QZNumberParameter("How much.", false), "gain");
  const auto problem = [&](const char* name, const QZParameterRange& range) {
    OrderedMap<QZParameterRange> ranges;
    ranges.set(name, range);
    return thrownText<InputError>(
        [&] {
          validateRanges(ranges, description);
          return 0;
        },
        "fine");
  };
  EXPECT_EQ(problem("duration", parsed(R"({"minimum": 0})")), "fine");
  EXPECT_EQ(problem("duratoin", parsed(R"({"minimum": 0})")),
            "the range of 'duratoin', which is not one of its parameters; did you mean 'duration'?");
  EXPECT_EQ(problem("gain", parsed(R"({"default": 2})")), "fine");
  EXPECT_EQ(problem("duration", parsed(R"({"default": 2})")),
            "the range of 'duration': the parameter is required and can have no default");
  QZParameterRange nonsense;
  nonsense.setMaximum(kNotANumber);
  EXPECT_EQ(problem("gain", nonsense), "the range of 'gain': its maximum is nan, but must be a finite number");
}

TEST(ParameterRange, IsRefusedInAnotherForm) {
  constexpr RefusedText kRows[] = {
      {R"([])", "r.json:1: the document: must be an object, not an array."},
      {"{\n\"min\": 0}", "r.json:2: the document: unknown key \"min\"; "},
      {"{\n\"minimum\": \"0\"}", "r.json:2: minimum: must be a number, not \"0\"."},
      {"{\n\"maximum\": null}", "r.json:2: maximum: must be a number, not null."},
      {"{\n\"integer\": 1}", "r.json:2: integer: must be true or false, not 1."},
      {"{\n\"unit\": 1}", "r.json:2: unit: must be a non-empty string, not 1."},
      {R"({"minimum": 1, "exclusiveMinimum": 1})", "r.json:1: the document: has two minimums; remove one."},
      {R"({"maximum": 1, "exclusiveMaximum": 1})", "r.json:1: the document: has two maximums; remove one."},
      {R"({"minimum": 5, "maximum": 2})", "r.json:1: the document: is not a range: no number is >= 5 and <= 2."},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT(thrownText<InputError>([&] { return parsed(row.text); }), testing::StartsWith(row.problem));
  }
}

}  // namespace
}  // namespace quazor
