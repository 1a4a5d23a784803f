#include "backends/linux/hid/hidraw_input.h"

#include "backends/linux/hid/hidraw_for_tests.h"
#include "backends/linux/system/linux_error.h"
#include "backends/threads/thread_run_loop.h"
#include "contract/message_format.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fcntl.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::SizeIs;

constexpr std::string_view kOther = "org.quazor.other";
constexpr const char* kGone = "LinuxErrorDomain code 9: /dev/hidraw0 has been removed.";

// An input on the loop of this thread. Reports are recorded as "0x76: 7601, 2 bytes", with their first bytes, errors as
// their text.
class HidrawInputTest : public ::testing::Test {
 protected:
  HidrawInputTest() { make(true); }
  ~HidrawInputTest() override {
    if (input_ != nullptr) input_->retire();
    run();
    run(0ns, kOther);
  }

  void make(bool numbered) {
    input_ = std::make_shared<HidrawInput>(calls_, "/dev/hidraw0", numbered);
    input_->setReceiver(receiver());
  }
  HidDevice::InputReportCallback receiver() {
    return [this](std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
      if (error != nullptr) {
        EXPECT_TRUE(data.empty() && id == 0);
        seen_.push_back(defaultText(error));
      } else {
        EXPECT_EQ(id, data.front());
        const Bytes first(data.begin(),
                          data.begin() + static_cast<std::ptrdiff_t>(std::min<std::size_t>(data.size(), 3)));
        seen_.push_back(defaultText(Value(first)) + ", " + std::to_string(data.size()));
      }
      if (onInput_) onInput_();
    };
  }
  void open() {
    auto [near, far] = connectedSockets();
    device_ = std::move(far);
    input_->open(std::make_shared<const FileDescriptor>(std::move(near)));
  }
  void schedule(std::string_view mode = kRunLoopDefaultMode) { input_->schedule(loop_, mode); }
  void unschedule(std::string_view mode = kRunLoopDefaultMode) { input_->unschedule(loop_, mode); }
  void openAndSchedule() {
    open();
    schedule();
  }
  void send(int number) { sendReport(device_, {0x76, static_cast<std::uint8_t>(number)}); }
  RunLoopResult run(std::chrono::nanoseconds limit = 0ns, std::string_view mode = kRunLoopDefaultMode) {
    return loop_.runInMode(mode, limit, false);
  }

  RunLoop& loop_ = *makeLinuxRunLoops()->currentRunLoop();
  const std::shared_ptr<FakeHidrawCalls> calls_ = std::make_shared<FakeHidrawCalls>();
  std::shared_ptr<HidrawInput> input_;
  FileDescriptor device_;
  std::vector<std::string> seen_;
  std::function<void()> onInput_;
};

TEST_F(HidrawInputTest, AReportWakesALoopThatSleeps) {
  openAndSchedule();
  onInput_ = [this] { loop_.stop(); };
  std::thread device([this] {
    std::this_thread::sleep_for(2ms);
    send(1);
  });
  EXPECT_EQ(run(10s), RunLoopResult::kStopped);
  device.join();
  EXPECT_THAT(seen_, SizeIs(1));
}

TEST_F(HidrawInputTest, ReportsAreHandedOnAsLongAndAsShortAsTheyCome) {
  openAndSchedule();
  Bytes longest(HidrawInput::kMaxLength, 0xEE);
  sendReport(device_, {0x75});
  sendReport(device_, longest);
  run();
  EXPECT_THAT(seen_, ElementsAre("75, 1", "eeeeee, 16385"));
}

TEST_F(HidrawInputTest, ReportsWithoutAnIDGetTheIDZero) {
  make(false);
  openAndSchedule();
  sendReport(device_, {0x12, 0x34});
  sendReport(device_, Bytes(HidrawInput::kMaxLength - 1, 0xEE));
  run();
  EXPECT_THAT(seen_, ElementsAre("001234, 3", "00eeee, 16385"));
}

TEST_F(HidrawInputTest, ARoundHasAnEnd) {
  openAndSchedule();
  for (std::size_t i = 0; i < HidrawInput::kMaxInARound + 10; ++i) send(1);
  std::vector<std::size_t> counts;
  const auto observer =
      loop_.makeObserver(kRunLoopBeforeSources, true, 0, [&](RunLoopActivities) { counts.push_back(seen_.size()); });
  loop_.addObserver(observer, kRunLoopDefaultMode);
  run(5ms);
  loop_.removeObserver(observer, kRunLoopDefaultMode);
  EXPECT_THAT(seen_, SizeIs(HidrawInput::kMaxInARound + 10));
  EXPECT_THAT(counts, ElementsAre(0, HidrawInput::kMaxInARound));
}

