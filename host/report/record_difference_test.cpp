#include "host/report/record_difference.h"

#include "host/testing/test_events.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::IsEmpty;

RecordedRun runWith(std::vector<DiagnosticRecord> records) { return {runOf({}), std::move(records), std::nullopt}; }

std::vector<std::string> differences(const std::function<void(DiagnosticRecord&)>& change,
                                     Verdict verdict = Verdict::kPass) {
  DiagnosticRecord changed = recordOf("A", verdict);
  change(changed);
  return differencesOf(runWith({recordOf("A", verdict)}), runWith({changed}));
}

TEST(DifferencesOf, AreNoneOfEqualRuns) {
  const RecordedRun run = runWith({recordOf("A", Verdict::kPass), recordOf("B", Verdict::kError)});
  EXPECT_THAT(differencesOf(run, run), IsEmpty());
  EXPECT_THAT(differencesOf(runWith({}), runWith({})), IsEmpty());
}

TEST(DifferencesOf, LeaveOutTimesAndLogs) {
  EXPECT_THAT(differences([](DiagnosticRecord& record) {
                record.begin = momentAt(1);
                record.end = momentAt(2);
                record.durations.run = 5s;
                record.log.clear();
                record.stages.push_back({Stage::kRun, momentAt(1), momentAt(2)});
                record.parameters.experiment[0].source = "environment";
              }),
              IsEmpty());
}

TEST(DifferencesOf, TellWhatWasAndWhatIs) {
  struct Row {
    const char* name;
    std::function<void(DiagnosticRecord&)> change;
    std::vector<std::string> differences;
  };
  const Row rows[] = {
      {"a verdict", [](DiagnosticRecord& r) { r.verdict = Verdict::kFail; }, {"A: verdict was pass and is fail"}},
      {"an error",
       [](DiagnosticRecord& r) {
         r.error = errorWithMessage("D", 1, "two\nlines", errorWithMessage("E", 2, "cause", nullptr));
       },
       {"A: error was none and is D code 1: two\\x0alines caused by E code 2: cause"}},
      {"a parameter's value",
       [](DiagnosticRecord& r) { r.parameters.experiment[0].value = Value(4); },
       {"A: parameter experiment.duration was 3 and is 4"}},
      {"a parameter that was not set",
       [](DiagnosticRecord& r) { r.parameters.experiment[1].value = Value(0.5); },
       {"A: parameter experiment.gain was not set and is 0.5"}},
      {"a new parameter",
       [](DiagnosticRecord& r) {
         r.parameters.analysis.push_back({"x", QZNumberParameter("", false), Value(1), "command line"});
       },
       {"A: parameter analysis.x is only in the second: 1"}},
      {"a measurement",
       [](DiagnosticRecord& r) { r.measurements.set("Raw", Measurement(91, QZDimensionlessUnit::frames())); },
       {"A: measurement Raw was 90 frames and is 91 frames"}},
      {"a measurement's unit",
       [](DiagnosticRecord& r) { r.measurements.set("Raw", Measurement(90, QZDimensionlessUnit::errors())); },
       {"A: measurement Raw was 90 frames and is 90 errors"}},
      {"a result's value",
       [](DiagnosticRecord& r) { r.measuredResults[0].result = resultWithMinimum(91, 90); },
       {"A: result Count was 90 frames, Enough: >= 90, pass and is 91 frames, Enough: >= 90, pass"}},
      {"a limit",
       [](DiagnosticRecord& r) { r.measuredResults[0].result = resultWithMinimum(90, 80); },
       {"A: result Count was 90 frames, Enough: >= 90, pass and is 90 frames, Enough: >= 80, pass"}},
      {"a result's verdict",
       [](DiagnosticRecord& r) { r.measuredResults[0].verdict = ResultVerdict::kFail; },
       {"A: result Count was 90 frames, Enough: >= 90, pass and is 90 frames, Enough: >= 90, fail"}},
      {"a result that is missing",
       [](DiagnosticRecord& r) { r.measuredResults.pop_back(); },
       {"A: result Offset is only in the first: 0.5 events, -, none"}},
      {"a second result of one name",
       [](DiagnosticRecord& r) {
         r.measuredResults.push_back({resultWithMinimum(91, 90), ResultVerdict::kPass});
       },
       {"A: result Count (2) is only in the second: 91 frames, Enough: >= 90, pass"}},
      {"auxiliary data",
       [](DiagnosticRecord& r) { r.auxiliaryData.set("bytes", Bytes{1}); },
       {"A: auxiliary data bytes was a5 and is 01"}},
  };
  for (const Row& row : rows) EXPECT_EQ(differences(row.change), row.differences) << row.name;
}

