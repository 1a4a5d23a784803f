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

std::vector<PhoneDetection> phones() {
  return {{"found", "", false, true, {3, 3}, Detection{3, 3}, {}},
          {"changed", "Its title.", false, false, {3, 0}, Detection{3, 3}, {"D: a reason"}},
          {"sometimes", "", false, true, {3, 1}, Detection{3, 1}, {"D: seeds"}},
          {"healthy", "", true, false, {3, 0}, Detection{3, 1}, {}}};
}

TEST(Detections, AreCountedForBothProfiles) {
  const DetectionTotals totals = totalsOf(phones());
  EXPECT_EQ(totals.faulty, 2U);
  EXPECT_EQ(totals.changed, 1U);
  EXPECT_EQ(totals.healthy, 1U);
  std::ostringstream out;
  printTotals(out, totals);
  EXPECT_EQ(out.str(),
            "By default: 1 of 2 faults detected, 1 blind spot, 0 false alarms, 1 of 1 change passed\n"
            "By strict: 1 of 2 faults detected, 1 blind spot, 1 false alarm, 0 of 1 change passed\n");
  EXPECT_EQ(totalsJson(totals)["changed"], 1);
  EXPECT_EQ(totalsJson(totals)["default"],
            (nlohmann::ordered_json{{"detected", 1}, {"blindSpots", 1}, {"falseAlarms", 0}, {"changesPassed", 1}}));
  EXPECT_EQ(totalsJson(totals)["strict"],
            (nlohmann::ordered_json{{"detected", 1}, {"blindSpots", 1}, {"falseAlarms", 1}, {"changesPassed", 0}}));
}

TEST(Detections, CountAChangeThatDoesNotPassByDefaultAsAFalseAlarm) {
  const std::vector<PhoneDetection> changed = {{"changed", "", false, false, {3, 1}, Detection{3, 3}, {}}};
  const DetectionTotals totals = totalsOf(changed);
  EXPECT_EQ(totals.byDefault.falseAlarms, 1U);
  EXPECT_EQ(totals.byDefault.changesPassed, 0U);
  EXPECT_EQ(totals.byStrict->falseAlarms, 0U);
  std::ostringstream out;
  printDetections(out, changed);
  EXPECT_EQ(out.str(),
            "Phone    Expected  By default   By strict\n"
            "changed  passed    FALSE ALARM  detected\n");
}

TEST(Detections, ListBlindSpotsAndPassedChangesWithTheirReasons) {
  std::ostringstream out;
  printDetections(out, phones());
  EXPECT_EQ(out.str(),
            "Phone      Expected  By default       By strict\n"
            "found      detected  detected         detected\n"
            "changed    passed    passed           detected\n"
            "sometimes  detected  in 1 of 3 seeds  in 1 of 3 seeds\n"
            "healthy    passed    passed           FALSE ALARM\n"
            "\n"
            "Not detected by default, and why:\n"
            "\n"
            "  sometimes (by strict: in 1 of 3 seeds)\n"
            "    - D: seeds\n"
            "\n"
            "Passed by default as the phone expects, and what differs:\n"
            "\n"
            "  changed (by strict: detected)\n"
            "    Its title.\n"
            "    - D: a reason\n");
}

TEST(Detections, SayWhereTheProfileStrictIsNotInstalled) {
  std::vector<PhoneDetection> all = phones();
  for (PhoneDetection& one : all) one.byStrict.reset();
  std::ostringstream out;
  printDetections(out, all);
  EXPECT_THAT(out.str(), testing::HasSubstr("found      detected  detected         not installed\n"));
  EXPECT_TRUE(totalsJson(totalsOf(all))["strict"].is_null());
}

}  // namespace
}  // namespace quazor
