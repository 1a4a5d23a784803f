#include "host/record/frames_json.h"

#include "base/text/input_error.h"
#include "host/testing/test_refusals.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <random>
#include <string>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

std::string problemOf(const std::string& json) {
  return thrownText<InputError>([&] { framesFrom(Json::parse(json), TracedKind::kFrames); }, "accepted");
}

std::string withColumns(const std::string& columns) {
  return R"({"event":"frames","stream":"front","step":1,"columns":{)" + columns + "}}";
}

FramesTraced back(const FramesTraced& event) { return framesFrom(Json::parse(framesJson(event).dump()), event.kind); }

TEST(FramesJson, HasAColumnOfDifferencesForEachMember) {
  const FramesTraced event{
      "B\xff", 2, {{7, -20, 100, 140}, {9, -30, 100, std::nullopt}, {8, 10, 130, 135}, {12, 11, 131, 135}}, 5};
  EXPECT_EQ(framesJson(event).dump(),
            R"({"event":"frames","stream":{"hex":"42ff"},"step":2,"columns":{"number":[7,2,-1,4],)"
            R"("captured":[-20,-10,40,1],"delivered":[100,0,30,1],"returned":[140,null,-5,0]},"lost":5})");
  const FramesTraced read = back(event);
  EXPECT_EQ(read.stream, event.stream);
  EXPECT_EQ(read.step, 2U);
  EXPECT_EQ(read.frames, event.frames);
  EXPECT_EQ(read.lost, 5U);
}

TEST(FramesJson, HasOtherNamesForTasks) {
  const FramesTraced event{"Work", 1, {{1, 5, 10, 20}, {2, 15, 25, std::nullopt}}, 3, TracedKind::kTasks};
  const std::string text =
      R"({"event":"tasks","queue":"Work","step":1,"columns":{"thread":[1,1],"posted":[5,10],"begun":[10,15],)"
      R"("ended":[20,null]},"lost":3})";
  EXPECT_EQ(framesJson(event).dump(), text);
  const FramesTraced read = back(event);
  EXPECT_EQ(read.stream, "Work");
  EXPECT_EQ(read.frames, event.frames);
  EXPECT_EQ(read.kind, TracedKind::kTasks);
  const auto problem = [](const std::string& columns) {
    return thrownText<InputError>(
        [&] {
          framesFrom(Json::parse(R"({"event":"tasks","queue":"Q","step":1,"columns":{)" + columns + "}}"),
                     TracedKind::kTasks);
        },
        "accepted");
  };
  EXPECT_EQ(problem(R"("thread":[1],"posted":[1],"begun":[1],"ended":[1])"), "accepted");
  EXPECT_EQ(problem(R"("thread":[1],"posted":[1],"begun":[1],"returned":[1])"), "unknown column 'returned'");
  EXPECT_EQ(problem(R"("thread":[1],"posted":[1,2],"begun":[1],"ended":[1])"),
            "the column \"posted\" has 2 entries, but \"thread\" has 1");
  EXPECT_EQ(problem(R"("thread":[-1],"posted":[1],"begun":[1],"ended":[1])"),
            "the column \"thread\", entry 1: a thread's number is negative");
  EXPECT_EQ(problem(R"("thread":[1,0],"posted":[1,0],"begun":[1,-1],"ended":[1,0])"),
            "the column \"begun\", entry 2: the task began before the one before it");
}

TEST(FramesJson, OmitsTheLostFramesIfThereAreNone) {
  EXPECT_EQ(framesJson({"", 1, {}, 0}).dump(),
            R"({"event":"frames","stream":"","step":1,"columns":{"number":[],"captured":[],"delivered":[],)"
            R"("returned":[]}})");
}

TEST(FramesJson, ReadsBackWhatItWroteUpToTheLimits) {
  std::mt19937_64 random(1);
  std::uniform_int_distribution<std::int64_t> any(-kMaxTraced, kMaxTraced);
  FramesTraced event{"front", std::uint64_t{1} << 63, {}, std::numeric_limits<std::uint64_t>::max()};
  for (std::size_t i = 0; i < kMaxTracedFrames; ++i) {
    const auto delivered = static_cast<std::int64_t>(i) * (kMaxTraced / 4096);
    const bool isReturned = random() % 3 != 0;
    const std::int64_t extreme = i % 2 == 0 ? kMaxTraced : -kMaxTraced;
    event.frames.push_back({any(random) & kMaxTraced, i % 5 == 0 ? any(random) : extreme, delivered,
                            isReturned ? std::optional<std::int64_t>(any(random)) : std::nullopt});
  }
  const FramesTraced read = back(event);
  EXPECT_EQ(read.frames, event.frames);
  EXPECT_EQ(read.step, event.step);
  EXPECT_EQ(read.lost, event.lost);
}

