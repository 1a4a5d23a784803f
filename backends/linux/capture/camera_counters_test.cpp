#include "backends/linux/capture/camera_counters.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>
#include <fstream>

namespace quazor {
namespace {

using namespace std::chrono_literals;

FrameCounts counted(const std::vector<std::uint32_t>& sequences) {
  FrameCounts counts;
  for (const std::uint32_t sequence : sequences) counts.count(sequence, 1s, false);
  return counts;
}

TEST(FrameCountsTest, GapsAreTheNumbersThatAreMissing) {
  const struct {
    const char* name;
    std::vector<std::uint32_t> sequences;
    std::uint64_t gaps;
  } rows[] = {
      {"none", {0, 1, 2}, 0},
      {"one frame", {0, 2}, 1},
      {"several times", {0, 2, 3, 10}, 7},
      {"a number that comes twice", {0, 1, 1, 2}, 0},
      {"a number that goes back", {5, 4, 5}, 0},
      {"what came before the first is not known", {7, 8}, 0},
      {"numbers wrap around", {4294967295U, 0, 1}, 0},
      {"a gap where they wrap around", {4294967294U, 1}, 2},
      {"the longest gap", {0, 2147483647U}, 2147483646U},
      {"one number more is a number that goes back", {0, 2147483648U}, 0},
  };
  for (const auto& row : rows) EXPECT_EQ(counted(row.sequences).sequenceGaps, row.gaps) << row.name;
}

TEST(FrameCountsTest, ADamagedBufferIsNoFrameButHasItsNumber) {
  FrameCounts counts;
  counts.count(0, 1s, true);
  counts.count(1, 2s, false);
  EXPECT_EQ(counts.frames, 1U);
  EXPECT_EQ(counts.first, 2s);
  EXPECT_EQ(counts.badBuffers, 1U);
  EXPECT_EQ(counts.sequenceGaps, 0U);
}

TEST(FrameCountsTest, TheOffsetIsRoundedToTheNearestFrame) {
  const struct {
    std::chrono::nanoseconds later;
    std::int64_t frames;
  } rows[] = {{0ms, 0}, {16ms, 0}, {17ms, 1}, {100ms, 3}, {112ms, 3}, {120ms, 4}, {-16ms, 0}, {-20ms, -1}};
  for (const auto& row : rows) {
    FrameCounts master;
    master.count(0, 1s, false);
    FrameCounts camera;
    camera.count(0, 1s + row.later, false);
    EXPECT_EQ(frameOffset(camera, master, {1, 30}), row.frames) << row.later.count();
    EXPECT_EQ(frameOffset(camera, FrameCounts(), {1, 30}), 0);
    EXPECT_EQ(frameOffset(FrameCounts(), master, {1, 30}), 0);
    EXPECT_EQ(frameOffset(camera, master, FrameInterval()), 0) << "the driver could not tell its rate";
  }
}

class BoundCountersTest : public testing::Test {
 protected:
  BoundCountersTest() {
    FakeNode camera = fakeCamera("fake:0");
    camera.controls = {{V4L2_CID_BRIGHTNESS, "Errors", 0, 1000, 10}};
    path_ = kernel_->add(0, std::move(camera));
    node_ = V4l2Device::open(kernel_, path_, nullptr);
    write("5\n");
  }

  void write(const std::string& text) { std::ofstream(file_) << text; }
  std::string grown(const BoundCounters& counters) {
    Dictionary values;
    DiagnosticErrorPtr error;
    return counters.addTo(values, CameraControls(node_), &error) ? defaultText(values) : error->localizedDescription();
  }

  std::shared_ptr<FakeV4l2Api> kernel_ = std::make_shared<FakeV4l2Api>();
  std::string path_;
  std::shared_ptr<V4l2Device> node_;
  const std::filesystem::path file_ = kernel_->roots().sysfs / "crc_errors";
  const std::vector<ErrorCounterBinding> bindings_{{"MIPIErrorCount", file_, {}}, {"I2CErrorCount", {}, "Errors"}};
};

TEST_F(BoundCountersTest, CountFromTheStartOfTheStream) {
  const auto counters = BoundCounters::begin(bindings_, CameraControls(node_), nullptr);
  ASSERT_TRUE(counters);
  EXPECT_EQ(grown(*counters), "{MIPIErrorCount = 0; I2CErrorCount = 0}");
  write("9\n");
  kernel_->with(path_, [](FakeNode& node) { return node.controls[0].value = 17; });
  EXPECT_EQ(grown(*counters), "{MIPIErrorCount = 4; I2CErrorCount = 7}");
  write("2\n");
  EXPECT_EQ(grown(*counters), "{MIPIErrorCount = 2; I2CErrorCount = 7}") << "it began anew";
}

TEST_F(BoundCountersTest, WhatCannotBeReadIsTold) {
  const auto counters = BoundCounters::begin(bindings_, CameraControls(node_), nullptr);
  ASSERT_TRUE(counters);
  const auto begin = [&] {
    return outcome([&](auto* error) { return BoundCounters::begin(bindings_, CameraControls(node_), error); });
  };
  write("many\n");
  EXPECT_EQ(begin(), "6 " + file_.string() + " has no number: many");
  write("");
  EXPECT_EQ(grown(*counters), "reading a number on " + file_.string() + " failed: No data available (ENODATA)");
  std::filesystem::remove(file_);
  EXPECT_EQ(begin(), "1 reading a number on " + file_.string() + " failed: No such file or directory (ENOENT)");
  write("5");
  kernel_->failNext(path_, VIDIOC_G_EXT_CTRLS, EIO);
  EXPECT_EQ(begin(), "1 VIDIOC_G_EXT_CTRLS of \"Errors\" on " + path_ + " failed: Input/output error (EIO)");
  EXPECT_EQ(outcome([&](auto* error) {
              return BoundCounters::begin({{"A", {}, "None"}}, CameraControls(node_), error);
            }),
            "5 " + path_ + " has no control \"None\".");
}

}  // namespace
}  // namespace quazor