TEST_F(HidrawInputTest, AReceiverThatSendsWithoutEndDoesNotOutlastTheLimit) {
  openAndSchedule();
  onInput_ = [this] { send(1); };
  send(1);
  EXPECT_EQ(run(1ms), RunLoopResult::kTimedOut);
  EXPECT_GE(seen_.size(), HidrawInput::kMaxInARound);
  onInput_ = nullptr;
}

TEST_F(HidrawInputTest, ARemovedDeviceGivesWhatIsKeptAndThenTheErrorOnce) {
  openAndSchedule();
  send(1);
  send(2);
  device_.reset();
  run();
  EXPECT_THAT(seen_, ElementsAre("7601, 2", "7602, 2", kGone));
  EXPECT_EQ(run(1ms), RunLoopResult::kTimedOut);
  unschedule();
  schedule();
  schedule(kOther);
  run();
  run(0ns, kOther);
  EXPECT_THAT(seen_, SizeIs(3));
}

TEST_F(HidrawInputTest, ADeviceThatIsOpenedAnewTellsItsErrorAnew) {
  openAndSchedule();
  device_.reset();
  run();
  input_->close();
  open();
  send(1);
  device_.reset();
  run();
  EXPECT_THAT(seen_, ElementsAre(kGone, "7601, 2", kGone));
}

TEST_F(HidrawInputTest, ADeadDeviceDoesNotKeepTheLoopAwake) {
  openAndSchedule();
  device_.reset();
  const auto processorTime = [] {
    timespec used{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
    return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
  };
  const auto before = processorTime();
  EXPECT_EQ(run(100ms), RunLoopResult::kTimedOut);
  EXPECT_LT(processorTime() - before, 50ms);
  EXPECT_THAT(seen_, ElementsAre(kGone));
}

TEST_F(HidrawInputTest, AReadThatFailsOtherwiseIsToldWithTheSystemsError) {
  // A directory can be opened but not read.
  input_->open(std::make_shared<const FileDescriptor>(::open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC)));
  schedule();
  run();
  EXPECT_THAT(seen_, ElementsAre("LinuxErrorDomain code 1: read on /dev/hidraw0 failed: Is a directory (EISDIR)"));
}

TEST_F(HidrawInputTest, EveryErrorOfAReadEndsTheReportsOnceButForThoseThatSayNothing) {
  const struct {
    int number;
    std::vector<std::string> seen;  // of a run with two reports whose first read fails
  } kRows[] = {
      {EINTR, {"7601, 2", "7602, 2"}},
      {EAGAIN, {"7601, 2", "7602, 2"}},
      {EIO, {kGone}},
      {ENODEV, {kGone}},
      {0, {kGone}},
      {EFAULT, {"LinuxErrorDomain code 1: read on /dev/hidraw0 failed: Bad address (EFAULT)"}},
  };
  for (const auto& row : kRows) {
    make(true);
    seen_.clear();
    openAndSchedule();
    send(1);
    send(2);
    calls_->readErrors = {row.number};
    run();
    run();
    EXPECT_EQ(seen_, row.seen) << row.number;
    unschedule();
  }
}

TEST_F(HidrawInputTest, ASignalDoesNotKeepOldReports) {
  open();
  send(1);
  send(2);
  calls_->readErrors = {EINTR, EINTR};
  schedule();
  send(3);
  run();
  EXPECT_THAT(seen_, ElementsAre("7603, 2"));
}

TEST_F(HidrawInputTest, ADeviceMayBeOpenedOnAnotherThreadThanThatOfItsLoop) {
  schedule();
  schedule(kOther);
  std::thread([this] { open(); }).join();
  send(1);
  run(0ns, kOther);
  EXPECT_THAT(seen_, ElementsAre("7601, 2"));
  std::thread device([this] {
    std::this_thread::sleep_for(2ms);
    send(2);
  });
  onInput_ = [this] { loop_.stop(); };
  EXPECT_EQ(run(10s), RunLoopResult::kStopped);
  device.join();
  EXPECT_THAT(seen_, ElementsAre("7601, 2", "7602, 2"));
}

TEST_F(HidrawInputTest, AClosedDeviceGivesNothingAndItsDescriptorIsClosedAtOnce) {
  openAndSchedule();
  const int descriptor = input_->descriptor()->get();
  send(1);
  input_->close();
  EXPECT_EQ(::fcntl(descriptor, F_GETFD), -1);
  EXPECT_EQ(input_->descriptor(), nullptr);
  run();
  EXPECT_THAT(seen_, testing::IsEmpty());
  input_->close();
  open();
  send(2);
  run();
  EXPECT_THAT(seen_, ElementsAre("7602, 2"));
}

