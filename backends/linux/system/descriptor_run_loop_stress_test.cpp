#include "backends/linux/system/descriptor_run_loop.h"

#include "backends/threads/run_loop_stress_conformance.h"
#include "tests/support/effort.h"

#include <sys/socket.h>

#include <array>

namespace quazor {
namespace {

class DescriptorLoops {
 public:
  RunLoop& loop() { return *makeLinuxRunLoops()->currentRunLoop(); }
};

INSTANTIATE_TYPED_TEST_SUITE_P(Descriptors, RunLoopStress, DescriptorLoops);

// Two threads send at random times, in different ways. Nothing may be lost, and the loop must not hang.
TEST(DescriptorRunLoopStressTest, NeitherSignalsNorBytesAreLost) {
  const int rounds = isThorough() ? 500'000 : 20'000;
  RunLoop& loop = DescriptorLoops().loop();
  std::array<int, 2> ends{};
  ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends.data()), 0);
  const auto reading = std::make_shared<const FileDescriptor>(ends[0]);
  const FileDescriptor writing(ends[1]);
  int bytes = 0;
  int signals = 0;
  std::shared_ptr<DescriptorWatch> watch;
  const auto bytesSource = loop.makeSource([&] {
    watch->arm();
    char byte = 0;
    while (::read(reading->get(), &byte, 1) == 1) ++bytes;
  });
  const auto signalSource = loop.makeSource([&] { ++signals; });
  loop.addSource(bytesSource, kRunLoopDefaultMode);
  loop.addSource(signalSource, kRunLoopDefaultMode);
  watch = watchDescriptor(loop, reading, bytesSource);
  watch->arm();
  StressHelper writer(1, [&](int) { EXPECT_EQ(::write(writing.get(), "x", 1), 1); });
  StressHelper signaller(2, [&](int) { signalSource->signal(); });
  for (int round = 1; round <= rounds; ++round) {
    writer.begin(round);
    signaller.begin(round);
    while (bytes < round || signals < round) {
      ASSERT_EQ(loop.runInMode(kRunLoopDefaultMode, std::chrono::seconds(10), true), RunLoopResult::kHandledSource);
    }
    writer.waitForEndOf(round);
    signaller.waitForEndOf(round);
  }
  EXPECT_EQ(bytes, rounds);
  EXPECT_EQ(signals, rounds);
  loop.removeSource(bytesSource, kRunLoopDefaultMode);
  loop.removeSource(signalSource, kRunLoopDefaultMode);
}

}  // namespace
}  // namespace quazor
