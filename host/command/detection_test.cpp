#include "host/command/detection.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

using testing::ElementsAre;

// A run that passed with these two results: one with the limit `>= minimum`, one without a limit.
DiagnosticRecord runWith(double count, double minimum, double offset) {
  DiagnosticRecord record = recordOf("D", Verdict::kPass);
  record.measuredResults =
      judgeResults({resultWithMinimum(count, minimum),
                    QZMeasuredResult("Offset", Measurement(offset, QZDimensionlessUnit::events()))});
  return record;
}

TEST(UndetectedChanges, SayWhyAResultThatDiffersDoesNotFail) {
  const DiagnosticRecord healthy = runWith(90, 80, 1);
  EXPECT_THAT(undetectedChanges(healthy, healthy), ElementsAre());
  EXPECT_THAT(undetectedChanges(healthy, runWith(90, 80, 2)),
              ElementsAre("D: Offset is 2 events instead of 1 events: it has no limit"));
  EXPECT_THAT(undetectedChanges(healthy, runWith(85, 80, 1)),
              ElementsAre("D: Count is 85 frames instead of 90 frames: it is within its limit (Enough: >= 80)"));
  EXPECT_THAT(undetectedChanges(healthy, runWith(70, 70, 1)),
              ElementsAre("D: Count is 70 frames instead of 90 frames: its limit changes with it (Enough: >= 70)"));
  DiagnosticRecord fewer = healthy;
  fewer.measuredResults.pop_back();
  EXPECT_THAT(undetectedChanges(healthy, fewer), ElementsAre("D: Offset is missing, and nothing requires it"));
  EXPECT_THAT(undetectedChanges(fewer, healthy), ElementsAre("D: Offset is new, and it has no limit"));
}

TEST(UndetectedChanges, LookAtWhatNoResultShows) {
  const DiagnosticRecord healthy = recordOf("D", Verdict::kPass);
  DiagnosticRecord changed = healthy;
  changed.log.push_back({{}, LogLevel::kError, "it slipped"});
  EXPECT_THAT(undetectedChanges(healthy, changed),
              ElementsAre("D: a log line is new, and log lines are not judged: it slipped"));
  changed.auxiliaryData.set("bytes", Bytes{1});
  EXPECT_THAT(undetectedChanges(healthy, changed),
              ElementsAre("D: the auxiliary data 'bytes' differ: auxiliary data are not judged"));
  changed.measurements.set("Raw", Measurement(1, QZDimensionlessUnit::frames()));
  EXPECT_THAT(undetectedChanges(healthy, changed),
              ElementsAre("D: the measurement Raw is 1 frames instead of 90 frames: no result is made of it"));
  changed.experimentOnly = true;
  EXPECT_THAT(undetectedChanges(healthy, changed),
              ElementsAre("D: the measurement Raw is 1 frames instead of 90 frames: an experiment on its own is not "
                          "judged"));
}

TEST(UndetectedChanges, NameThreeAndCountTheRest) {
  const DiagnosticRecord healthy = recordOf("D", Verdict::kPass);
  DiagnosticRecord changed = healthy;
  for (const char* line : {"1", "2", "3", "4", "5"}) changed.log.push_back({{}, LogLevel::kError, line});
  const std::vector<std::string> changes = undetectedChanges(healthy, changed);
  ASSERT_EQ(changes.size(), 4U);
  EXPECT_EQ(changes.back(), "D: and 2 more");
}

TEST(UndetectedChanges, NameTheLimitsOfTheUserToo) {
  const DiagnosticRecord healthy = runWith(90, 80, 1);
  UserLimit limit = parseUserLimit("Count > 60");
  limit.source = "profile p.json";
  const UserLimit warning = [] {
    UserLimit one = parseUserLimit("Offset == 1");
    one.severity = LimitSeverity::kWarn;
    return one;
  }();
  const DiagnosticRecord judged = judgedWith(runWith(85, 80, 2), {limit, warning});
  EXPECT_EQ(judged.verdict, Verdict::kPass);
  EXPECT_THAT(
      undetectedChanges(healthy, judged),
      ElementsAre("D: Count is 85 frames instead of 90 frames: it is within its limit (Enough: >= 80), and it is "
                  "within the limit " +
                      labelOf(limit),
                  "D: Offset is 2 events instead of 1 events: this limit only warns: " + labelOf(warning)));
}

TEST(AlarmText, SaysWhyARunDidNotPass) {
  EXPECT_EQ(alarmText(recordOf("D", Verdict::kFail)), "D fails: Count");
  EXPECT_EQ(alarmText(recordOf("D", Verdict::kError)), "D ends in an error: it failed");
  const UserLimit limit = parseUserLimit("Count > 95");
  EXPECT_EQ(alarmText(judgedWith(recordOf("D", Verdict::kPass), {limit})),
            "D fails: Count by the limit " + labelOf(limit));
}

