#include "host/device/expected_outcome.h"

#include "base/json/json_cursor.h"
#include "base/text/input_error.h"
#include "host/testing/test_directory.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

std::vector<ExpectedOutcome> outcomesIn(const std::string& expect) {
  const JsonDocument document(R"({"expect": )" + expect + "}", "p.json");
  return readExpectedOutcomes(JsonCursor(document));
}

// The only outcome, with these entries.
ExpectedOutcome outcomeWith(const std::string& entries) { return outcomesIn(R"({"E": {)" + entries + "}}")[0]; }

std::string problemOf(const std::string& json) {
  return thrownText<InputError>([&] { outcomesIn(json); });
}

TEST(ExpectedOutcomes, AreReadInTheirOrder) {
  const std::vector<ExpectedOutcome> outcomes = outcomesIn(R"({
    "Error": {"verdict": "error", "error": {"domain": "E", "code": 214, "message": "N"},
              "underlying": {"domain": "F", "code": -1, "message": "O"}},
    "Silent": {"verdict": "error", "error": null, "underlying": null},
    "Fail": {"verdict": "fail", "failedResults": ["A.Total", "B.Total"]},
    "Alone": {"experiment": "X", "parameters": {"images": 5, "timeout": -0.5}, "verdict": "pass", "images": 6}})");
  ASSERT_EQ(outcomes.size(), 4U);
  const ExpectedOutcome& error = outcomes[0];
  EXPECT_EQ(error.name, "Error");
  EXPECT_EQ(error.verdict, "error");
  EXPECT_FALSE(error.experimentOnly);
  ASSERT_TRUE(error.error && error.underlying);
  EXPECT_EQ(error.error->domain, "E");
  EXPECT_EQ(error.error->code, 214);
  EXPECT_EQ(error.error->message, "N");
  EXPECT_EQ(error.underlying->domain, "F");
  EXPECT_EQ(error.underlying->code, -1);
  EXPECT_EQ(error.underlying->message, "O");
  EXPECT_FALSE(error.mayBeAnyError);
  EXPECT_FALSE(outcomes[1].error || outcomes[1].underlying);
  EXPECT_TRUE(outcomes[1].mayBeAnyError);
  EXPECT_FALSE(outcomes[2].mayBeAnyError) << "only an error can be any";
  EXPECT_THAT(outcomes[2].failedResults, testing::ElementsAre("A.Total", "B.Total"));
  const ExpectedOutcome& alone = outcomes[3];
  EXPECT_EQ(alone.name, "X");
  EXPECT_TRUE(alone.experimentOnly);
  EXPECT_EQ(alone.parameters, (OrderedMap<double>{{"images", 5.0}, {"timeout", -0.5}}));
  EXPECT_EQ(alone.images, 6U);
}

TEST(ExpectedOutcomes, MayLeaveTheErrorOpenOrSayThatThereIsNone) {
  const ExpectedOutcome any = outcomeWith(R"("verdict": "error")");
  EXPECT_TRUE(any.mayBeAnyError && !any.error);
  const ExpectedOutcome none = outcomeWith(R"("verdict": "error", "error": "none")");
  EXPECT_FALSE(none.mayBeAnyError || none.error);
  EXPECT_THAT(problemOf(R"({"E": {"verdict": "error", "error": "some"}})"),
              testing::HasSubstr("p.json:1: expect.E.error: "));
}

TEST(ExpectedOutcomes, AreToldWithTheLineIfTheFileItselfNamesThem) {
  const TestDirectory directory;
  const auto file =
      directory.write("p.json", "{\"base\": \"b.json\", \"expect\": {\n\"A.B\": {\"verdict\": \"pass\"}}}");
  ExpectedOutcome outcome = outcomesIn(R"({"A.B": {"experiment": "X", "verdict": "pass"}})")[0];
  EXPECT_EQ(outcome.key, "A.B");
  EXPECT_EQ(thrownText<InputError>([&] { failIfNamedIn(file, outcome, "it is not loaded."); }),
            file.string() + ":2: expect.A.B: it is not loaded.");
  EXPECT_TRUE(isNamedIn(file, outcome));
  outcome.key = "A";
  EXPECT_FALSE(isNamedIn(file, outcome));
  EXPECT_NO_THROW(failIfNamedIn(file, outcome, "it is not loaded."));
  EXPECT_NO_THROW(failIfNamedIn(directory.write("q.json", R"({"base": "b.json"})"), outcome, "it is not loaded."));
}

TEST(ExpectedOutcomes, LookAtNoMoreThanTheySay) {
  const nlohmann::ordered_json empty = nlohmann::ordered_json::object();
  EXPECT_TRUE(readExpectedOutcomes(JsonCursor(empty)).empty());
  const ExpectedOutcome alone = outcomeWith(R"("experiment": "X", "verdict": "error")");
  EXPECT_EQ(alone.images, std::nullopt);
  EXPECT_TRUE(alone.parameters.empty());
  EXPECT_FALSE(outcomeWith(R"("verdict": "pass")").experimentOnly);
}

TEST(ExpectedOutcomes, AreRefusedWhenMalformedOrContradictory) {
  const std::string error = R"({"domain": "D", "code": 1, "message": "M"})";
  EXPECT_EQ(problemOf("3"), "p.json:1: expect: must be an object, not 3.");
  const struct {
    std::string entries;
    const char* problem;
  } kRows[] = {
      {"", "expect.E: the key \"verdict\" is missing."},
      {R"("verdict": "failed")", "expect.E.verdict: \"failed\" is not a verdict; did you mean \"fail\"?"},
      {R"("verdict": "fail", "failedResult": [])",
       "expect.E: unknown key \"failedResult\"; did you mean \"failedResults\"?"},
      {R"("verdict": "error", "error": {"domain": "D", "code": 1})", "expect.E.error: the key \"message\" is missing."},
      {R"("verdict": "pass", "error": )" + error, "expect.E: only the verdict \"error\" can have an error."},
      {R"("verdict": "error", "underlying": )" + error, "expect.E: an underlying error requires an \"error\"."},
      {R"("verdict": "pass", "failedResults": ["A"])",
       "expect.E.failedResults: only the verdict \"fail\" can have failed results."},
      {R"("verdict": "fail", "failedResults": [1])", "expect.E.failedResults[0]: must be a non-empty string, not 1."},
      {R"("verdict": "pass", "parameters": {})",
       "expect.E: only the run of an experiment can have parameters; add \"experiment\"."},
      {R"("verdict": "pass", "images": 1)",
       "expect.E: only the run of an experiment can have images; add \"experiment\"."},
      {R"("experiment": "X", "verdict": "fail")",
       "expect.E: an experiment that runs on its own is not judged; it can only pass or end in an error."},
      {R"("experiment": "X", "verdict": "error", "images": 1)", "expect.E: only the verdict \"pass\" can have images."},
      {R"("experiment": "X", "verdict": "pass", "parameters": {"p": "5"})",
       "expect.E.parameters.p: must be a number from -1.7976931348623157e+308 to 1.7976931348623157e+308, not \"5\"."},
      {R"("experiment": "X", "verdict": "pass", "images": -1)",
       "expect.E.images: must be an integer from 0 to 1000000000, not -1."},
      {R"("experiment": "", "verdict": "pass")", "expect.E.experiment: must be a non-empty string, not \"\"."},
  };
  for (const auto& row : kRows)
    EXPECT_EQ(problemOf(R"({"E": {)" + row.entries + "}}"), std::string("p.json:1: ") + row.problem) << row.entries;
}

}  // namespace
}  // namespace quazor
