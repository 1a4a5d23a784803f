#include "contract/value.h"

#include "contract/counting_object_for_tests.h"
#include "contract/diagnostic_error.h"

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>

namespace quazor {
namespace {

class Lamp final : public Object {
 public:
  std::string description() const override { return "lamp"; }
};

// Characters are neither numbers nor strings, and a pointer is never a boolean.
static_assert(!std::is_constructible_v<Value, char>);
static_assert(!std::is_constructible_v<Value, wchar_t>);
static_assert(!std::is_constructible_v<Value, char8_t>);
static_assert(!std::is_constructible_v<Value, char16_t>);
static_assert(!std::is_constructible_v<Value, char32_t>);
static_assert(!std::is_constructible_v<Value, std::nullptr_t>);
static_assert(!std::is_constructible_v<Value, int*>);
static_assert(!std::is_constructible_v<Value, const void*>);
static_assert(!std::is_constructible_v<Value, long double>);
static_assert(!std::is_constructible_v<Value>);
// Small integer types other than characters are accepted.
static_assert(std::is_convertible_v<signed char, Value>);
static_assert(std::is_convertible_v<unsigned char, Value>);

constexpr auto kLowest64 = std::numeric_limits<std::int64_t>::min();
constexpr auto kHighest64 = std::numeric_limits<std::int64_t>::max();
constexpr auto kMaxUnsigned = std::numeric_limits<std::uint64_t>::max();
constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNan = std::numeric_limits<double>::quiet_NaN();

TEST(ValueTest, KeepsTheKindItIsMadeOf) {
  const struct {
    const char* name;
    Value value;
    Value::Kind kind;
    bool isNumber;
  } kRows[] = {
      {"true", true, Value::Kind::kBoolean, true},
      {"int", 1, Value::Kind::kSigned, true},
      {"signed char", static_cast<signed char>(-1), Value::Kind::kSigned, true},
      {"long long", -1LL, Value::Kind::kSigned, true},
      {"unsigned char", static_cast<unsigned char>(1), Value::Kind::kUnsigned, true},
      {"unsigned", 1U, Value::Kind::kUnsigned, true},
      {"std::size_t", std::size_t{1}, Value::Kind::kUnsigned, true},
      {"double", 1.0, Value::Kind::kDouble, true},
      {"float", 1.0F, Value::Kind::kFloat, true},
      {"string literal", "true", Value::Kind::kString, false},
      {"string", std::string("1"), Value::Kind::kString, false},
      {"string view", std::string_view("1"), Value::Kind::kString, false},
      {"array", Array{1, 2}, Value::Kind::kArray, false},
      {"dictionary", Dictionary{{"k", 1}}, Value::Kind::kDictionary, false},
      {"date", Date{}, Value::Kind::kDate, false},
      {"bytes", Bytes{1, 2}, Value::Kind::kBytes, false},
      {"object", std::make_shared<Lamp>(), Value::Kind::kObject, false},
      {"error", makeError("Domain", 1, "Text"), Value::Kind::kError, false},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(row.value.kind(), row.kind) << row.name;
    EXPECT_EQ(row.value.isNumber(), row.isNumber) << row.name;
  }
}

TEST(ValueTest, GivesItsContentInItsOwnKindOnly) {
  const auto lamp = std::make_shared<Lamp>();
  const DiagnosticErrorPtr error = makeError("Domain", 1, "Text");
  const Value values[] = {true,   -7,          7U,   0.5,  0.25F, "text", Array{1}, Dictionary{{"k", 1}},
                          Date{}, Bytes{0xAB}, lamp, error};
  for (const Value& value : values) {
    const auto is = [&](Value::Kind kind) { return value.kind() == kind; };
    EXPECT_EQ(value.boolean() != nullptr, is(Value::Kind::kBoolean));
    EXPECT_EQ(value.signedInteger() != nullptr, is(Value::Kind::kSigned));
    EXPECT_EQ(value.unsignedInteger() != nullptr, is(Value::Kind::kUnsigned));
    EXPECT_EQ(value.doubleNumber() != nullptr, is(Value::Kind::kDouble));
    EXPECT_EQ(value.floatNumber() != nullptr, is(Value::Kind::kFloat));
    EXPECT_EQ(value.string() != nullptr, is(Value::Kind::kString));
    EXPECT_EQ(value.array() != nullptr, is(Value::Kind::kArray));
    EXPECT_EQ(value.dictionary() != nullptr, is(Value::Kind::kDictionary));
    EXPECT_EQ(value.date() != nullptr, is(Value::Kind::kDate));
    EXPECT_EQ(value.bytes() != nullptr, is(Value::Kind::kBytes));
    EXPECT_EQ(value.object() != nullptr, is(Value::Kind::kObject));
    EXPECT_EQ(value.error() != nullptr, is(Value::Kind::kError));
  }
  EXPECT_EQ(*values[0].boolean(), true);
  EXPECT_EQ(*values[1].signedInteger(), -7);
  EXPECT_EQ(*values[2].unsignedInteger(), 7U);
  EXPECT_EQ(*values[3].doubleNumber(), 0.5);
  EXPECT_EQ(*values[4].floatNumber(), 0.25F);
  EXPECT_EQ(*values[5].string(), "text");
  EXPECT_EQ(*values[6].array(), Array{1});
  EXPECT_EQ(*values[7].dictionary(), (Dictionary{{"k", 1}}));
  EXPECT_EQ(*values[8].date(), Date{});
  EXPECT_EQ(*values[9].bytes(), Bytes{0xAB});
  EXPECT_EQ(values[10].object(), lamp);
  EXPECT_EQ(values[11].error(), error);
}

TEST(ValueTest, KeepsAStringWithANullCharacterWhole) {
  const Value value(std::string_view("a\0b", 3));
  EXPECT_EQ(value.string()->size(), 3U);
}

TEST(ValueTest, KeepsTheExtremesOf64Bits) {
  EXPECT_EQ(*Value(kLowest64).signedInteger(), kLowest64);
  EXPECT_EQ(*Value(kMaxUnsigned).unsignedInteger(), kMaxUnsigned);
}

TEST(ValueTest, IsEqualOnlyInKindAndContent) {
  const auto lamp = std::make_shared<Lamp>();
  const auto text = [] { return makeError("Domain", 1, "Text"); };
  const DiagnosticErrorPtr error = text();
  const struct {
    const char* name;
    Value a;
    Value b;
    bool equal;
  } kRows[] = {
      {"the same integer", 1, 1, true},
      {"signed and unsigned", 1, 1U, false},
      {"integer and double", 1, 1.0, false},
      {"integer and boolean", 1, true, false},
      {"double and float", 1.0, 1.0F, false},
      {"not-a-number and itself", kNan, kNan, false},
      {"strings of two copies", std::string("text"), "text", true},
      {"different strings", "text", "Text", false},
      {"string and bytes", "a", Bytes{'a'}, false},
      {"arrays", Array{1, "b"}, Array{1, "b"}, true},
      {"arrays in another order", Array{1, 2}, Array{2, 1}, false},
      {"arrays of different length", Array{1}, Array{1, 1}, false},
      {"dictionaries in another order", Dictionary{{"a", 1}, {"b", 2}}, Dictionary{{"b", 2}, {"a", 1}}, true},
      {"dictionaries with other values", Dictionary{{"a", 1}}, Dictionary{{"a", 2}}, false},
      {"dictionaries with other keys", Dictionary{{"a", 1}}, Dictionary{{"b", 1}}, false},
      {"nested, deep inside different", Array{Array{Dictionary{{"a", 1}}}}, Array{Array{Dictionary{{"a", 2}}}}, false},
      {"nested, equal", Array{Array{Dictionary{{"a", 1}}}}, Array{Array{Dictionary{{"a", 1}}}}, true},
      {"the same date", Date{}, Date{}, true},
      {"dates a nanosecond apart", Date{}, Date{std::chrono::nanoseconds(1)}, false},
      {"bytes", Bytes{1, 2}, Bytes{1, 2}, true},
      {"different bytes", Bytes{1, 2}, Bytes{1, 3}, false},
      {"one object", lamp, lamp, true},
      {"two objects of one class", lamp, std::make_shared<Lamp>(), false},
      {"one error", error, error, true},
      {"two errors of one text", error, text(), false},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(row.a == row.b, row.equal) << row.name;
    EXPECT_EQ(row.b == row.a, row.equal) << row.name;
  }
}

TEST(ValueTest, ACopyKeepsItsContentWhenTheOriginalIsAssignedTo) {
  Value original("before");
  const Value copy = original;
  original = 5;
  EXPECT_EQ(*copy.string(), "before");
  EXPECT_EQ(*original.signedInteger(), 5);
}

TEST(ValueTest, ReleasesTheObjectItRefersTo) {
  auto lamp = std::make_shared<Lamp>();
  const std::weak_ptr<Lamp> watch = lamp;
  {
    const Value value(std::move(lamp));
    EXPECT_EQ(watch.use_count(), 1);
  }
  EXPECT_TRUE(watch.expired());
}

struct ReadingRow {
  const char* name;
  Value value;
  double asDouble;
  std::int64_t asSigned;
  std::uint64_t asUnsigned;
  std::int32_t asInt32;
  std::uint16_t asUInt16;
  bool asBoolean;
};

const ReadingRow kReadingRows[] = {
    {"true", true, 1, 1, 1, 1, 1, true},
    {"false", false, 0, 0, 0, 0, 0, false},
    {"zero", 0, 0, 0, 0, 0, 0, false},
    {"minus one keeps its low bits", -1, -1, -1, kMaxUnsigned, -1, 0xFFFF, true},
    {"65536 has no low 16 bits", 65536, 65536, 65536, 65536, 65536, 0, true},
    {"2 to the 32nd has no low 32 bits", std::int64_t{1} << 32, 4294967296.0, 4294967296, 4294967296, 0, 0, true},
    {"a signed integer's low 32 bits are signed", 0x80000001LL, 2147483649.0, 2147483649, 2147483649, -2147483647, 1,
     true},
    {"the lowest signed", kLowest64, -9223372036854775808.0, kLowest64, std::uint64_t{1} << 63, 0, 0, true},
    {"the highest signed", kHighest64, 9223372036854775807.0, kHighest64, (std::uint64_t{1} << 63) - 1, -1, 0xFFFF,
     true},
    {"the highest unsigned reinterprets", kMaxUnsigned, 18446744073709551615.0, -1, kMaxUnsigned, -1, 0xFFFF, true},
    {"2 to the 63rd reinterprets", std::uint64_t{1} << 63, 9223372036854775808.0, kLowest64, std::uint64_t{1} << 63, 0,
     0, true},
    {"2.9 is cut to 2", 2.9, 2.9, 2, 2, 2, 2, true},
    {"-2.9 is cut to -2", -2.9, -2.9, -2, 0, -2, 0, true},
    {"0.5 is cut to 0 and still true", 0.5, 0.5, 0, 0, 0, 0, true},
    {"-0.5 is cut to 0 and still true", -0.5, -0.5, 0, 0, 0, 0, true},
    {"minus zero is false", -0.0, -0.0, 0, 0, 0, 0, false},
    {"1e300 saturates", 1e300, 1e300, kHighest64, kMaxUnsigned, 2147483647, 65535, true},
    {"-1e300 saturates", -1e300, -1e300, kLowest64, 0, -2147483647 - 1, 0, true},
    {"infinity saturates", kInfinity, kInfinity, kHighest64, kMaxUnsigned, 2147483647, 65535, true},
    {"minus infinity saturates", -kInfinity, -kInfinity, kLowest64, 0, -2147483647 - 1, 0, true},
    {"2 to the 63rd saturates a signed one", 9223372036854775808.0, 9223372036854775808.0, kHighest64,
     std::uint64_t{1} << 63, 2147483647, 65535, true},
    {"the double below 2 to the 63rd fits", 9223372036854774784.0, 9223372036854774784.0, 9223372036854774784,
     9223372036854774784U, 2147483647, 65535, true},
    {"minus 2 to the 63rd fits", -9223372036854775808.0, -9223372036854775808.0, kLowest64, 0, -2147483647 - 1, 0,
     true},
    {"2 to the 64th saturates an unsigned one", 18446744073709551616.0, 18446744073709551616.0, kHighest64,
     kMaxUnsigned, 2147483647, 65535, true},
    {"the double below 2 to the 64th fits", 18446744073709549568.0, 18446744073709549568.0, kHighest64,
     18446744073709549568U, 2147483647, 65535, true},
    {"2147483647.5 saturates 32 bits", 2147483647.5, 2147483647.5, 2147483647, 2147483647, 2147483647, 65535, true},
    {"2147483646.5 fits 32 bits", 2147483646.5, 2147483646.5, 2147483646, 2147483646, 2147483646, 65535, true},
    {"-2147483648.5 saturates 32 bits", -2147483648.5, -2147483648.5, -2147483648LL, 0, -2147483647 - 1, 0, true},
    {"65534.5 fits 16 bits", 65534.5, 65534.5, 65534, 65534, 65534, 65534, true},
    {"65536.0 saturates 16 bits", 65536.0, 65536.0, 65536, 65536, 65536, 65535, true},
    {"a float is cut", 2.5F, 2.5, 2, 2, 2, 2, true},
    {"a float saturates", 1e30F, static_cast<double>(1e30F), kHighest64, kMaxUnsigned, 2147483647, 65535, true},
    {"a string of digits", "12", 0, 0, 0, 0, 0, false},
    {"an array", Array{12}, 0, 0, 0, 0, 0, false},
    {"a dictionary", Dictionary{{"k", 12}}, 0, 0, 0, 0, 0, false},
    {"a date", Date{std::chrono::nanoseconds(12)}, 0, 0, 0, 0, 0, false},
    {"bytes", Bytes{12}, 0, 0, 0, 0, 0, false},
    {"an object", std::make_shared<Lamp>(), 0, 0, 0, 0, 0, false},
    {"an error", makeError("Domain", 12, "Text"), 0, 0, 0, 0, 0, false},
};

TEST(ReadingNumbersTest, EveryKindReadsByOneRule) {
  for (const ReadingRow& row : kReadingRows) {
    EXPECT_EQ(toDouble(&row.value), row.asDouble) << row.name;
    EXPECT_EQ(toSigned(&row.value), row.asSigned) << row.name;
    EXPECT_EQ(toUnsigned(&row.value), row.asUnsigned) << row.name;
    EXPECT_EQ(toInt32(&row.value), row.asInt32) << row.name;
    EXPECT_EQ(toUInt16(&row.value), row.asUInt16) << row.name;
    EXPECT_EQ(toBoolean(&row.value), row.asBoolean) << row.name;
  }
}

TEST(ReadingNumbersTest, NothingReadsAsZero) {
  EXPECT_EQ(toDouble(nullptr), 0);
  EXPECT_EQ(toSigned(nullptr), 0);
  EXPECT_EQ(toUnsigned(nullptr), 0U);
  EXPECT_EQ(toInt32(nullptr), 0);
  EXPECT_EQ(toUInt16(nullptr), 0);
  EXPECT_FALSE(toBoolean(nullptr));
}

TEST(ReadingNumbersTest, NotANumberReadsAsZeroAndFalse) {
  for (const Value& value : {Value(kNan), Value(std::numeric_limits<float>::quiet_NaN())}) {
    EXPECT_TRUE(std::isnan(toDouble(&value)));
    EXPECT_EQ(toSigned(&value), 0);
    EXPECT_EQ(toUnsigned(&value), 0U);
    EXPECT_EQ(toInt32(&value), 0);
    EXPECT_EQ(toUInt16(&value), 0);
    EXPECT_FALSE(toBoolean(&value));
  }
}

TEST(EntryOfTest, FindsAnEntryOfADictionaryAndNothingElsewhere) {
  const Value dictionary(Dictionary{{"rate", 30}});
  const Value array(Array{"rate"});
  ASSERT_NE(entryOf(&dictionary, "rate"), nullptr);
  EXPECT_EQ(*entryOf(&dictionary, "rate"), Value(30));
  EXPECT_EQ(entryOf(&dictionary, "Rate"), nullptr);
  EXPECT_EQ(entryOf(&array, "rate"), nullptr);
  EXPECT_EQ(entryOf(nullptr, "rate"), nullptr);
}

TEST(PointerToTest, PointsAtWhatAnOptionalHolds) {
  const std::optional<Value> nothing;
  const std::optional<Value> something(5);
  EXPECT_EQ(pointerTo(nothing), nullptr);
  EXPECT_EQ(pointerTo(something), &*something);
}

TEST(ValueTest, ValuesNestedToAnyDepthAreDestroyed) {
  constexpr int kLevels = 120'000;
  const auto object = std::make_shared<CountingObject>();
  Value nested(object);
  for (int i = 0; i < kLevels; ++i) {
    if (i % 3 == 0) nested = Value(Array{1, std::move(nested), Dictionary{{"a", Array{}}}});
    if (i % 3 == 1) nested = Value(Dictionary{{"key", std::move(nested)}});
    if (i % 3 == 2) {
      nested = Value(DiagnosticErrorPtr(
          std::make_shared<const DiagnosticError>("Bus", i, Dictionary{{"value", std::move(nested)}})));
    }
  }
  EXPECT_EQ(object.use_count(), 2);
  std::optional<Value> copy = nested;
  nested = Value(1);
  EXPECT_EQ(object.use_count(), 2);
  copy.reset();
  EXPECT_EQ(object.use_count(), 1);
}

// An object that holds a value.
class Holder final : public Object {
 public:
  explicit Holder(Value value) : value_(std::move(value)) {}

  std::string description() const override { return "holder"; }

 private:
  const Value value_;
};

// With several kinds in turn, a kind whose levels are destroyed by recursion would not be noticed.
TEST(ValueTest, ValuesOfOneKindNestedToAnyDepthAreDestroyed) {
  const std::function<Value(Value)> kinds[] = {
      [](Value value) { return Value(Array{std::move(value)}); },
      [](Value value) {
        return Value(Dictionary{{"key", std::move(value)}});
      },
      [](Value value) {
        return Value(DiagnosticErrorPtr(
            std::make_shared<const DiagnosticError>("Bus", 1, Dictionary{{"value", std::move(value)}})));
      },
      [](Value value) {
        return Value(Array{Value(std::shared_ptr<Object>(std::make_shared<Holder>(std::move(value))))});
      },
  };
  for (const std::function<Value(Value)>& wrapped : kinds) {
    const auto object = std::make_shared<CountingObject>();
    Value nested(object);
    for (int i = 0; i < 120'000; ++i) nested = wrapped(std::move(nested));
    EXPECT_EQ(object.use_count(), 2);
    nested = Value(1);
    EXPECT_EQ(object.use_count(), 1);
  }
}

}  // namespace
}  // namespace quazor
