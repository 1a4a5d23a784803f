#include "host/report/timeline.h"

#include "host/testing/test_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cstdint>
#include <optional>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using Json = nlohmann::json;
using testing::ElementsAre;
using testing::HasSubstr;

constexpr auto kSecond = 1'000'000'000LL;

Json lineOf(const std::vector<RunEvent>& events, const TimelinePart& part = {}) {
  return Json::parse(timelineText(events, part));
}

// The events of that kind and name, in order.
std::vector<Json> eventsIn(const Json& line, const std::string& kind, const std::string& name) {
  std::vector<Json> found;
  for (const Json& event : line["traceEvents"]) {
    if (event["ph"] == kind && event["name"] == name) found.push_back(event);
  }
  return found;
}

Json eventIn(const Json& line, const std::string& kind, const std::string& name) {
  const std::vector<Json> found = eventsIn(line, kind, name);
  EXPECT_EQ(found.size(), 1U) << kind << " " << name;
  return found.empty() ? Json() : found.front();
}

void expectPeriod(const Json& event, double begin, double duration) {
  EXPECT_DOUBLE_EQ(event["ts"], begin) << event;
  EXPECT_DOUBLE_EQ(event["dur"], duration) << event;
}

LogLine logLine(std::chrono::nanoseconds time, std::string text) {
  return {time, LogLevel::kDefault, std::move(text), momentAt(11)};
}

// Of a diagnostic that loads for 5 ms by the wall clock and then runs for 3 s by the phone's.
std::vector<RunEvent> tracedRun() {
  RunStarted run = runOf({"A"});
  run.date = momentAt(0);
  DiagnosticStarted began = beginningOf("A");
  began.date = momentAt(2);
  return {run,
          began,
          StageStarted{Stage::kLoad, momentAt(2)},
          StageEnded{Stage::kLoad, std::nullopt, momentAt(7)},
          StageStarted{Stage::kSetup, momentAt(8)},
          StageEnded{Stage::kSetup, 250ms, momentAt(9)},
          StageStarted{Stage::kRun, momentAt(10)},
          Logged{logLine(1s + 1ns, "one\ntwo"), false},
          FramesTraced{"wide", 1, {{7, kSecond / 3, kSecond / 2, kSecond}, {8, kSecond, kSecond + 1, std::nullopt}}, 0},
          StageEnded{Stage::kRun, 3s, momentAt(12)},
          DiagnosticCompleted{},
          DiagnosticEnded{Verdict::kPass, momentAt(13)},
          RunEnded{std::nullopt, momentAt(14)}};
}

TEST(Timeline, HasARowWithTheTasksOfAQueue) {
  std::vector<RunEvent> events = tracedRun();
  events.insert(events.end() - 4,
                FramesTraced{"wide",
                             1,
                             {{3, kSecond, kSecond + 2000, kSecond + 7000}, {4, kSecond, kSecond + 9000, std::nullopt}},
                             2,
                             TracedKind::kTasks});
  const Json line = lineOf(events);
  const Json task = eventIn(line, "X", "thread 3");
  expectPeriod(task, 1'007'002, 5);
  EXPECT_EQ(task["args"], Json::parse(R"({"waited":2.0,"ran":5.0})"));
  EXPECT_EQ(eventIn(line, "i", "thread 4, not ended")["args"], Json::parse(R"({"waited":9.0})"));
  EXPECT_EQ(eventsIn(line, "i", "2 tasks could not be recorded").size(), 1U);
  EXPECT_EQ(eventsIn(line, "i", "frame 7").size(), 1U);  // the stream of the same name has a row of its own
  EXPECT_NE(eventsIn(line, "i", "frame 7")[0]["tid"], task["tid"]);
}

