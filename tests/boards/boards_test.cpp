// The bindings of boards that are not at hand.
#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "tests/boards/recorded_topology.h"

#include <gmock/gmock.h>

#include <filesystem>

namespace quazor {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

// A user of the camera of a board.
class BoardsTest : public testing::TestWithParam<const char*> {
 protected:
  void SetUp() override {
    addRecordedTopology(*kernel_, fs::path(QUAZOR_TOPOLOGIES) / (std::string(GetParam()) + ".txt"));
    binding_ = readBinding(fs::path(QUAZOR_BINDINGS) / (std::string(GetParam()) + ".json"));
  }
  // How a run of a second at 30 frames a second ends.
  std::string run() {
    const std::shared_ptr<LinuxCapture> capture = makeLinuxCapture(binding_, kernel_, kernel_->roots());
    const std::shared_ptr<CaptureDevice> device = capture->defaultPlugIn()->device(nullptr);
    const std::shared_ptr<CaptureStream> stream = device->streams(nullptr)->front();
    std::string ended = outcome([&](auto* error) { return device->requestControlOfStreams({stream}, error); });
    const auto set = [&](std::string_view key, const Value& value) {
      if (ended == "done") ended = outcome([&](auto* error) { return stream->setValue(value, key, error); });
    };
    set(capture_key::FormatIndex, 0);
    set(capture_key::MinimumFrameRate, 30);
    set(capture_key::MaximumFrameRate, 30);
    const Dictionary handlers{
        {text(capture_key::PixelBufferHandler), std::make_shared<PixelBufferHandler>(seen_.handler())}};
    set(capture_key::VideoOutputsEnabled, FakeCameras::output(true));
    set(capture_key::VideoOutputHandlers, FakeCameras::output(handlers));
    if (ended == "done") ended = outcome([&](auto* error) { return stream->start(error); });
    if (ended != "done") return ended;
    kernel_->passTime(990ms);
    return outcome([&](auto* error) { return stream->stop(error); });
  }
  FakeMedia* media() {
    return kernel_->with((kernel_->roots().dev / "media0").string(), [](FakeNode& node) { return &*node.media; });
  }
  // As before the first run.
  void forgetPads() {
    for (FakeEntity& entity : media()->entities) {
      for (FakePad& pad : entity.pads) {
        if (pad.format.width > 0) pad.format.width = pad.format.height = 16;
        pad.crop = {0, 0, 16, 16};
      }
    }
  }

  SeenFrames seen_;  // outlives those that call it
  const std::shared_ptr<FakeV4l2Api> kernel_ = std::make_shared<FakeV4l2Api>();
  Binding binding_;
};

TEST_P(BoardsTest, FramesComeThroughItsMediaController) {
  ASSERT_EQ(run(), "done");
  EXPECT_FALSE(seen_.wait(1).empty());
  EXPECT_TRUE(kernel_->isIdle());
}

TEST_P(BoardsTest, EachPadOfTheBindingIsNeeded) {
  std::vector<PadBinding>& pads = binding_.cameras.at(0).media->pads;
  // The format of a source that follows from its sink is there for the reader.
  for (std::size_t i = 0; i < pads.size(); ++i) {
    if (pads[i].pad.pad != 0) continue;
    const PadBinding left = pads[i];
    pads.erase(pads.begin() + static_cast<std::ptrdiff_t>(i));
    EXPECT_NE(run(), "done") << "without " << textOf(left.pad);
    pads.insert(pads.begin() + static_cast<std::ptrdiff_t>(i), left);
    forgetPads();
  }
  EXPECT_EQ(run(), "done");
}

TEST_P(BoardsTest, EachLinkOfTheBindingIsNeeded) {
  std::vector<LinkBinding>& links = binding_.cameras.at(0).media->links;
  for (std::size_t i = 0; i < links.size(); ++i) {
    if (!links[i].enabled) continue;  // what has to be off depends on the formats of the other path
    const bool isOnAlready = std::ranges::any_of(media()->links, [&](const FakeLink& link) {
      return media()->entities[link.source].name == links[i].source.entity && link.sourcePad == links[i].source.pad &&
             media()->entities[link.sink].name == links[i].sink.entity && (link.flags & MEDIA_LNK_FL_ENABLED) != 0;
    });
    if (isOnAlready) continue;
    const LinkBinding left = links[i];
    links.erase(links.begin() + static_cast<std::ptrdiff_t>(i));
    EXPECT_NE(run(), "done") << "without " << textOf(left.source);
    links.insert(links.begin() + static_cast<std::ptrdiff_t>(i), left);
  }
  EXPECT_EQ(run(), "done");
}

INSTANTIATE_TEST_SUITE_P(All, BoardsTest, testing::Values("rk3399_imx219", "imx6ull_evk", "dragonboard410c"));

}  // namespace
}  // namespace quazor
