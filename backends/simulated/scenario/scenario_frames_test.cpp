#include "backends/simulated/scenario/scenario_frames.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <string>
#include <string_view>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::SizeIs;
using Json = nlohmann::ordered_json;

template <class Reader>
auto readText(Reader&& read, std::string_view text) {
  const Json document = Json::parse(text);
  return read(JsonCursor(document));
}

TEST(ScenarioFramesTest, AProjectorIsRead) {
  const Projector projector = readText(readProjector, R"({
    "metadata": {"a": 1, "b": -2, "c": 1.5, "d": true, "e": "x", "f": 18446744073709551615},
    "without": ["g"],
    "frames": {"0": {"attachment": "missing"}, "12": {"attachment": "text"}, "13": {"attachment": "number"},
               "14": {"attachment": "dictionary", "metadata": {"a": 2}, "without": ["b"]}}})");
  EXPECT_EQ(
      projector.metadata.overrides,
      (Dictionary{
          {"a", 1}, {"b", -2}, {"c", 1.5}, {"d", true}, {"e", "x"}, {"f", std::uint64_t{18446744073709551615U}}}));
  EXPECT_THAT(projector.metadata.without, testing::ElementsAre("g"));
  ASSERT_THAT(projector.frames, SizeIs(4));
  EXPECT_EQ(projector.frames.at(0).attachment, FrameAttachment::kMissing);
  EXPECT_EQ(projector.frames.at(12).attachment, FrameAttachment::kText);
  EXPECT_EQ(projector.frames.at(13).attachment, FrameAttachment::kNumber);
  EXPECT_EQ(projector.frames.at(14).attachment, FrameAttachment::kDictionary);
  EXPECT_EQ(projector.frames.at(14).overrides, (Dictionary{{"a", 2}}));
  EXPECT_THAT(projector.frames.at(14).without, testing::ElementsAre("b"));
}

TEST(ScenarioFramesTest, ADeliveryIsRead) {
  const DeliveryConfig delivery = readText(readDelivery, R"({
    "bursts": [{"at": 3, "count": 4}], "timeStamps": [{"at": 7, "every": 2, "by": -0.5}, {"at": 8, "valid": false}],
    "events": [{"at": 0.5, "number": -2147483648}],
    "framesAfterStop": 5, "queues": 6, "stopWaitsForHandlers": false})");
  ASSERT_THAT(delivery.bursts, SizeIs(1));
  EXPECT_EQ(delivery.bursts[0].at, 3U);
  EXPECT_EQ(delivery.bursts[0].count, 4U);
  ASSERT_THAT(delivery.timeStamps, SizeIs(2));
  EXPECT_EQ(delivery.timeStamps[0].at, 7U);
  EXPECT_EQ(delivery.timeStamps[0].every, 2U);
  EXPECT_EQ(delivery.timeStamps[0].by, -500ms);
  EXPECT_TRUE(delivery.timeStamps[0].isValid);
  EXPECT_EQ(delivery.timeStamps[1].every, 0U);
  EXPECT_FALSE(delivery.timeStamps[1].isValid);
  ASSERT_THAT(delivery.events, SizeIs(1));
  EXPECT_EQ(delivery.events[0].at, 500ms);
  EXPECT_EQ(delivery.events[0].number, -2147483648);
  EXPECT_EQ(delivery.framesAfterStop, 5U);
  EXPECT_EQ(delivery.queues, 6U);
  EXPECT_FALSE(delivery.stopWaitsForHandlers);
}

TEST(ScenarioFramesTest, ADeliveryIsOrdinaryUnlessItSaysMore) {
  const DeliveryConfig delivery = readText(readDelivery, "{}");
  EXPECT_EQ(delivery.queues, 1U);
  EXPECT_EQ(delivery.framesAfterStop, 0U);
  EXPECT_TRUE(delivery.stopWaitsForHandlers);
}

TEST(ScenarioFramesTest, ReportChannelsAreRead) {
  const std::vector<ReportChannelConfig> channels = readText(readReports, R"({
    "A": {"s": {"x": 3, "y": "none"}, "t": {}},
    "B": {"s": {"x": {"count": 4, "growth": 5, "growthAt": [{"at": 0.25, "by": 6}]}, "z": {"count": "none"}, "w": {}}}})");
  ASSERT_THAT(channels, SizeIs(5));
  EXPECT_EQ(channels[0].group + channels[0].subGroup + channels[0].name, "Asx");
  EXPECT_EQ(channels[0].count, 3U);
  EXPECT_EQ(channels[1].count, std::nullopt);
  EXPECT_EQ(channels[2].group + channels[2].subGroup + channels[2].name, "Bsx");
  EXPECT_EQ(channels[2].count, 4U);
  EXPECT_EQ(channels[2].growth, 5U);
  ASSERT_THAT(channels[2].steps, SizeIs(1));
  EXPECT_EQ(channels[2].steps[0].at, 250ms);
  EXPECT_EQ(channels[2].steps[0].by, 6U);
  EXPECT_EQ(channels[3].count, std::nullopt);
  EXPECT_EQ(channels[4].count, 0U);
}

