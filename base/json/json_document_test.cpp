#include "base/json/json_document.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

constexpr std::string_view kDocument = R"({
  "first": 1,
  "list": [
    10,
    20
  ,
    {"inner": true,
     "second": [[],
                [7]]},
    "text"
  ],
  "last":
    null
})";

TEST(LineOfPath, IsWhereTheKeyOrTheElementStands) {
  const struct {
    const char* path;
    std::size_t line;
  } kRows[] = {{"first", 2},
               {"list", 3},
               {"list[0]", 4},
               {"list[1]", 5},
               {"list[2]", 7},
               {"list[2].inner", 7},
               {"list[2].second", 8},
               {"list[2].second[0]", 8},
               {"list[2].second[1]", 9},
               {"list[2].second[1][0]", 9},
               {"list[3]", 10},
               {"last", 12},
               {"", 1}};
  for (const auto& row : kRows) EXPECT_EQ(lineOfPath(kDocument, row.path), row.line) << row.path;
  EXPECT_EQ(lineOfPath(kDocument, "nowhere"), std::nullopt);
}

std::string problemOf(const std::string& text) {
  return thrownText<InputError>([&] { JsonDocument(text, "a.json"); });
}

TEST(JsonDocument, TellsTheLineOfWhatIsWrong) {
  EXPECT_EQ(problemOf("{\n\"a\": 1,\n\"a\": 2}"), "a.json:3: the key \"a\" is duplicated; remove one.");
  EXPECT_EQ(problemOf("{\"b\": [\n{\"a\": 1,\n\"a\": 2}]}"),
            "a.json:3: b[0]: the key \"a\" is duplicated; remove one.");
  EXPECT_EQ(problemOf("{\n\"a\": 1e999}"), "a.json:2: a: the number is too large for a double.");
  EXPECT_EQ(problemOf("\n" + std::string(40, '[')), "a.json:2: the document is nested more than 32 deep.");
  EXPECT_THAT(problemOf("{\n\n\"a\" 1}"), testing::StartsWith("a.json:3: not valid JSON: "));
  EXPECT_EQ(problemOf("\n\xff"), "a.json:2: the file is not valid UTF-8.");
}

TEST(JsonDocument, NamesAPlaceOnOneLine) {
  const std::string text = "{\n\"a\\n\\u0001b\": {\"c\": 1, \"c\": 2}}";
  EXPECT_EQ(problemOf(text), "a.json:2: a\\n\\u0001b: the key \"c\" is duplicated; remove one.");
  JsonDocument document("{\n\"a\\nb\": 1}", "a.json");
  EXPECT_EQ(thrownText<InputError>([&] { document.fail("a\nb", "sentence.", "a\nb"); }), "a.json:2: a\\nb: sentence.");
}

TEST(JsonDocument, SaysWhyAFileCannotBeRead) {
  const auto problemWith = [](const char* file) {
    return thrownText<InputError>([file] { static_cast<void>(JsonDocument::read(file)); });
  };
  EXPECT_THAT(problemWith("/dev/null"), testing::StartsWith("/dev/null:1: not valid JSON: "));
  EXPECT_EQ(problemWith("/proc/self/mem"), "/proc/self/mem: the file cannot be read.");
  EXPECT_EQ(problemWith("/dev/zero"), "/dev/zero: the file is larger than 16 MiB.");
  EXPECT_EQ(problemWith("/proc"), "/proc: this is a directory, not a file.");
  EXPECT_EQ(problemWith("/proc/nothing"), "/proc/nothing: the file does not exist.");
}

TEST(JsonDocument, NamesTheLineWhereThePlaceIsInTheText) {
  JsonDocument document("{\n\"a\": 1}", "a.json");
  const auto problemAt = [&document](const std::string& path, const std::string& place) {
    return thrownText<InputError>([&] { document.fail(path, "sentence.", place); });
  };
  EXPECT_EQ(problemAt("a", "a"), "a.json:2: a: sentence.");
  EXPECT_EQ(problemAt("", ""), "a.json:1: the document: sentence.");
  EXPECT_EQ(problemAt("", "a"), "a.json:2: the document: sentence.");
  EXPECT_EQ(problemAt("b", "b"), "a.json: b: sentence.");
  document.setValue({{"b", 2}});
  EXPECT_EQ(document.value().dump(), R"({"b":2})");
  EXPECT_EQ(problemAt("a", "a"), "a.json:2: a: sentence.");
  EXPECT_EQ(problemAt("b", "b"), "a.json: b: sentence.");
}

}  // namespace
}  // namespace quazor
