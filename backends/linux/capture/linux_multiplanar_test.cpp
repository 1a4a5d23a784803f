// Cameras whose frames have several planes, each in memory of its own.
#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>
#include <cstdint>

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr std::size_t kWithMetadata = 3;

FakeNode threePlanes(const std::string& bus) {
  FakeNode node = fakeMultiplanarCamera(bus);
  node.planes = 3;
  return node;
}

// As a driver makes it that has the multi-planar calls for all of its formats.
FakeNode onePlane(const std::string& bus) {
  FakeNode node = fakeMultiplanarCamera(bus);
  node.planes = 1;
  return node;
}

class LinuxMultiplanarTest : public testing::Test {
 protected:
  int mapped(std::size_t index) const {
    return fake.kernel->with(fake.nodes[index], [](const FakeNode& node) { return node.mapped; });
  }

  SeenFrames seen;  // outlives those that call it
  FakeCameras fake{fakeBinding(), &fakeMultiplanarCamera};
};

TEST_F(LinuxMultiplanarTest, FormatSizeAndRateAreSet) {
  ASSERT_EQ(fake.take(0), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 1), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::MinimumFrameRate, 40), "done");
  ASSERT_EQ(fake.set(fake.wide(), capture_key::MaximumFrameRate, 40), "done");
  fake.kernel->with(fake.nodes[0], [](const FakeNode& node) {
    EXPECT_EQ(node.format.pixelformat, fakeCode('N', 'M', '1', '6'));
    EXPECT_EQ(node.format.width, 640U);
    EXPECT_EQ(node.format.height, 360U);
    EXPECT_EQ(node.interval, (FrameInterval{1, 40}));
    return 0;
  });
}

TEST(LinuxMultiplanarOwnMachineTest, AFormatThatIsNotThereOrHasAnotherSizeIsRefused) {
  Binding binding = fakeBinding();
  binding.cameras[1].width = 800;
  FakeCameras fake(binding, &fakeMultiplanarCamera);
  ASSERT_EQ(fake.take(CaptureStreams{fake.streams[0], fake.streams[1]}), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 2),
            "5 " + fake.nodes[0] +
                " has no format with index 2; the binding can map the index to one of its formats: NM12, NM16.");
  EXPECT_EQ(
      fake.set(fake.stream(1), capture_key::FormatIndex, 1),
      "5 " + fake.nodes[1] + ": format 1 (NM16) of 800 x 360 is not available; the driver offers NM16 of 640 x 360.");
}

TEST_F(LinuxMultiplanarTest, AFrameIsOneOfAllItsPlanesAndHasItsMetadata) {
  fake.begin(kWithMetadata, seen.handler());
  EXPECT_EQ(mapped(kWithMetadata), 8) << "four buffers of two planes";
  fake.kernel->passTime(990ms);
  const std::vector<SeenFrame> frames = seen.wait(30);
  ASSERT_EQ(frames.size(), 30U);
  for (const SeenFrame& frame : frames) EXPECT_EQ(frame.metadata, (Dictionary{{"Fixed", 7}, {"Lit", 1U}}));
  EXPECT_EQ(frames[3].time, 1'000'099'999'000);
  EXPECT_EQ(fake.counter(kWithMetadata, "SequenceGapCount"), 0);
  EXPECT_EQ(fake.stop(kWithMetadata), "done");
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST(LinuxMultiplanarOwnMachineTest, TheNumberOfPlanesIsTheDrivers) {
  for (const auto make : {&onePlane, &threePlanes}) {
    FakeCameras fake(fakeBinding(), make);
    fake.begin(0);
    fake.kernel->passTime(330ms);
    fake.kernel->with(fake.nodes[0], [](const FakeNode& node) {
      EXPECT_EQ(node.mapped, 4 * static_cast<int>(node.planes));
      return 0;
    });
    EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 0);
    EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 0);
    EXPECT_EQ(fake.stop(0), "done");
    fake.release();
    EXPECT_TRUE(fake.kernel->isIdle());
  }
}

TEST_F(LinuxMultiplanarTest, APlaneThatCannotBeMappedIsAnErrorAndNothingStaysInUse) {
  for (int succeeding = 0; succeeding < 8; ++succeeding) {
    fake.prepare(0);
    fake.kernel->mapsBeforeFailure = succeeding;
    fake.kernel->failNextMaps = 1;
    EXPECT_EQ(fake.start(0), "1 mmap on " + fake.nodes[0] + " failed: Cannot allocate memory (ENOMEM)");
    EXPECT_EQ(mapped(0), 0);
    EXPECT_EQ(fake.start(0), "done");
    EXPECT_EQ(fake.stop(0), "done");
    ASSERT_TRUE(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
  }
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST_F(LinuxMultiplanarTest, EveryCallThatFailsAtTheStartIsToldAndNothingStaysInUse) {
  const struct {
    const char* name;
    unsigned long request;
  } rows[] = {{"VIDIOC_TRY_FMT", VIDIOC_TRY_FMT},   {"VIDIOC_S_FMT", VIDIOC_S_FMT},
              {"VIDIOC_S_PARM", VIDIOC_S_PARM},     {"VIDIOC_REQBUFS", VIDIOC_REQBUFS},
              {"VIDIOC_QUERYBUF", VIDIOC_QUERYBUF}, {"VIDIOC_QBUF", VIDIOC_QBUF},
              {"VIDIOC_STREAMON", VIDIOC_STREAMON}};
  for (const auto& row : rows) {
    fake.prepare(0);
    fake.kernel->failNext(fake.nodes[0], row.request, EIO);
    EXPECT_EQ(fake.start(0),
              "1 " + std::string(row.name) + " on " + fake.nodes[0] + " failed: Input/output error (EIO)");
    EXPECT_EQ(mapped(0), 0) << row.name;
    EXPECT_EQ(fake.start(0), "done") << row.name;
    EXPECT_EQ(fake.stop(0), "done");
    ASSERT_TRUE(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
  }
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST_F(LinuxMultiplanarTest, ABufferThatTheDriverRefusesIsQueuedAgain) {
  fake.begin(0);
  fake.kernel->passTime(100ms);
  fake.kernel->failNext(fake.nodes[0], VIDIOC_QBUF, EINVAL);
  fake.kernel->passTime(890ms);
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 1);
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 0);
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](const FakeNode& node) { return node.queued.size(); }), 4U);
  EXPECT_EQ(fake.stop(0), "done");
}

}  // namespace
}  // namespace quazor
