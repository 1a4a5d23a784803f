#include "base/json/json_file.h"

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
               {"", 1},
               {"nowhere", 1}};
  for (const auto& row : kRows) EXPECT_EQ(lineOfPath(kDocument, row.path), row.line) << row.path;
}

std::string problemOf(std::string_view text) {
  try {
    parseJson(text, "a.json");
  } catch (const JsonProblem& problem) {
    return problem.what();
  }
  return "nothing";
}

TEST(ParseJson, TellsTheLineOfWhatIsWrong) {
  EXPECT_EQ(problemOf("{\n\"a\": 1,\n\"a\": 2}"), "a.json:3: the key \"a\" stands twice; leave one of the two.");
  EXPECT_EQ(problemOf("{\"b\": [\n{\"a\": 1,\n\"a\": 2}]}"),
            "a.json:3: b[0]: the key \"a\" stands twice; leave one of the two.");
  EXPECT_EQ(problemOf("{\n\"a\": 1e999}"), "a.json:2: a: the number is too large; a double must hold it.");
  EXPECT_EQ(problemOf("\n" + std::string(40, '[')), "a.json:2: the document is nested more than 32 deep.");
  EXPECT_THAT(problemOf("{\n\n\"a\" 1}"), testing::StartsWith("a.json:3: this is not JSON: "));
  EXPECT_EQ(problemOf("\n\xff"), "a.json:2: this is not UTF-8; save the file in that encoding.");
}

TEST(ReadTextFile, SaysWhyAFileCannotBeRead) {
  const auto problemWith = [](const char* file) -> std::string {
    try {
      return "read: " + readTextFile(file);
    } catch (const JsonProblem& problem) {
      return problem.what();
    }
  };
  EXPECT_EQ(problemWith("/dev/null"), "read: ");
  EXPECT_EQ(problemWith("/proc/self/mem"), "/proc/self/mem: the file cannot be read.");
  EXPECT_EQ(problemWith("/dev/zero"), "/dev/zero: the file is larger than 16 MiB.");
  EXPECT_EQ(problemWith("/proc"), "/proc: this is a directory, not a file.");
  EXPECT_EQ(problemWith("/proc/nothing"), "/proc/nothing: there is no such file.");
}

TEST(JsonProblem, KnowsThePlaceThatItIsAbout) {
  EXPECT_EQ(JsonProblem("sentence").place(), std::nullopt);
  EXPECT_EQ(JsonProblem("a[1]", "sentence").place(), "a[1]");
  EXPECT_STREQ(JsonProblem("a[1]", "sentence").what(), "a[1]: sentence");
  EXPECT_STREQ(JsonProblem("", "sentence").what(), "the document: sentence");
  EXPECT_STREQ(JsonProblem("a", "sentence", "a.b").what(), "a: sentence");
  EXPECT_EQ(JsonProblem("a", "sentence", "a.b").place(), "a.b");
}

}  // namespace
}  // namespace quazor