RecordedRun tracedRun(std::vector<RecordedStream> streams) {
  RecordedRun run = runWith({recordOf("A", Verdict::kPass)});
  run.began.traced = true;
  run.streams = {std::move(streams)};
  return run;
}

TEST(DifferencesOf, TellTheFirstFrameOfEachStreamThatDiffers) {
  const std::vector<TracedFrame> frames = {{0, 1, 2, 3}, {1, 11, 12, 13}, {2, 21, 22, std::nullopt}};
  const std::vector<TracedFrame> changed = {{0, 1, 2, 3}, {2, -5, 12, 14}, {2, 21, 22, 23}};
  const std::vector<TracedFrame> shorter = {{0, 1, 2, 3}, {1, 11, 12, 13}};
  const RecordedRun run = tracedRun({{"back", frames, 0}, {"front", frames, 0}});
  EXPECT_THAT(differencesOf(run, run), IsEmpty());
  EXPECT_EQ(
      differencesOf(run, tracedRun({{"front", changed, 0}, {"back", frames, 0}})),
      std::vector<std::string>(
          {"A: stream front: frame 2, the first that differs, was number 1, captured at 11 ns, delivered at "
           "12 ns, returned at 13 ns and is number 2, captured at -5 ns, delivered at 12 ns, returned at 14 ns"}));
  EXPECT_EQ(differencesOf(run, tracedRun({{"back", shorter, 7}})),
            std::vector<std::string>({"A: stream back: frame 3, the first that differs, is only in the first: number "
                                      "2, captured at 21 ns, delivered at 22 ns, not returned",
                                      "A: stream back: the number of lost frames was 0 and is 7",
                                      "A: stream front is only in the first"}));
  EXPECT_EQ(differencesOf(tracedRun({{"back", shorter, 0}}), run),
            std::vector<std::string>({"A: stream back: frame 3, the first that differs, is only in the second: number "
                                      "2, captured at 21 ns, delivered at 22 ns, not returned",
                                      "A: stream front is only in the second"}));
}

TEST(DifferencesOf, TellTheFirstTaskOfEachQueueThatDiffersIfBothRecordsHaveThem) {
  const auto withTasks = [](std::vector<TracedFrame> tasks, std::uint64_t lost) {
    RecordedRun run = tracedRun({});
    run.began.tracesTasks = true;
    run.queues = {{{"Work", std::move(tasks), lost, {}, TracedKind::kTasks}}};
    return run;
  };
  const RecordedRun run = withTasks({{1, 2, 3, 4}, {1, 5, 6, std::nullopt}}, 0);
  EXPECT_THAT(differencesOf(run, run), IsEmpty());
  EXPECT_EQ(
      differencesOf(run, withTasks({{1, 2, 3, 4}, {2, 5, 6, 7}}, 1)),
      std::vector<std::string>(
          {"A: queue Work: task 2, the first that differs, was thread 1, posted at 5 ns, begun at 6 ns, not ended "
           "and is thread 2, posted at 5 ns, begun at 6 ns, ended at 7 ns",
           "A: queue Work: the number of lost tasks was 0 and is 1"}));
  EXPECT_THAT(differencesOf(run, tracedRun({})), IsEmpty());
  EXPECT_THAT(differencesOf(tracedRun({}), run), IsEmpty());
}

TEST(DifferencesOf, LeaveOutTheFramesIfOneRecordHasNone) {
  const RecordedRun traced = tracedRun({{"back", {{0, 1, 2, 3}}, 0}});
  const RecordedRun untraced = runWith({recordOf("A", Verdict::kPass)});
  EXPECT_THAT(differencesOf(traced, untraced), IsEmpty());
  EXPECT_THAT(differencesOf(untraced, traced), IsEmpty());
}

TEST(DifferencesOf, TellWhichDiagnosticsOnlyOneRunHas) {
  const DiagnosticRecord a = recordOf("A", Verdict::kPass);
  const DiagnosticRecord b = recordOf("B", Verdict::kPass);
  const DiagnosticRecord c = recordOf("C", Verdict::kPass);
  EXPECT_THAT(differencesOf(runWith({a, b}), runWith({c, b})),
              testing::ElementsAre("A is only in the first", "C is only in the second"));
}

}  // namespace
}  // namespace quazor
