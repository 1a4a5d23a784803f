#include "host/command/selftest.h"

#include "host/command/commands.h"
#include "host/error/host_error.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_plugins.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

ExpectedOutcome passes() { return {"Name", false, {}, "pass", std::nullopt, std::nullopt, {}, std::nullopt, "Name"}; }

ExpectedOutcome errs() {
  ExpectedOutcome outcome = passes();
  outcome.verdict = "error";
  outcome.error = ExpectedError{"Domain", -1, "it failed"};
  return outcome;
}

SelftestRow row(const std::string& scenario, ExpectedOutcome expected, std::uint64_t asExpected, std::uint64_t passed,
                std::vector<std::uint64_t> fired) {
  return {scenario, std::move(expected), 3, asExpected, passed, asExpected < 3 ? "it differs" : "", std::move(fired)};
}

TEST(DifferenceOf, IsNothingForWhatIsExpected) {
  EXPECT_EQ(differenceOf(passes(), recordOf("Name", Verdict::kPass)), "");
  EXPECT_EQ(differenceOf(errs(), recordOf("Name", Verdict::kError)), "");
  ExpectedOutcome fails = passes();
  fails.verdict = "fail";
  fails.failedResults = {"Count"};
  EXPECT_EQ(differenceOf(fails, recordOf("Name", Verdict::kFail)), "");
}

TEST(DifferenceOf, TellsTheFirstThatIsNotAsExpected) {
  EXPECT_EQ(differenceOf(passes(), recordOf("Name", Verdict::kError)), "the verdict: expected pass, got error");
  ExpectedOutcome fails = passes();
  fails.verdict = "fail";
  fails.failedResults = {"Other", "Count"};
  EXPECT_EQ(differenceOf(fails, recordOf("Name", Verdict::kFail)),
            "the failed results: expected Other, Count, got Count");
  for (const ExpectedError& error : {ExpectedError{"Else", -1, "it failed"}, ExpectedError{"Domain", 1, "it failed"},
                                     ExpectedError{"Domain", -1, "it broke"}}) {
    ExpectedOutcome outcome = errs();
    outcome.error = error;
    EXPECT_THAT(differenceOf(outcome, recordOf("Name", Verdict::kError)),
                testing::AllOf(testing::HasSubstr("the error: expected "),
                               testing::HasSubstr("got Domain code -1: it failed")));
  }
}

TEST(DifferenceOf, TakesAnyErrorOfAnEntryThatSaysNone) {
  ExpectedOutcome any = errs();
  any.error.reset();
  EXPECT_THAT(differenceOf(any, recordOf("Name", Verdict::kError)), testing::HasSubstr("the error: expected no error"));
  any.mayBeAnyError = true;
  EXPECT_EQ(differenceOf(any, recordOf("Name", Verdict::kError)), "");
  EXPECT_EQ(differenceOf(any, recordOf("Name", Verdict::kPass)), "the verdict: expected error, got pass");
}

TEST(DifferenceOf, LooksAtTheUnderlyingErrorAndTheImagesWhereTheyAreExpected) {
  ExpectedOutcome outcome = errs();
  outcome.underlying = ExpectedError{"Deep", 2, "the cause"};
  EXPECT_EQ(differenceOf(outcome, recordOf("Name", Verdict::kError)), "");
  outcome.underlying->code = 3;
  EXPECT_EQ(differenceOf(outcome, recordOf("Name", Verdict::kError)),
            "the underlying error: expected Deep code 3: the cause, got Deep code 2: the cause");
  ExpectedOutcome images = passes();
  images.images = 2;
  DiagnosticRecord record = recordOf("Name", Verdict::kPass);
  EXPECT_EQ(differenceOf(images, record), "the images: expected 2, got 0");
  record.auxiliaryData.set("images", Array{1, 2});
  EXPECT_EQ(differenceOf(images, record), "");
}

TEST(DifferenceOf, TakesTheHostsWordsForNoErrorUnlessTheyAreExpected) {
  DiagnosticRecord record = recordOf("Name", Verdict::kError);
  record.error = hostError(HostErrorCode::kNoErrorGiven, "it failed without giving an error");
  ExpectedOutcome outcome = errs();
  outcome.error.reset();
  EXPECT_EQ(differenceOf(outcome, record), "");
  outcome.error = ExpectedError{std::string(QuazorHostErrorDomain), 1, "it failed without giving an error"};
  EXPECT_EQ(differenceOf(outcome, record), "");
}