TEST_F(HidrawInputTest, ADeviceThatIsClosedOnAnotherThreadDoesNotWaitForItsLoopToWake) {
  openAndSchedule();
  const int descriptor = input_->descriptor()->get();
  std::atomic<bool> runs = false;
  loop_.addObserver(loop_.makeObserver(kRunLoopBeforeWaiting, false, 0,
                                       [&runs](RunLoopActivities) {
                                         runs = true;
                                         runs.notify_one();
                                       }),
                    kRunLoopDefaultMode);
  std::thread other([this, descriptor, &runs] {
    runs.wait(false);
    std::this_thread::sleep_for(2ms);
    input_->close();
    const auto end = std::chrono::steady_clock::now() + 10s;
    while (::fcntl(descriptor, F_GETFD) != -1 && std::chrono::steady_clock::now() < end) std::this_thread::yield();
    EXPECT_EQ(::fcntl(descriptor, F_GETFD), -1);
    loop_.stop();
  });
  EXPECT_EQ(run(60s), RunLoopResult::kStopped);
  other.join();
}

TEST_F(HidrawInputTest, TheReceiverMayEndItAllInItsOwnCall) {
  const struct {
    const char* name;
    std::function<void()> act;
    RunLoopResult result;  // of a later run
  } kRows[] = {
      {"unscheduling", [this] { unschedule(); }, RunLoopResult::kFinished},
      {"closing", [this] { input_->close(); }, RunLoopResult::kTimedOut},
      {"removing the receiver", [this] { input_->setReceiver({}); }, RunLoopResult::kTimedOut},
      {"dropping",
       [this] {
         input_->retire();
         input_.reset();
       },
       RunLoopResult::kFinished},
  };
  for (const auto& row : kRows) {
    make(true);
    seen_.clear();
    openAndSchedule();
    const int descriptor = input_->descriptor()->get();
    onInput_ = row.act;
    send(1);
    send(2);
    run();
    onInput_ = nullptr;
    EXPECT_THAT(seen_, ElementsAre("7601, 2")) << row.name;
    EXPECT_EQ(run(1ms), row.result) << row.name;
    if (input_ != nullptr) input_->retire();
    EXPECT_EQ(::fcntl(descriptor, F_GETFD), -1) << row.name;
    run();
  }
}

TEST_F(HidrawInputTest, ALoopThatCannotWaitForDescriptorsGetsAnErrorOnce) {
  RunLoop& foreign = *ThreadRunLoops().currentRunLoop();
  const auto runForeign = [&foreign] { return foreign.runInMode(kRunLoopDefaultMode, 1ms, false); };
  open();
  input_->schedule(foreign, kRunLoopDefaultMode);
  send(1);
  runForeign();
  const std::string refusal =
      "LinuxErrorDomain code 5: /dev/hidraw0 cannot be scheduled on this run loop: it cannot wait for file "
      "descriptors.";
  EXPECT_THAT(seen_, ElementsAre(refusal));
  runForeign();
  EXPECT_THAT(seen_, SizeIs(1));
  input_->close();
  open();
  runForeign();
  EXPECT_THAT(seen_, ElementsAre(refusal, refusal));
  input_->unschedule(foreign, kRunLoopDefaultMode);
  EXPECT_EQ(runForeign(), RunLoopResult::kFinished);
}

TEST_F(HidrawInputTest, TheUserMayGoOnAnotherThreadWhileReportsCome) {
  for (int round = 0; round < 50; ++round) {
    make(true);
    openAndSchedule();
    std::thread user([this] {
      for (int i = 0; i < 20; ++i) send(i);
      input_->retire();
      input_.reset();
    });
    EXPECT_EQ(run(10s), RunLoopResult::kFinished);
    user.join();
  }
}

TEST_F(HidrawInputTest, TheLoopMayEndOnceTheDeviceIsUnscheduled) {
  open();
  std::thread([this] {
    RunLoop& loop = *makeLinuxRunLoops()->currentRunLoop();
    input_->schedule(loop, kRunLoopDefaultMode);
    onInput_ = [&loop] { loop.stop(); };
    send(1);
    EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 10s, false), RunLoopResult::kStopped);
    input_->unschedule(loop, kRunLoopDefaultMode);
  }).join();
  send(2);
  EXPECT_THAT(seen_, ElementsAre("7601, 2"));
}

}  // namespace
}  // namespace quazor
