#include "host/record/value_json.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using Json = nlohmann::ordered_json;

class NamedObject final : public Object {
 public:
  std::string description() const override { return "a stream"; }
};

TEST(ValueJson, HasAFormForEveryKind) {
  constexpr double kInf = std::numeric_limits<double>::infinity();
  struct Row {
    const char* name;
    Value value;
    const char* json;
  };
  const Row rows[] = {
      {"a boolean", true, "true"},
      {"a signed integer", std::numeric_limits<std::int64_t>::min(), "-9223372036854775808"},
      {"an unsigned integer", std::numeric_limits<std::uint64_t>::max(), "18446744073709551615"},
      {"a double", 0.1, "0.1"},
      {"a whole double", 3.0, "3.0"},
      {"a float, by its shortest form", 36.6F, "36.6"},
      {"the largest float", std::numeric_limits<float>::max(), "3.4028235e+38"},
      {"not a number", std::numeric_limits<double>::quiet_NaN(), "\"nan\""},
      {"an infinite double", kInf, "\"inf\""},
      {"a negatively infinite double", -kInf, "\"-inf\""},
      {"an infinite float", -std::numeric_limits<float>::infinity(), "\"-inf\""},
      {"a float that is not a number", std::numeric_limits<float>::quiet_NaN(), "\"nan\""},
      {"a string", "a \"b\" \n", R"("a \"b\" \n")"},
      {"an array", Array{1, Array{}, "x"}, R"([1,[],"x"])"},
      {"a dictionary, in its order", Dictionary{{"z", 1}, {"a", Dictionary{}}}, R"({"z":1,"a":{}})"},
      {"bytes", Bytes{0x00, 0xA5, 0xFF}, "\"00a5ff\""},
      {"a date", Date(1s), "\"1970-01-01 00:00:01 +0000\""},
      {"an object", std::make_shared<NamedObject>(), "\"a stream\""},
      {"an error", errorWithMessage("D", -2, "it failed", nullptr), "\"D code -2: it failed\""},
  };
  for (const Row& row : rows) EXPECT_EQ(valueJson(row.value).dump(), row.json) << row.name;
}

TEST(ErrorJson, IsTheDictionaryFormOrNull) {
  EXPECT_EQ(errorJson(nullptr).dump(), "null");
  const DiagnosticErrorPtr cause = errorWithMessage("C", 2, "cause", nullptr);
  EXPECT_EQ(errorJson(errorWithMessage("D", 1, "message", cause)).dump(),
            R"({"message":"message","code":1,"domain":"D","underlying-error":)"
            R"({"message":"cause","code":2,"domain":"C"}})");
}

TEST(SecondsJson, IsExactToTheNanosecond) {
  EXPECT_EQ(secondsJson(0ns).dump(), "0.0");
  EXPECT_EQ(secondsJson(1ns).dump(), "1e-09");
  EXPECT_EQ(secondsJson(3000000001ns).dump(), "3.000000001");
}

TEST(DocumentText, ReplacesWhatIsNotUtf8) {
  EXPECT_EQ(documentText(valueJson(std::string("a\xFF"
                                               "b"))),
            "\"a\xEF\xBF\xBD"
            "b\"\n");
}

TEST(DocumentText, IndentsByTwo) { EXPECT_EQ(documentText(Json{{"a", 1}}), "{\n  \"a\": 1\n}\n"); }

TEST(DictionaryJson, KeepsEveryKeyInItsOrder) {
  Dictionary dictionary;
  for (int i = 100; i > 0; --i) dictionary.set("key " + std::to_string(i), i);
  const Json json = dictionaryJson(dictionary);
  ASSERT_EQ(json.size(), dictionary.size());
  int expected = 100;
  for (const auto& [key, value] : json.items()) {
    EXPECT_EQ(key, "key " + std::to_string(expected));
    EXPECT_EQ(value, expected);
    --expected;
  }
}

}  // namespace
}  // namespace quazor