TEST(Timeline, HasStagesOneAfterTheOther) {
  const Json line = lineOf(tracedRun());
  expectPeriod(eventIn(line, "X", "load"), 2000, 5000);
  expectPeriod(eventIn(line, "X", "setup"), 7000, 250'000);
  const std::vector<Json> runs = eventsIn(line, "X", "run");  // the stage, and the whole run
  ASSERT_EQ(runs.size(), 2U);
  expectPeriod(runs[0], 257'000, 3'000'000);
  expectPeriod(runs[1], 0, 3'257'000);
}

TEST(Timeline, HasAStageWithoutLengthAsAnInstant) {
  std::vector<RunEvent> events = tracedRun();
  std::get<StageEnded>(events[5]).duration = 0ns;
  const Json line = lineOf(events);
  EXPECT_EQ(eventsIn(line, "X", "setup").size(), 0U);
  EXPECT_DOUBLE_EQ(eventIn(line, "i", "setup")["ts"], 7000);
}

TEST(Timeline, HasADiagnosticAsLongAsWhatItShows) {
  const Json diagnostic = eventIn(lineOf(tracedRun()), "X", "A");
  expectPeriod(diagnostic, 2000, 3'255'000);
  EXPECT_EQ(diagnostic["args"]["verdict"], "pass");
}

TEST(Timeline, HasFramesByThePhonesClockWhichBeginsAfterLoading) {
  const std::string text = timelineText(tracedRun());
  EXPECT_THAT(text, HasSubstr(R"("ts":507000.000,"name":"frame 7","args":{"latency":166666.667,"held":500000.000})"));
  EXPECT_THAT(text, HasSubstr(R"("ts":1007000.001,"name":"frame 8","args":{"latency":0.001})"));
}

TEST(Timeline, HasLogLinesWithTheirWholeText) {
  const Json log = eventIn(lineOf(tracedRun()), "i", "one");
  EXPECT_DOUBLE_EQ(log["ts"], 1'007'000.001);
  EXPECT_EQ(log["args"]["text"], "one\ntwo");
  EXPECT_EQ(log["args"]["level"], "default");
}

TEST(Timeline, BeginsADiagnosticAfterTheEndOfTheOneBefore) {
  std::vector<RunEvent> events = tracedRun();
  DiagnosticStarted second = beginningOf("B");
  second.date = momentAt(13);
  events.insert(events.end() - 1, {second, DiagnosticEnded{Verdict::kPass, momentAt(15)}});
  expectPeriod(eventIn(lineOf(events), "X", "B"), 3'257'000, 2000);
  second.date = momentAt(60'000);
  *(events.end() - 3) = second;
  *(events.end() - 2) = DiagnosticEnded{Verdict::kPass, momentAt(60'001)};
  expectPeriod(eventIn(lineOf(events), "X", "B"), 60'000'000, 1000);
}

TEST(Timeline, TellsOfFramesThatWereLostOrLeftOut) {
  std::vector<RunEvent> events = tracedRun();
  events.insert(events.end() - 4, FramesTraced{"wide", 4, {{12, 0, kSecond, std::nullopt}}, 3});
  const Json line = lineOf(events);
  EXPECT_EQ(eventsIn(line, "i", "from here, 1 of 4 frames is recorded").size(), 1U);
  EXPECT_EQ(eventsIn(line, "i", "3 frames could not be recorded").size(), 1U);
}

TEST(Timeline, EndsWithARecordThatWasCut) {
  std::vector<RunEvent> events = tracedRun();
  events.resize(9);
  const Json line = lineOf(events);
  EXPECT_EQ(eventsIn(line, "X", "run")[0]["args"]["ended"], false);
  EXPECT_TRUE(eventIn(line, "X", "A")["args"]["verdict"].is_null());
}

TEST(Timeline, HasMeasurementsAsCounters) {
  std::vector<RunEvent> events = tracedRun();
  events.insert(
      events.end() - 3,
      MeasurementsAdded{{{"Good", resultOf(90).measurement()},
                         {"Bad", {std::numeric_limits<double>::quiet_NaN(), resultOf(90).measurement().unit()}}}});
  const Json line = lineOf(events);
  EXPECT_EQ(eventIn(line, "C", "Good")["ts"], 3'257'000);
  EXPECT_EQ(eventsIn(line, "C", "Bad").size(), 0U);
  EXPECT_THAT(eventIn(line, "i", "Bad")["args"].dump(), HasSubstr("nan"));
}

TEST(Timeline, HasWhatEveryKindOfEventTells) {
  const Json line = lineOf(wholeRun());
  for (const char* const name : {"Good", "Bad", "Strange", "Broken"}) {
    EXPECT_EQ(eventsIn(line, "X", name).size(), 1U) << name;
  }
  const Json broken = eventIn(line, "X", "Broken");
  EXPECT_EQ(broken["args"]["verdict"], "error");
  const std::vector<Json> errors = eventsIn(line, "i", "error");
  ASSERT_FALSE(errors.empty());
  EXPECT_EQ(errors.back()["pid"], broken["pid"]);
  EXPECT_EQ(errors.back()["args"]["error"], broken["args"]["error"]);
}

TEST(Timeline, LeavesOutWhatIsOutsideAPart) {
  const Json line = lineOf(tracedRun(), {1s, 2s});
  EXPECT_EQ(eventsIn(line, "X", "load").size(), 0U);
  EXPECT_EQ(eventsIn(line, "X", "A").size(), 1U);
  EXPECT_EQ(eventsIn(line, "i", "frame 7").size(), 0U);
  EXPECT_EQ(eventsIn(line, "i", "frame 8").size(), 1U);
}

TEST(Timeline, HasAnEndHoweverLongARecordSaysThatItTook) {
  std::vector<RunEvent> events = tracedRun();
  std::get<StageEnded>(events[5]).duration = std::chrono::nanoseconds::max();
  std::get<StageEnded>(events[9]).duration = std::chrono::nanoseconds::max();
  std::get<DiagnosticStarted>(events[1]).date = Date::max();
  std::get<RunStarted>(events[0]).date = Date::min() + 24h;
  constexpr std::int64_t kLatest = std::chrono::nanoseconds::max().count() / 1000;
  const Json line = lineOf(events);
  for (const Json& event : line["traceEvents"]) {
    if (event["ph"] == "M") continue;
    EXPECT_GE(event["ts"], 0) << event;
    if (event["ph"] != "X") continue;
    EXPECT_GE(event["dur"], 0) << event;
    EXPECT_LE(event["ts"].get<std::int64_t>(), kLatest - event["dur"].get<std::int64_t>());
  }
}

TEST(Timeline, IsRefusedIfItIsTooLarge) {
  const std::size_t size = timelineText(tracedRun()).size();
  EXPECT_NO_THROW(timelineText(tracedRun(), {}, size));
  EXPECT_THROW(timelineText(tracedRun(), {}, 500), TimelineTooLarge);
}

TEST(Timeline, KeepsTextsThatAreNoMarkup) {
  std::vector<RunEvent> events = tracedRun();
  const std::string name = "a\"\n</script>\xff\\";
  events.insert(events.end() - 4, FramesTraced{name, 1, {{1, -5, 0, std::nullopt}}, 0});
  const Json line = lineOf(events);
  EXPECT_THAT(line.dump(), HasSubstr("frames of a\\\"\\n</script>\xEF\xBF\xBD"));
}

}  // namespace
}  // namespace quazor