TEST(ScenarioFramesTest, WhatIsWrongIsToldInOneSentence) {
  const auto projector = [](const JsonCursor& cursor) { readProjector(cursor); };
  const auto delivery = [](const JsonCursor& cursor) { readDelivery(cursor); };
  const auto growth = [](const JsonCursor& cursor) { readErrorCounterGrowth(cursor); };
  const auto reports = [](const JsonCursor& cursor) { readReports(cursor); };
  const struct {
    std::function<void(const JsonCursor&)> read;
    const char* text;
    const char* problem;
  } kRows[] = {
      {projector, R"({"frame": {}})", R"(the document: unknown key "frame"; did you mean "frames"?)"},
      {projector, R"({"metadata": {"a": []}})", "metadata.a: must be a number, a string, true or false, not an array."},
      {projector, R"({"metadata": 3})", "metadata: must be an object, not 3."},
      {projector, R"({"without": [""]})", "without[0]: must be a non-empty string, not \"\"."},
      {projector, R"({"attachment": "mising"})",
       R"(attachment: "mising" is not a kind of attachment; did you mean "missing"?)"},
      {projector, R"({"frames": {"07": {}}})",
       R"(frames.07: the key must be the number of a frame, from 0 to 1000000000.)"},
      {projector, R"({"frames": {"-1": {}}})",
       R"(frames.-1: the key must be the number of a frame, from 0 to 1000000000.)"},
      {projector, R"({"frames": {"1000000001": {}}})",
       R"(frames.1000000001: the key must be the number of a frame, from 0 to 1000000000.)"},
      {projector, R"({"frames": {"1": {"frames": {}}}})",
       R"(frames.1: unknown key "frames"; expected one of "attachment", "metadata", "without".)"},
      {delivery, R"({"queues": 0})", "queues: must be an integer from 1 to 64, not 0."},
      {delivery, R"({"queues": 65})", "queues: must be an integer from 1 to 64, not 65."},
      {delivery, R"({"framesAfterStop": -1})", "framesAfterStop: must be an integer from 0 to 1000000000, not -1."},
      {delivery, R"({"stopWaitsForHandlers": 1})", "stopWaitsForHandlers: must be true or false, not 1."},
      {delivery, R"({"bursts": [{"at": 1}]})", R"(bursts[0]: the key "count" is missing.)"},
      {delivery, R"({"bursts": [{"at": 1, "count": 0}]})",
       "bursts[0].count: must be an integer from 1 to 1000000000, not 0."},
      {delivery, R"({"events": [{"at": 0, "number": 1}]})",
       "events[0].at: must be a number above 0 and at most 1000000000.0, not 0."},
      {delivery, R"({"events": [{"at": 1, "number": 2147483648}]})",
       "events[0].number: must be a signed 32-bit integer, not 2147483648."},
      {growth, R"({"SIFErrorCount": 1.5})", "SIFErrorCount: must be an integer from 0 to 1000000000, not 1.5."},
      {reports, R"({"A": []})", "A: must be an object, not an array."},
      {reports, R"({"A": {"s": 1}})", "A.s: must be an object, not 1."},
      {reports, R"({"A": {"s": {"x": -1}}})", "A.s.x: must be an integer from 0 to 18446744073709551615, not -1."},
      {reports, R"({"A": {"s": {"x": "non"}}})", R"(A.s.x: "non" is not a count; did you mean "none"?)"},
      {reports, R"({"A": {"s": {"x": {"grow": 1}}}})", R"(A.s.x: unknown key "grow"; did you mean "growth"?)"},
      {reports, R"({"A": {"s": {"x": {"growthAt": [{"at": 1}]}}}})", R"(A.s.x.growthAt[0]: the key "by" is missing.)"},
  };
  for (const auto& row : kRows) {
    const Json document = Json::parse(row.text);
    EXPECT_EQ(thrownText<InputError>([&] { row.read(JsonCursor(document)); }), row.problem) << row.text;
  }
}

}  // namespace
}  // namespace quazor