TEST(SelftestVerdicts, TellDetectionsFromMissesAndFalseAlarms) {
  const std::vector<SelftestRow> rows = {row("healthy", passes(), 3, 3, {}),  row("faulty", errs(), 3, 0, {1}),
                                         row("missed", errs(), 2, 1, {3}),    row("alarm", passes(), 2, 2, {}),
                                         row("different", errs(), 1, 0, {1}), row("invalid", errs(), 3, 0, {1, 0}),
                                         row("not run", {}, 3, 3, {})};
  std::vector<SelftestRow> all = rows;
  all.back().runs = 0;
  EXPECT_THAT(verdictsOf(all),
              testing::ElementsAre(SelftestVerdict::kPassed, SelftestVerdict::kDetected, SelftestVerdict::kMissed,
                                   SelftestVerdict::kFalseAlarm, SelftestVerdict::kDifferent, SelftestVerdict::kInvalid,
                                   SelftestVerdict::kInvalid));
  EXPECT_FALSE(allPassed(verdictsOf(all)));
  EXPECT_TRUE(allPassed(verdictsOf({rows[0], rows[1]})));
}

TEST(SelftestVerdicts, AreNoFalseAlarmWhereThePhoneItselfSaysNothing) {
  SelftestRow said = row("mine", passes(), 3, 2, {});
  said.expected.key = "Name";
  SelftestRow inherited = said;
  inherited.isInherited = true;
  inherited.outcome = expectationOf(inherited.expected, recordOf("Name", Verdict::kError));
  EXPECT_THAT(verdictsOf({said, inherited}),
              testing::ElementsAre(SelftestVerdict::kFalseAlarm, SelftestVerdict::kNotSaid));
  EXPECT_FALSE(allPassed(verdictsOf({inherited})));
  std::ostringstream out;
  printSelftest(out, {{inherited}, {}, 3, 0, {}, {}});
  EXPECT_THAT(out.str(),
              testing::HasSubstr("\n  mine does not say what these runs must find. If it is meant to have this\n  "
                                 "fault, add to it:\n    \"expect\": {\n      \"Name\": "
                                 R"({"verdict":"error","error":{"domain":"Domain","code":-1,"message":"it failed"}})"
                                 "\n    }\n"));
  EXPECT_THAT(out.str(), testing::Not(testing::HasSubstr("FALSE ALARM")));
}

TEST(Selftest, CountsWhatEachProfileDetects) {
  SelftestRow found = row("a", errs(), 3, 0, {1});
  found.concernsFault = true;
  found.foundByDefault = 3;
  found.foundByStrict = 3;
  SelftestRow blind = row("b", passes(), 3, 3, {1});
  blind.concernsFault = true;
  blind.foundByDefault = 2;
  blind.foundByStrict = 3;
  SelftestRow healthy = row("c", passes(), 3, 3, {});
  healthy.foundByStrict = 0;
  std::ostringstream out;
  printSelftest(out, {{found, blind, healthy}, {}, 3, 0, {}, {}});
  EXPECT_THAT(
      out.str(),
      testing::HasSubstr("Run   Faults  By default  Not detected  By strict  Not detected  False alarms  Invalid\n"
                         "Name       2           1             1          2             0        0 of 1        0\n"));
}

TEST(SelftestVerdicts, CountThePhonesFaultsInAllOfItsRowsTogether) {
  const std::vector<SelftestRow> rows = {row("phone", errs(), 3, 0, {3, 0}), row("phone", passes(), 3, 3, {0, 1}),
                                         row("other", errs(), 3, 0, {0})};
  EXPECT_THAT(verdictsOf(rows),
              testing::ElementsAre(SelftestVerdict::kDetected, SelftestVerdict::kPassed, SelftestVerdict::kInvalid));
}

SelftestOutcome outcomeOf(std::vector<SelftestRow> rows) {
  SelftestOutcome outcome;
  outcome.seeds = 3;
  for (const SelftestRow& one : rows) {
    const bool healthy = one.scenario == "healthy";
    const PhoneKind kind = healthy ? PhoneKind::kHealthy : PhoneKind::kFaulty;
    outcome.phones.push_back({one.scenario, "", kind, !healthy, {3, 3 - one.passes}});
  }
  for (SelftestRow& one : rows) {
    one.concernsFault = !one.expected.mustPass();
    one.foundByDefault = one.runs - one.passes;
  }
  outcome.rows = std::move(rows);
  outcome.wanted = outcome.phones.size();
  return outcome;
}