TEST(FramesFrom, SaysWhichColumnAndWhichEntryIsWrong) {
  const RefusedText rows[] = {
      {R"("captured":[1],"delivered":[1],"returned":[1])", R"("number" is missing)"},
      {R"("number":[1],"captured":[1],"delivered":[1])", R"("returned" is missing)"},
      {R"("number":[1],"captured":5,"delivered":[1],"returned":[1])", R"("captured" is not an array)"},
      {R"("number":[1],"captured":[1],"delivered":[1],"returned":[1],"exposed":[1])", "unknown column 'exposed'"},
      {R"("number":[1,1],"captured":[1,1],"delivered":[1],"returned":[1,1])",
       R"(the column "delivered" has 1 entries, but "number" has 2)"},
      {R"("number":[1],"captured":[1,1],"delivered":[1],"returned":[1])",
       R"(the column "captured" has 2 entries, but "number" has 1)"},
      {R"("number":[1],"captured":[1],"delivered":[1],"returned":[])",
       R"(the column "returned" has 0 entries, but "number" has 1)"},
      {R"("number":[1,1],"captured":[1,-1],"delivered":[5,-1],"returned":[5,-5])",
       R"(the column "delivered", entry 2: the frame was delivered before the one before it)"},
      {R"("number":[1,-2],"captured":[1,1],"delivered":[1,1],"returned":[1,1])",
       R"(the column "number", entry 2: a frame's number is negative)"},
      {R"("number":[null],"captured":[1],"delivered":[1],"returned":[1])",
       R"(the column "number", entry 1: expected an integer)"},
      {R"("number":[1],"captured":[1.5],"delivered":[1],"returned":[1])",
       R"(the column "captured", entry 1: expected an integer)"},
      {R"("number":[1,1],"captured":[1,1],"delivered":[1,"1"],"returned":[1,1])",
       R"(the column "delivered", entry 2: expected an integer)"},
      {R"("number":[1],"captured":[1],"delivered":[1],"returned":[[]])",
       R"(the column "returned", entry 1: expected an integer)"},
      {R"("number":[9223372036854775808],"captured":[1],"delivered":[1],"returned":[1])",
       R"(the column "number", entry 1: expected an integer)"},
      {R"("number":[1],"captured":[4611686018427387904],"delivered":[1],"returned":[1])",
       R"(the column "captured", entry 1: the sum is out of range)"},
      {R"("number":[1,1],"captured":[-9,-9223372036854775808],"delivered":[1,1],"returned":[1,1])",
       R"(the column "captured", entry 2: the sum is out of range)"},
  };
  for (const RefusedText& row : rows) EXPECT_EQ(problemOf(withColumns(row.text)), row.problem);
}

TEST(FramesFrom, RefusesWhatIsNoEvent) {
  const std::string columns = R"("columns":{"number":[],"captured":[],"delivered":[],"returned":[]})";
  const std::string stream = R"({"stream":"front",)";
  EXPECT_EQ(problemOf(stream + R"("step":4,)" + columns + R"(,"lost":1})"), "accepted");
  EXPECT_EQ(problemOf(stream + R"("step":4,)" + columns + R"(,"lost":0})"), R"("lost" is 0)");
  EXPECT_EQ(problemOf(R"({"step":1,)" + columns + "}"), R"("stream" is missing)");
  EXPECT_EQ(problemOf(stream + columns + "}"), R"("step" is missing)");
  EXPECT_EQ(problemOf(stream + R"("step":1})"), R"("columns" is missing)");
  EXPECT_EQ(problemOf(stream + R"("step":1,"columns":[]})"), R"("columns" is not an object)");
  EXPECT_EQ(problemOf(stream + R"("step":-1,)" + columns + "}"), R"("step" has the wrong type)");
  EXPECT_EQ(problemOf(stream + R"("step":1,)" + columns + R"(,"lost":-1})"), R"("lost" has the wrong type)");
  for (const char* step : {"0", "3", "6"}) {
    EXPECT_EQ(problemOf(stream + R"("step":)" + step + "," + columns + "}"),
              std::string(R"("step" is )") + step + ", but must be 1 or another power of two");
  }
}

TEST(FramesFrom, RefusesMoreFramesThanAreToldAtOnce) {
  FramesTraced event{"front", 1, {}, 0};
  event.frames.resize(kMaxTracedFrames + 1);
  EXPECT_EQ(problemOf(framesJson(event).dump()), R"("columns" has 4097 frames, but at most 4096 are told at once)");
}

}  // namespace
}  // namespace quazor
