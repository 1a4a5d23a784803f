#include "host/record/lossless_json.h"

#include "base/json/json_limits.h"
#include "base/json/json_line.h"
#include "base/text/input_error.h"
#include "host/testing/test_values.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;
using testing::HasSubstr;

// Formats and parses it, like a record. The formatting replaces nothing.
Json throughText(const Json& json) { return Json::parse(json.dump()); }

Value back(const Value& value) { return valueFrom(throughText(losslessValue(value))); }

TEST(LosslessValue, KeepsEveryValue) {
  RandomValues random(1);
  constexpr int kValues = 10'000;
  for (int i = 0; i < kValues; ++i) {
    const Value value = random.value(4);
    ASSERT_TRUE(isSame(back(value), value)) << i << ": " << losslessValue(value).dump();
  }
}

TEST(LosslessValue, KeepsFloatsOfEveryKind) {
  // Every 80,021st number. The step is prime, so all signs and exponents and many kinds of mantissas occur.
  std::uint64_t count = 0;
  for (std::uint64_t bits = 0; bits <= UINT32_MAX; bits += 80'021) {
    const Value value(std::bit_cast<float>(static_cast<std::uint32_t>(bits)));
    ASSERT_TRUE(isSame(back(value), value)) << std::hex << bits;
    ++count;
  }
  EXPECT_GT(count, 50'000U);
  using Limits = std::numeric_limits<float>;
  for (const float one : {0.0F, -0.0F, Limits::max(), Limits::lowest(), Limits::min(), Limits::denorm_min(),
                          Limits::infinity(), -Limits::infinity(), Limits::quiet_NaN(), 0.1F}) {
    EXPECT_TRUE(isSame(back(one), Value(one))) << one;
  }
}

TEST(LosslessValue, KeepsDoublesOfEveryExponent) {
  RandomValues random(2);
  for (std::uint64_t exponent = 0; exponent < 2048; ++exponent) {
    for (int i = 0; i < 10; ++i) {
      const double number = std::bit_cast<double>((random.bits() & 0x800F'FFFF'FFFF'FFFFU) | exponent << 52);
      ASSERT_TRUE(isSame(numberFrom(throughText(losslessNumber(number))), number)) << number;
    }
  }
}

TEST(LosslessValue, HasThisForm) {
  EXPECT_EQ(losslessValue(Array{true, -1, 1U, -0.0, 0.5F, "\u00e4", Dictionary{{"k", Bytes{0x0F, 0xA5}}}}).dump(),
            R"({"array":[{"boolean":true},{"signed":-1},{"unsigned":1},{"double":-0.0},{"float":0.5},)"
            "{\"string\":\"\u00e4\"},"
            R"({"dictionary":[["k",{"bytes":"0fa5"}]]}]})");
  EXPECT_EQ(losslessValue(std::make_shared<NamedObject>("a stream")).dump(), R"({"object":"a stream"})");
  EXPECT_EQ(losslessValue(std::shared_ptr<NamedObject>()).dump(), R"({"object":null})");
  EXPECT_EQ(losslessValue(Date(Date::duration(-5))).dump(), R"({"date":-5})");
  EXPECT_EQ(losslessValue(errorWithMessage("D", 3, "m", nullptr)).dump(),
            R"({"error":{"domain":"D","code":3,"userInfo":[["localized-description",{"string":"m"}]]}})");
  EXPECT_EQ(losslessValue(DiagnosticErrorPtr()).dump(), R"({"error":null})");
  EXPECT_EQ(losslessNumber(std::nan("")).dump(), "\"nan\"");
  EXPECT_EQ(losslessNumber(-INFINITY).dump(), "\"-inf\"");
  EXPECT_EQ(losslessText("a\xff").dump(), R"({"hex":"61ff"})");
}

TEST(LosslessText, TellsUtf8FromOtherBytes) {
  struct Row {
    const char* name;
    std::string text;
    bool isUtf8;
  };
  const Row rows[] = {
      {"nothing", "", true},
      {"the byte zero", std::string(1, '\0'), true},
      {"the first of two bytes", "\xc2\x80", true},
      {"the last of two bytes", "\xdf\xbf", true},
      {"a longer form than needed, of two", "\xc1\xbf", false},
      {"the first of three bytes", "\xe0\xa0\x80", true},
      {"a longer form than needed, of three", "\xe0\x9f\xbf", false},
      {"the last before the surrogates", "\xed\x9f\xbf", true},
      {"the first surrogate", "\xed\xa0\x80", false},
      {"the first after the surrogates", "\xee\x80\x80", true},
      {"the last of three bytes", "\xef\xbf\xbf", true},
      {"the first of four bytes", "\xf0\x90\x80\x80", true},
      {"a longer form than needed, of four", "\xf0\x8f\xbf\xbf", false},
      {"the last of four bytes", "\xf4\x8f\xbf\xbf", true},
      {"beyond the last", "\xf4\x90\x80\x80", false},
      {"a byte that never begins anything", "\xf5\x80\x80\x80", false},
      {"a following byte alone", "\x80", false},
      {"two bytes without the second", "\xc2", false},
      {"three bytes without the third", "\xe2\x82", false},
      {"four bytes without the fourth", "\xf0\x9f\x98", false},
      {"a third byte that does not follow", "\xe2\x82z", false},
      {"a fourth byte that does not follow", "\xf0\x9f\x98z", false},
  };
  for (const Row& row : rows) {
    const Json json = losslessText(row.text);
    EXPECT_EQ(json.is_string(), row.isUtf8) << row.name;
    EXPECT_EQ(textFrom(throughText(json)), row.text) << row.name;
  }
}

TEST(LosslessText, AgreesWithTheJsonLibraryOnWhatIsUtf8) {
  RandomValues random(3);
  for (int i = 0; i < 20'000; ++i) {
    const std::string text = random.text();
    bool accepted = true;
    try {
      static_cast<void>(Json(text).dump());
    } catch (const Json::exception&) {
      accepted = false;
    }
    ASSERT_EQ(losslessText(text).is_string(), accepted) << testing::PrintToString(text);
  }
}

TEST(LosslessResult, KeepsEveryResult) {
  RandomValues random(4);
  for (int i = 0; i < 5'000; ++i) {
    const QZMeasuredResult result = random.result();
    ASSERT_TRUE(isSame(resultFrom(throughText(losslessResult(result))), result)) << losslessResult(result).dump();
  }
}

TEST(LosslessResult, HasThisForm) {
  QZMeasuredResult result("Count", Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_EQ(losslessResult(result).dump(), R"({"name":"Count","measurement":[90.0,"frames"]})");
  QZLimit limit("Enough");
  limit.setLowerBound(std::make_shared<const QZBound>(Measurement(1, QZUnit::unitWithSymbol("x")), true));
  result.setLimit(limit);
  EXPECT_EQ(losslessResult(result).dump(), R"({"name":"Count","measurement":[90.0,"frames"],)"
                                           R"("limit":{"name":"Enough","lower":[[1.0,"x"],true],"upper":null}})");
}

TEST(LosslessError, KeepsEveryErrorAndNone) {
  RandomValues random(5);
  for (int i = 0; i < 2'000; ++i) {
    const DiagnosticErrorPtr error = random.error(3);
    ASSERT_TRUE(isSame(errorFrom(throughText(losslessError(error))), error)) << losslessError(error).dump();
  }
  EXPECT_TRUE(losslessError(nullptr).is_null());
  EXPECT_EQ(errorFrom(Json()), nullptr);
}

TEST(LosslessDictionary, KeepsTheOrderOfEntries) {
  const Dictionary dictionary{{"b", 1}, {"a", 2}, {"", 3}};
  EXPECT_TRUE(isSame(dictionaryFrom(throughText(losslessDictionary(dictionary))), dictionary));
}

TEST(ValueFrom, RefusesWhatItDoesNotHold) {
  constexpr RefusedText kRows[] = {
      {"5", "expected a value: an object with one key"},
      {"{}", "expected a value: an object with one key"},
      {R"({"signed":1,"double":1.0})", "expected a value: an object with one key"},
      {R"({"thing":1})", "unknown kind of value 'thing'"},
      {R"({"boolean":1})", "expected a boolean"},
      {R"({"signed":1.5})", "expected an integer"},
      {R"({"signed":"1"})", "expected an integer"},
      {R"({"signed":9223372036854775808})", "integer too large"},
      {R"({"unsigned":-1})", "expected an unsigned integer"},
      {R"({"double":"NaN"})", "expected a number"},
      {R"({"double":null})", "expected a number"},
      {R"({"float":true})", "expected a number"},
      {R"({"string":5})", "expected a string"},
      {R"({"string":{"hax":"00"}})", "\"hex\" is missing"},
      {R"({"string":{"hex":5}})", "expected a string"},
      {R"({"string":{"hex":"0"}})", "odd number of hexadecimal digits"},
      {R"({"string":{"hex":"0G"}})", "invalid hexadecimal digit"},
      {R"({"string":{"hex":"A0"}})", "invalid hexadecimal digit"},
      {R"({"bytes":5})", "expected a string"},
      {R"({"bytes":"abc"})", "odd number of hexadecimal digits"},
      {R"({"array":{}})", "expected an array"},
      {R"({"array":[5]})", "expected a value: an object with one key"},
      {R"({"dictionary":{}})", "expected an array"},
      {R"({"dictionary":[5]})", "expected an array"},
      {R"({"dictionary":[["k"]]})", "expected an entry of a key and a value"},
      {R"({"dictionary":[[5,{"signed":1}]]})", "expected a string"},
      {R"({"date":1.0})", "expected an integer"},
      {R"({"error":5})", "expected an object"},
      {R"({"error":{"code":1,"userInfo":[]}})", "\"domain\" is missing"},
      {R"({"error":{"domain":"D","userInfo":[]}})", "\"code\" is missing"},
      {R"({"error":{"domain":"D","code":1}})", "\"userInfo\" is missing"},
      {R"({"error":{"domain":"D","code":"1","userInfo":[]}})", "expected an integer"},
      {R"({"object":5})", "expected a string"},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT(thrownText<InputError>([&] { valueFrom(Json::parse(row.text)); }), HasSubstr(row.problem)) << row.text;
  }
}

TEST(ResultFrom, RefusesWhatIsNoResult) {
  constexpr RefusedText kRows[] = {
      {"[]", "expected an object"},
      {R"({"measurement":[1.0,"x"]})", "\"name\" is missing"},
      {R"({"name":"n"})", "\"measurement\" is missing"},
      {R"({"name":"n","measurement":5})", "expected an array"},
      {R"({"name":"n","measurement":[1.0]})", "expected a measurement: a number and a unit"},
      {R"({"name":"n","measurement":["x",1.0]})", "expected a number"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":5})", "expected an object"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":{"name":"l","upper":null}})", "\"lower\" is missing"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":{"name":"l","lower":null}})", "\"upper\" is missing"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":{"name":"l","lower":5,"upper":null}})", "expected an array"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":{"name":"l","lower":[[1.0,"x"]],"upper":null}})",
       "expected a bound: a measurement and a boolean"},
      {R"({"name":"n","measurement":[1.0,"x"],"limit":{"name":"l","lower":null,"upper":[[1.0,"x"],1]}})",
       "expected a boolean"},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT(thrownText<InputError>([&] { resultFrom(Json::parse(row.text)); }), HasSubstr(row.problem)) << row.text;
  }
}

TEST(ValueFrom, RefusesWhatIsTooDeepInsteadOfRunningOutOfStack) {
  constexpr std::size_t kLevels = 100'000;
  std::string text;
  for (std::size_t i = 0; i < kLevels; ++i) text += R"({"array":[)";
  for (std::size_t i = 0; i < kLevels; ++i) text += "]}";
  EXPECT_THAT(thrownText<InputError>([&] { valueFrom(Json::parse(text)); }),
              HasSubstr("nested more than 500 levels deep"));
}

TEST(LosslessValue, RefusesWhatIsTooDeepToBeReadBack) {
  Value value(1);
  for (int i = 1; i < kMaxValueLevels; ++i) value = Value(Dictionary{{"a", std::move(value)}});
  const Value atLimit = value;
  EXPECT_EQ(valueFrom(parseJsonLine(losslessValue(atLimit).dump())), atLimit);
  const std::string sentence = "the value is nested more than 500 levels deep";
  for (int i = 0; i < 100'000; ++i) {
    value = Value(DiagnosticErrorPtr(std::make_shared<const DiagnosticError>("D", 1, Dictionary{{"a", value}})));
    if (i > 0 && i < 99'999) continue;
    EXPECT_EQ(thrownText<InputError>([&] { losslessValue(value); }), sentence);
    EXPECT_EQ(thrownText<InputError>([&] { losslessDictionary({{"a", value}}); }), sentence);
    EXPECT_EQ(thrownText<InputError>([&] { losslessError(errorWithMessage("D", 1, "m", value.error())); }), sentence);
  }
}

TEST(LosslessValue, OfAllKindsAtTheLimitFitIntoALine) {
#ifdef QUAZOR_ADDRESS_SANITIZER
  GTEST_SKIP() << "the frames of a sanitized build need a larger stack";
#endif
  Value value(1);
  for (int i = 1; i < kMaxValueLevels; ++i) {
    value = Value(DiagnosticErrorPtr(std::make_shared<const DiagnosticError>("D", 1, Dictionary{{"a", value}})));
  }
  const std::string line = Json{{"value", losslessValue(value)}}.dump();
  EXPECT_EQ(valueFrom(parseJsonLine(line)["value"]).error()->domain(), "D");
}

TEST(MemberOf, TellsWhatIsMissing) {
  EXPECT_EQ(memberOf(Json{{"a", 5}}, "a"), 5);
  EXPECT_EQ(thrownText<InputError>([] { memberOf(Json{{"a", 5}}, "b"); }), "\"b\" is missing");
  EXPECT_EQ(thrownText<InputError>([] { memberOf(Json::array(), "b"); }), "expected an object");
}

}  // namespace
}  // namespace quazor