TEST(Selftest, PrintsTheMatrixAndWhatIsNotAsExpected) {
  std::ostringstream out;
  printSelftest(out, outcomeOf({row("healthy", passes(), 3, 3, {}), row("faulty", errs(), 3, 0, {1}),
                                row("missed", errs(), 2, 1, {3})}));
  EXPECT_EQ(out.str(),
            "Phone    Expected  By default       By strict\n"
            "healthy  passed    passed           not installed\n"
            "faulty   detected  detected         not installed\n"
            "missed   detected  in 2 of 3 seeds  not installed\n"
            "\n"
            "Not detected, and why:\n"
            "\n"
            "  missed\n"
            "    By default: in 2 of 3 seeds\n"
            "\n"
            "Not as the phone expects:\n"
            "  Phone   Run   Expected  As expected  Outcome\n"
            "  missed  Name  error          2 of 3  MISSED\n"
            "  missed, Name: it differs\n"
            "\n"
            "Run   Faults  By default  Not detected  By strict  Not detected  False alarms  Invalid\n"
            "Name       2           1             1          -             -        0 of 1        0\n"
            "\n"
            "Phones: 2 with a fault, 1 healthy; runs: 3, seeds of each: 3\n"
            "By default: 1 of 2 faults detected, 1 blind spot, 0 false alarms\n"
            "NOT as the phone expects: 1 of 3 runs\n");
}

TEST(Selftest, SaysHowFarItCame) {
  SelftestOutcome outcome = outcomeOf({row("faulty", errs(), 3, 0, {1})});
  outcome.wanted = 7;
  std::ostringstream out;
  printSelftest(out, outcome);
  EXPECT_THAT(out.str(), testing::EndsWith("Every run ended as its phone expects.\n"
                                           "Interrupted: 1 of 7 phones were run.\n"));
  EXPECT_EQ(selftestDocument(outcome)["interrupted"], true);
  EXPECT_EQ(selftestDocument(outcome)["phonesWanted"], 7);
}

TEST(Selftest, SaysWhatWasRefused) {
  SelftestOutcome outcome = outcomeOf({row("faulty", errs(), 3, 3, {1})});
  outcome.wanted = outcome.phones.size();
  EXPECT_EQ(selftestDocument(outcome)["refused"], nlohmann::ordered_json::array());
  outcome.refused = {{"broken", "broken.json:3: cameras: must be an object, not 7."}};
  std::ostringstream out;
  printSelftest(out, outcome);
  EXPECT_THAT(out.str(), testing::EndsWith("\nRefused: 1 of 2 phones\n"));
  const nlohmann::ordered_json due = {{"phone", "broken"}, {"reason", outcome.refused[0].reason}};
  EXPECT_EQ(selftestDocument(outcome)["refused"], nlohmann::ordered_json::array({due}));
}

TEST(Selftest, TellsLimitsThatFitNoResult) {
  SelftestOutcome outcome = outcomeOf({row("faulty", errs(), 3, 0, {1})});
  outcome.unusedLimits = {{"strict", "the limit was compared with nothing"}};
  std::ostringstream out;
  printSelftest(out, outcome);
  EXPECT_THAT(out.str(), testing::HasSubstr("\nBy strict: the limit was compared with nothing\n"));
  const nlohmann::ordered_json due = {{"profile", "strict"}, {"problem", "the limit was compared with nothing"}};
  EXPECT_EQ(selftestDocument(outcome)["unusedLimits"], nlohmann::ordered_json::array({due}));
}

TEST(Selftest, IsADocumentToo) {
  const nlohmann::ordered_json document = selftestDocument(outcomeOf({row("missed", errs(), 2, 1, {3})}));
  EXPECT_EQ(document["allAsExpected"], false);
  EXPECT_EQ(document["rows"][0]["outcome"], "missed");
  EXPECT_EQ(document["rows"][0]["difference"], "it differs");
  EXPECT_EQ(document["rows"][0]["faultsFired"][0], 3);
  EXPECT_EQ(document["phones"][0]["default"]["detected"], 2);
  EXPECT_EQ(document["totals"]["default"]["blindSpots"], 1);
  EXPECT_EQ(selftestDocument(outcomeOf({row("alarm", passes(), 2, 2, {})}))["rows"][0]["outcome"], "false alarm");
  EXPECT_TRUE(selftestDocument(outcomeOf({row("healthy", passes(), 3, 3, {})}))["rows"][0]["difference"].is_null());
}

TEST(SelftestCommand, IsRefusedWhereNothingIsTested) {
  const TestDirectory directory;
  const Installation installation(directory.path() / "bin" / "quazor");
  directory.write(std::filesystem::relative(installation.defaultProfile(), directory.path()),
                  R"({"schema": 1, "diagnostics": {}})");
  std::ostringstream out;
  std::ostringstream err;
  Console console{out, err};
  EXPECT_EQ(runProgram({"selftest", "--plugin", testPlugin("working")}, installation, console), ExitCode::kCannotRead);
  EXPECT_EQ(err.str(),
            "quazor: nothing was tested: no installed phone expects anything of what --plugin names; name the files of "
            "phones that do, as in 'quazor selftest phones/*.json --plugin FILE'\n");
  EXPECT_EQ(out.str(), "");
}

}  // namespace
}  // namespace quazor
