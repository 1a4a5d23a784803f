// Which metadata buffer a frame gets on cameras that stamp both differently.
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "contract/log_channel.h"

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr std::size_t kPairedCamera = 3;

// Four frames of a camera whose metadata is stamped 3 ms later.
std::vector<SeenFrame> framesOf(const std::string& driver, std::optional<MetadataPairing> pairing,
                                std::vector<std::string>* lines) {
  Binding binding = fakeBinding();
  binding.cameras[kPairedCamera].metadata.pairing = pairing;
  SeenFrames seen;
  FakeCameras fake(binding);
  fake.kernel->with(fake.nodes[kPairedCamera], [&](FakeNode& node) {
    node.driver = driver;
    node.metadataStampedAhead = 3ms;
    return 0;
  });
  const auto log = std::make_shared<LogLines>();
  sharedLog().setBackend(log, LogLevel::kError);
  fake.begin(kPairedCamera, seen.handler());
  for (int i = 0; i < 6; ++i) fake.kernel->passTime(34ms);  // also what frames wait for metadata
  std::vector<SeenFrame> frames = seen.wait(4);
  EXPECT_EQ(fake.stop(kPairedCamera), "done");
  sharedLog().setBackend(nullptr, LogLevel::kError);
  *lines = log->lines();
  return frames;
}

TEST(LinuxPairingTest, UsbCamerasArePairedBySequence) {
  std::vector<std::string> lines;
  for (const SeenFrame& frame : framesOf("uvcvideo", std::nullopt, &lines)) {
    EXPECT_EQ(frame.metadata, (Dictionary{{"Fixed", 7}, {"Lit", 1U}}));
  }
  EXPECT_TRUE(lines.empty());
}

TEST(LinuxPairingTest, OthersArePairedBySequenceIfTheBindingSaysSo) {
  std::vector<std::string> lines;
  for (const SeenFrame& frame : framesOf("fake", MetadataPairing::kSequence, &lines)) {
    EXPECT_EQ(frame.metadata, (Dictionary{{"Fixed", 7}, {"Lit", 1U}}));
  }
  EXPECT_TRUE(lines.empty());
}

TEST(LinuxPairingTest, TheCauseOfMissingMetadataIsLoggedOnce) {
  std::vector<std::string> lines;
  for (const SeenFrame& frame : framesOf("fake", std::nullopt, &lines)) {
    EXPECT_EQ(frame.metadata, (Dictionary{{"Fixed", 7}}));
  }
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(
      lines[0],
      "FrontFacingInfraredCamera: frame 0 has no metadata: no metadata buffer has its time stamp; that of the last "
      "one differs by 3000 microseconds, with the sequence number 0 to the frame's 0. If the driver stamps both "
      "differently, set \"pairing\" of the binding's \"metadata\" to \"sequence\".");
}

}  // namespace
}  // namespace quazor
