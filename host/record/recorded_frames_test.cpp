// Records with the event `frames`.
#include "host/error/exit_code.h"
#include "host/record/record_file.h"
#include "host/record/run_event_json.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_events.h"
#include "host/testing/test_refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace quazor {
namespace {

namespace fs = std::filesystem;
using testing::EndsWith;
using testing::StartsWith;

class RecordedFramesTest : public testing::Test {
 protected:
  static RunEvent frames(const std::string& stream, std::vector<TracedFrame> rows, std::uint64_t lost = 0) {
    return FramesTraced{stream, 1, std::move(rows), lost};
  }

  // A run of two diagnostics in which the first one is `inside`.
  static std::vector<RunEvent> runWith(const std::vector<RunEvent>& inside, bool traced = true) {
    RunStarted began = runOf({"A", "B"});
    began.traced = traced;
    std::vector<RunEvent> events = {began, beginningOf("A"), StageStarted{Stage::kRun, momentAt(2)}};
    events.insert(events.end(), inside.begin(), inside.end());
    events.emplace_back(DiagnosticEnded{Verdict::kError, momentAt(3)});
    events.emplace_back(beginningOf("B"));
    return events;
  }

  fs::path write(const std::vector<RunEvent>& events) const {
    const fs::path file = directory_.path() / "record";
    RecordWriter writer(file, RecordWriter::Existing::kReplace);
    for (const RunEvent& event : events) writer.onEvent(event);
    EXPECT_EQ(writer.problem(), "");
    return file;
  }

  std::string refusalOfRun(const std::vector<RunEvent>& events) const {
    const fs::path file = write(events);
    return refusalOf(ExitCode::kCannotRead, [&] { readRecord(file); });
  }

  TestDirectory directory_;
};

TEST_F(RecordedFramesTest, MakeTheVersionOfTheRecordAnother) {
  write(runWith({}, false));
  EXPECT_THAT(directory_.read("record"), StartsWith(R"({"sequence":0,"record":2,"event":"runBegan",)"));
  const fs::path file = write(runWith({}));
  EXPECT_THAT(directory_.read("record"), StartsWith(R"({"sequence":0,"record":3,"event":"runBegan",)"));
  EXPECT_TRUE(runIn(file).began.traced);
}

TEST_F(RecordedFramesTest, BelongToTheStreamsOfTheirDiagnostic) {
  std::vector<RunEvent> events = runWith({frames("front", {{0, 5, 10, 20}}, 2), frames("back", {{0, 1, 2, 3}}),
                                          frames("front", {{1, 4, 10, std::nullopt}, {2, 6, 11, 12}}, 3)});
  events.push_back(frames("front", {{0, 0, 1, 1}}));  // of the next diagnostic, whose time begins again
  const RecordedRun run = runIn(write(events));
  ASSERT_EQ(run.records.size(), 2U);
  ASSERT_EQ(run.streams.size(), 2U);
  ASSERT_EQ(run.streams[0].size(), 2U);
  EXPECT_EQ(run.streams[0][0].name, "front");
  EXPECT_EQ(run.streams[0][0].frames,
            std::vector<TracedFrame>({{0, 5, 10, 20}, {1, 4, 10, std::nullopt}, {2, 6, 11, 12}}));
  EXPECT_EQ(run.streams[0][0].lost, 5U);
  EXPECT_EQ(run.streams[0][1].name, "back");
  EXPECT_EQ(run.streams[0][1].frames.size(), 1U);
  ASSERT_EQ(run.streams[1].size(), 1U);
  EXPECT_EQ(run.streams[1][0].frames, std::vector<TracedFrame>({{0, 0, 1, 1}}));
}

TEST_F(RecordedFramesTest, AreRefusedIfTheyGoBackFromOneLineToTheNext) {
  const RunEvent first = frames("front", {{0, 5, 10, 20}, {1, 6, 11, 20}});
  EXPECT_EQ(refusalOfRun(runWith(
                {first, frames("front", {}), frames("back", {{0, 0, 1, 1}}), frames("front", {{2, 0, 11, 12}})})),
            "accepted");
  EXPECT_THAT(
      refusalOfRun(runWith({first, frames("front", {}), frames("front", {{2, 7, 10, 12}})})),
      EndsWith("record', line 6: the column \"delivered\", entry 1: the frame was delivered before the last one "
               "of the stream 'front' in an earlier line"));
}

TEST_F(RecordedFramesTest, AreRefusedInARecordOfAnEarlierVersion) {
  EXPECT_THAT(refusalOfRun(runWith({frames("front", {})}, false)),
              EndsWith("record', line 4: a record has the event 'frames' from version 3 on"));
}

TEST_F(RecordedFramesTest, MayHaveTasksBesideThem) {
  const RunEvent tasks = FramesTraced{"front", 1, {{1, 5, 10, 20}}, 1, TracedKind::kTasks};
  const RunEvent later = FramesTraced{"front", 1, {{1, 5, 9, 20}}, 0, TracedKind::kTasks};
  const RunEvent earlierFrame = frames("front", {{0, 0, 1, 1}});
  std::vector<RunEvent> events = runWith({tasks, earlierFrame});
  EXPECT_THAT(refusalOfRun(events), EndsWith("record', line 4: a record has the event 'tasks' from version 4 on"));
  std::get<RunStarted>(events[0]).tracesTasks = true;
  const fs::path file = write(events);
  EXPECT_THAT(directory_.read("record"), StartsWith(R"({"sequence":0,"record":4,"event":"runBegan",)"));
  const RecordedRun run = runIn(file);
  EXPECT_TRUE(run.began.traced);
  EXPECT_TRUE(run.began.tracesTasks);
  ASSERT_EQ(run.queues[0].size(), 1U);
  EXPECT_EQ(run.queues[0][0].name, "front");
  EXPECT_EQ(run.queues[0][0].frames, std::vector<TracedFrame>({{1, 5, 10, 20}}));
  EXPECT_EQ(run.queues[0][0].lost, 1U);
  ASSERT_EQ(run.streams[0].size(), 1U);
  events.insert(events.begin() + 5, later);
  EXPECT_THAT(refusalOfRun(events),
              EndsWith("line 6: the column \"begun\", entry 1: the task began before the last one of "
                       "the queue 'front' in an earlier line"));
}

TEST_F(RecordedFramesTest, AreRefusedWithLineAndColumn) {
  write(runWith({frames("front", {{0, 5, 10, 20}, {1, 6, 11, 20}})}));
  std::string text = directory_.read("record");
  const std::string column = R"("delivered":[10,1])";
  text.replace(text.find(column), column.size(), R"("delivered":[10,-1])");
  const fs::path bad = directory_.write("bad", text);
  EXPECT_THAT(
      refusalOf(ExitCode::kCannotRead, [&] { readRecord(bad); }),
      EndsWith("bad', line 4: the column \"delivered\", entry 2: the frame was delivered before the one before it"));
}

}  // namespace
}  // namespace quazor
