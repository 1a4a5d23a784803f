#include "host/report/page/frames_section.h"

#include "host/report/page/plot.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

constexpr std::int64_t kMillisecond = 1'000'000;

// Frames that are delivered 2 ms after their capture and handed back 1 ms later.
RecordedStream streamOf(const std::string& name, const std::vector<std::pair<std::int64_t, std::int64_t>>& frames) {
  RecordedStream stream{name, {}, 0, {{0, 1}}};
  for (const auto& [number, milliseconds] : frames) {
    const std::int64_t at = milliseconds * kMillisecond;
    stream.frames.push_back({number, at, at + 2 * kMillisecond, at + 3 * kMillisecond});
  }
  return stream;
}

TEST(FramesSection, SaysWhichFramesAreMissing) {
  const std::string html =
      framesSection({streamOf("wide", {{5, 100}, {6, 133}, {9, 232}, {10, 265}, {12, 331}})}, 3, ManyFrames::kPictures);
  EXPECT_THAT(html,
              HasSubstr("5 frames, captured from 0.1 s to 0.331 s, at a median interval of 66 ms. 3 frame numbers "
                        "are missing, at 2 places, the first after frame 6 at 0.133 s."));
  EXPECT_THAT(html, HasSubstr("<td class=\"number\">5</td><td class=\"number\">3</td><td class=\"number\">0</td>"
                              "<td>66 (33 to 99)</td><td>\xE2\x80\x93</td><td>2</td><td>1</td>"));
  EXPECT_THAT(html, HasSubstr("<h3>Frames</h3>"));
  EXPECT_THAT(html, HasSubstr("class=\"mark\""));
}

TEST(FramesSection, SaysThatNoneIsMissing) {
  const std::string html = framesSection({streamOf("wide", {{0, 0}, {1, 33}})}, 3, ManyFrames::kPictures);
  EXPECT_THAT(html, HasSubstr("No frame number is missing."));
  EXPECT_THAT(html, Not(HasSubstr("class=\"mark\"")));
}

TEST(FramesSection, ComparesWithTheStreamThatBeganFirst) {
  const std::string html =
      framesSection({streamOf("tele", {{0, 12}, {1, 43}, {2, 80}}), streamOf("wide", {{0, 10}, {1, 43}, {2, 76}})}, 3,
                    ManyFrames::kPictures);
  EXPECT_THAT(html, HasSubstr("Against the nearest frame of wide, they were captured 0 ms to 4 ms later, in the median "
                              "2 ms."));
  EXPECT_THAT(html, HasSubstr("Offset against wide</th>"));
  EXPECT_THAT(html, HasSubstr("<td>2 (0 to 4)</td>"));
}

// Of every second frame, every second number is recorded.
TEST(FramesSection, DoesNotMissFramesThatAreLeftOutOfTheRecord) {
  RecordedStream stream = streamOf("wide", {{0, 0}, {1, 33}, {3, 99}, {5, 165}, {9, 297}});
  stream.steps = {{0, 1}, {2, 2}};
  stream.lost = 7;
  const std::string html = framesSection({stream}, 3, ManyFrames::kPictures);
  EXPECT_THAT(html, HasSubstr("2 frame numbers are missing, at 1 place, the first after frame 5"));
  EXPECT_THAT(html, HasSubstr("In the end, 1 of 2 frames was recorded. 7 frames could not be recorded."));
}

TEST(FramesSection, MarksCaptureTimesThatGoBack) {
  const std::string html =
      framesSection({streamOf("wide", {{0, 100}, {1, 133}, {2, 90}, {3, 199}})}, 3, ManyFrames::kPictures);
  EXPECT_THAT(html, HasSubstr("1 capture time is before that of the frame before."));
  EXPECT_THAT(html, HasSubstr("class=\"mark\""));
}

TEST(CamerasParagraph, NamesStreamsAndMaster) {
  DiagnosticRecord record;
  EXPECT_EQ(camerasParagraph(record, {}), "");
  EXPECT_EQ(camerasParagraph(record, {streamOf("wide", {{0, 0}}), streamOf("<tele>", {{0, 0}}), streamOf("dead", {})}),
            "<p class=\"soft\">Frames from: wide, &lt;tele&gt;.</p>");
  record.log = {{{}, LogLevel::kDefault, "first"},
                {{}, LogLevel::kDefault, "FrontCamera <-- sync master\n  Offset: 0\n"}};
  EXPECT_EQ(camerasParagraph(record, {}),
            "<p class=\"soft\">Master, which offsets between cameras refer to: FrontCamera.</p>");
}

RecordedStream longStream(const std::string& name, std::size_t frames) {
  RecordedStream stream{name, {}, 0};
  for (std::size_t i = 0; i < frames; ++i) {
    const auto time = static_cast<std::int64_t>(i) * 1'000;
    stream.frames.push_back({static_cast<std::int64_t>(i), time, time, {}});
  }
  return stream;
}

TEST(FramesSection, HasTheFramesThatAPictureCannotShow) {
  const std::vector<RecordedStream> few = {longStream("wide", kMaxPlotPoints)};
  const std::vector<RecordedStream> many = {longStream("wide", kMaxPlotPoints + 1)};
  EXPECT_FALSE(hasManyFrames(few));
  EXPECT_TRUE(hasManyFrames(many));
  EXPECT_THAT(framesSection(few, 3, ManyFrames::kZoomed), Not(HasSubstr("<template")));
  EXPECT_THAT(framesSection(many, 3, ManyFrames::kPictures), Not(HasSubstr("<template")));
  EXPECT_THAT(framesSection(many, 3, ManyFrames::kZoomed), HasSubstr("<template class=\"captured\">"));
  EXPECT_THAT(framesSection(few, 3, ManyFrames::kNoLibrary), Not(HasSubstr("libjs-dygraphs")));
  EXPECT_THAT(framesSection(many, 3, ManyFrames::kNoLibrary), HasSubstr("libjs-dygraphs"));
}

TEST(FramesSection, IsEmptyWithoutFrames) {
  EXPECT_EQ(framesSection({}, 3, ManyFrames::kPictures), "");
  EXPECT_EQ(framesSection({streamOf("wide", {})}, 3, ManyFrames::kPictures), "");
}

TEST(FramesSection, TakesTheLargestTimes) {
  RecordedStream stream{"wide", {{0, -kMaxTraced, 0, {}}, {kMaxTraced, kMaxTraced, kMaxTraced, {}}}, 0};
  EXPECT_THAT(framesSection({stream}, 3, ManyFrames::kPictures), HasSubstr("2 frames"));
}

}  // namespace
}  // namespace quazor
