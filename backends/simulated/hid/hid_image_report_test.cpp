#include "backends/simulated/hid/hid_image_report.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <chrono>
#include <cstdint>
#include <limits>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::Each;
using ::testing::ElementsAre;

std::uint32_t read32(const Bytes& bytes, std::size_t at) {
  return static_cast<std::uint32_t>(bytes.at(at)) | static_cast<std::uint32_t>(bytes.at(at + 1)) << 8U |
         static_cast<std::uint32_t>(bytes.at(at + 2)) << 16U | static_cast<std::uint32_t>(bytes.at(at + 3)) << 24U;
}
std::vector<std::int32_t> samples(const Bytes& bytes, std::size_t at, std::size_t count) {
  std::vector<std::int32_t> samples;
  for (std::size_t i = 0; i < count; ++i) samples.push_back(static_cast<std::int32_t>(read32(bytes, at + 4 * i)));
  return samples;
}

TEST(HidImageReportTest, AWholeReportHasEveryFieldInItsPlace) {
  HidImages images;
  images.firstFrameID = 0x01020300;
  images.temperature = 36.6F;
  const Bytes bytes = hidInputReport(images, {}, 4, 0x0A0B0C0D * 1ms + 999us);
  ASSERT_THAT(bytes, testing::SizeIs(792));
  EXPECT_EQ(bytes[0], 0x76);
  EXPECT_EQ(read32(bytes, 4), 0x01020304U);
  EXPECT_EQ(bytes[4], 0x04);
  EXPECT_EQ(read32(bytes, 12), 0x0A0B0C0DU);
  EXPECT_EQ(std::bit_cast<float>(read32(bytes, 788)), 36.6F);
}

TEST(HidImageReportTest, WhatIsReservedIsNotZero) {
  const Bytes bytes = hidInputReport({}, {}, 0, 0ms);
  EXPECT_THAT(samples(bytes, 8, 1), Each(static_cast<std::int32_t>(0xA5A5A5A5)));
  EXPECT_THAT(samples(bytes, 784, 1), Each(static_cast<std::int32_t>(0xA5A5A5A5)));
  EXPECT_THAT((std::vector<int>{bytes[1], bytes[2], bytes[3]}), Each(0xA5));
}

TEST(HidImageReportTest, SamplesGoRoundACircle) {
  HidImages images;
  images.amplitude = 1000;
  images.offsetI = 10;
  images.offsetQ = -20;
  images.phaseStep = 90;
  const Bytes bytes = hidInputReport(images, {}, 7, 0ms);
  EXPECT_THAT(samples(bytes, 16, 5), ElementsAre(1010, 10, -990, 10, 1010));
  EXPECT_THAT(samples(bytes, 208, 5), ElementsAre(-20, 980, -20, -1020, -20));
  EXPECT_THAT(samples(bytes, 400, 5), ElementsAre(-1010, -10, 990, -10, -1010));
  EXPECT_THAT(samples(bytes, 592, 5), ElementsAre(20, -980, 20, 1020, 20));
  EXPECT_EQ(samples(bytes, 204, 1), std::vector{10});     // the last I, at 47 * 90 degrees
  EXPECT_EQ(samples(bytes, 396, 1), std::vector{-1020});  // the last Q
}

TEST(HidImageReportTest, EveryImageBeginsAStepFurther) {
  HidImages images;
  images.phaseStep = 0;
  images.phaseStepPerImage = 30;
  const auto first = [&](std::uint64_t number) { return samples(hidInputReport(images, {}, number, 0ms), 208, 1)[0]; };
  EXPECT_EQ(first(0), 0);
  EXPECT_EQ(first(1), 500);
  EXPECT_EQ(first(2), 866);
  EXPECT_EQ(first(3), 1000);
}

TEST(HidImageReportTest, SamplesSaturate) {
  HidImages images;
  images.amplitude = std::numeric_limits<std::int32_t>::max();
  images.offsetI = 5;
  images.offsetQ = -5;
  images.phaseStep = 180;
  EXPECT_THAT(samples(hidInputReport(images, {}, 0, 0ms), 16, 2), ElementsAre(2147483647, -2147483642));
  images.offsetI = -5;
  EXPECT_THAT(samples(hidInputReport(images, {}, 0, 0ms), 16, 2), ElementsAre(2147483642, -2147483648));
}

TEST(HidImageReportTest, CountersWrap) {
  HidImages images;
  images.firstFrameID = 0xFFFFFFFF;
  EXPECT_EQ(read32(hidInputReport(images, {}, 0, 0ms), 4), 0xFFFFFFFFU);
  const Bytes bytes = hidInputReport(images, {}, 2, 0x100000003 * 1ms);
  EXPECT_EQ(read32(bytes, 4), 1U);
  EXPECT_EQ(read32(bytes, 12), 3U);
}

TEST(HidImageReportTest, AShapeChangesTheIDAndTheLength) {
  HidReportShape shape;
  shape.reportID = 0x75;
  shape.length = 1;
  EXPECT_THAT(hidInputReport({}, shape, 0, 0ms), ElementsAre(0x75));
  shape.length = 800;
  const Bytes longer = hidInputReport({}, shape, 0, 0ms);
  ASSERT_THAT(longer, testing::SizeIs(800));
  EXPECT_THAT(samples(longer, 792, 2), Each(0));
  EXPECT_EQ(std::bit_cast<float>(read32(longer, 788)), 25.0F);
}

}  // namespace
}  // namespace quazor
