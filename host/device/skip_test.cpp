#include "host/device/skip.h"

#include "base/json/json_cursor.h"
#include "base/text/input_error.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;

std::vector<SkipRule> absentIn(const std::string& absent) {
  const JsonDocument document(R"({"absent": )" + absent + "}", "p.json");
  return readAbsent(JsonCursor(document));
}

TEST(SkipKind, IsFoundByItsName) {
  for (const SkipKind kind : {SkipKind::kNoSuchHardware, SkipKind::kNotAllowed, SkipKind::kNotReached}) {
    EXPECT_EQ(skipKindNamed(nameOf(kind)), kind);
  }
  EXPECT_EQ(skipKindNamed("absent"), std::nullopt);
}

TEST(ReadAbsent, ReadsSentencesAndKinds) {
  const std::vector<SkipRule> rules =
      absentIn(R"({"A.*": "There is no A.", "B": {"kind": "not-allowed", "reason": "B is hot."}})");
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules[0].pattern, "A.*");
  EXPECT_EQ(textOf(rules[0].skip), "no-such-hardware: There is no A.");
  EXPECT_EQ(rules[1].pattern, "B");
  EXPECT_EQ(textOf(rules[1].skip), "not-allowed: B is hot.");
  const JsonDocument nothing("{}", "p.json");
  EXPECT_TRUE(readAbsent(JsonCursor(nothing)).empty());
}

TEST(ReadAbsent, RefusesWhatHasAnotherForm) {
  for (const char* const absent :
       {R"([])", R"({"": "x"})", R"({"A": ""})", R"({"A": 1})", R"({"A": {"reason": "x"}})",
        R"({"A": {"kind": "not-allowed"}})", R"({"A": {"kind": "not-reached", "reason": "x"}})",
        R"({"A": {"kind": "gone", "reason": "x"}})", R"({"A": {"kind": "not-allowed", "reason": "x", "why": ""}})"}) {
    try {
      absentIn(absent);
      ADD_FAILURE() << absent;
    } catch (const InputError& problem) {
      EXPECT_THAT(problem.what(), HasSubstr("p.json:1: ")) << absent;
    }
  }
  try {
    absentIn(R"(["infrared"])");
    ADD_FAILURE();
  } catch (const InputError& problem) {
    EXPECT_THAT(problem.what(),
                HasSubstr("absent: must be an object with the reason for each diagnostic, or pattern of "
                          "them, that is skipped"));
  }
}

}  // namespace
}  // namespace quazor