std::vector<PhoneDetection> phones() {
  return {{"found", "", PhoneKind::kFaulty, true, {3, 3}, Detection{3, 3}},
          {"blind", "Its title.", PhoneKind::kFaulty, false, {3, 0, {"D: a reason"}}, Detection{3, 3}},
          {"sometimes", "", PhoneKind::kFaulty, true, {3, 1, {"D: seeds"}}, Detection{3, 0, {"D: another"}}},
          {"nowhere", "", PhoneKind::kFaulty, true, {3, 0, {"D: same"}}, Detection{3, 0, {"D: same"}}},
          {"changed", "", PhoneKind::kChanged, false, {3, 0, {"D: differs"}}, Detection{3, 0, {"D: differs"}}},
          {"alarmed", "", PhoneKind::kChanged, false, {3, 0, {"D: differs"}}, Detection{3, 3, {"D fails: Count"}}},
          {"healthy", "", PhoneKind::kHealthy, false, {3, 0}, Detection{3, 1, {"D fails: Count"}}}};
}

TEST(Detections, AreCountedForBothProfiles) {
  const DetectionTotals totals = totalsOf(phones());
  EXPECT_EQ(totals.faulty, 4U);
  EXPECT_EQ(totals.changed, 2U);
  EXPECT_EQ(totals.healthy, 1U);
  std::ostringstream out;
  printTotals(out, totals);
  EXPECT_EQ(out.str(),
            "By default: 1 of 4 faults detected, 3 blind spots, 0 false alarms, 2 of 2 changes passed\n"
            "By strict: 2 of 4 faults detected, 2 blind spots, 2 false alarms, 1 of 2 changes passed\n");
  EXPECT_EQ(totalsJson(totals)["changed"], 2);
  EXPECT_EQ(totalsJson(totals)["default"],
            (nlohmann::ordered_json{{"detected", 1}, {"blindSpots", 3}, {"falseAlarms", 0}, {"changesPassed", 2}}));
  EXPECT_EQ(totalsJson(totals)["strict"],
            (nlohmann::ordered_json{{"detected", 2}, {"blindSpots", 2}, {"falseAlarms", 2}, {"changesPassed", 1}}));
}

TEST(Detections, ListWhatIsNotAsItShouldBeWithTheReasonsOfEachProfile) {
  std::ostringstream out;
  printDetections(out, phones());
  EXPECT_EQ(out.str(),
            "Phone      Expected      By default       By strict\n"
            "found      detected      detected         detected\n"
            "blind      not detected  not detected     detected\n"
            "sometimes  detected      in 1 of 3 seeds  not detected\n"
            "nowhere    detected      not detected     not detected\n"
            "changed    passed        passed           passed\n"
            "alarmed    passed        passed           FALSE ALARM\n"
            "healthy    passed        passed           FALSE ALARM\n"
            "\n"
            "Not detected, and why:\n"
            "\n"
            "  blind (by default as its file expects)\n"
            "    Its title.\n"
            "    By default: not detected\n"
            "    - D: a reason\n"
            "    By strict: detected\n"
            "\n"
            "  sometimes\n"
            "    By default: in 1 of 3 seeds\n"
            "    - D: seeds\n"
            "    By strict: not detected\n"
            "    - D: another\n"
            "\n"
            "  nowhere\n"
            "    By default and by strict: not detected\n"
            "    - D: same\n"
            "\n"
            "False alarms:\n"
            "\n"
            "  alarmed\n"
            "    By default: passed\n"
            "    - D: differs\n"
            "    By strict: FALSE ALARM\n"
            "    - D fails: Count\n"
            "\n"
            "  healthy\n"
            "    By default: passed\n"
            "    By strict: FALSE ALARM\n"
            "    - D fails: Count\n"
            "\n"
            "Passed as the phone expects, and what differs:\n"
            "\n"
            "  changed\n"
            "    By default and by strict: passed\n"
            "    - D: differs\n");
}

TEST(Detections, SayWhereTheProfileStrictIsNotInstalled) {
  std::vector<PhoneDetection> all = phones();
  for (PhoneDetection& one : all) one.byStrict.reset();
  std::ostringstream out;
  printDetections(out, all);
  EXPECT_THAT(out.str(), testing::HasSubstr("found      detected      detected         not installed\n"));
  EXPECT_TRUE(totalsJson(totalsOf(all))["strict"].is_null());
}

}  // namespace
}  // namespace quazor
