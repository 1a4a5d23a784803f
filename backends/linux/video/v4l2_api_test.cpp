// The calls of the running system, on files that every system has.
#include "backends/linux/video/v4l2_api.h"

#include "backends/linux/video/projector_guard.h"

#include <fcntl.h>
#include <linux/videodev2.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Limits the number of open descriptors during its lifetime.
class FewDescriptors {
 public:
  FewDescriptors() {
    ::getrlimit(RLIMIT_NOFILE, &before_);
    const rlimit few{kMaxCount, before_.rlim_max};
    ::setrlimit(RLIMIT_NOFILE, &few);
  }
  ~FewDescriptors() { ::setrlimit(RLIMIT_NOFILE, &before_); }

  static constexpr rlim_t kMaxCount = 64;

 private:
  rlimit before_{};
};

class SystemVideoKernelTest : public testing::Test {
 protected:
  SystemVideoKernelTest() {
    path_ = (std::filesystem::temp_directory_path() / "device-XXXXXX").string();
    const int file = ::mkstemp(path_.data());
    EXPECT_EQ(::write(file, "frame", 5), 5);
    ::close(file);
  }
  ~SystemVideoKernelTest() override { std::filesystem::remove(path_); }

  const std::shared_ptr<V4l2Api> kernel_ = systemVideoKernel();
  std::string path_;
};

TEST_F(SystemVideoKernelTest, OpensWithoutBlockingAndTellsTheErrorNumber) {
  const int file = kernel_->open(path_);
  ASSERT_GE(file, 0);
  EXPECT_NE(::fcntl(file, F_GETFL) & O_NONBLOCK, 0);
  EXPECT_NE(::fcntl(file, F_GETFD) & FD_CLOEXEC, 0);
  v4l2_capability capability{};
  EXPECT_EQ(kernel_->ioctl(file, VIDIOC_QUERYCAP, &capability), -ENOTTY);
  kernel_->close(file);
  EXPECT_EQ(kernel_->ioctl(file, VIDIOC_QUERYCAP, &capability), -EBADF);
  EXPECT_EQ(kernel_->open("/nonexistent/video0"), -ENOENT);
}

TEST_F(SystemVideoKernelTest, ALockIsForOneDescriptorUntilItIsClosed) {
  const int first = kernel_->open(path_);
  const int second = kernel_->open(path_);
  EXPECT_EQ(kernel_->lock(first), 0);
  EXPECT_EQ(kernel_->lock(second), -EWOULDBLOCK);
  kernel_->close(first);
  EXPECT_EQ(kernel_->lock(second), 0);
  kernel_->close(second);
}

TEST_F(SystemVideoKernelTest, MapsWhatTheDeviceHas) {
  const int file = kernel_->open(path_);
  void* address = nullptr;
  ASSERT_EQ(kernel_->map(file, 5, 0, &address), 0);
  EXPECT_EQ(std::memcmp(address, "frame", 5), 0);
  kernel_->unmap(address, 5);
  EXPECT_EQ(kernel_->map(file, 5, 1, &address), -EINVAL) << "an offset within a page";
  kernel_->close(file);
}

TEST_F(SystemVideoKernelTest, ACopyOfTheProcessDoesNotHaveTheBuffers) {
  const int file = kernel_->open(path_);
  void* address = nullptr;
  ASSERT_EQ(kernel_->map(file, 5, 0, &address), 0);
  const pid_t copy = ::fork();
  if (copy == 0) {
    ::signal(SIGSEGV, SIG_DFL);
    ::_exit(*static_cast<volatile char*>(address));
  }
  int status = 0;
  ::waitpid(copy, &status, 0);
  EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGSEGV);
  kernel_->unmap(address, 5);
  kernel_->close(file);
}

TEST_F(SystemVideoKernelTest, AnEventIsReadableFromItsSignalUntilItIsCleared) {
  const int event = kernel_->makeEvent();
  ASSERT_GE(event, 0);
  pollfd polled[] = {{event, POLLIN, 0}};
  EXPECT_EQ(kernel_->poll(polled, 0ns), 0);
  kernel_->signalEvent(event);
  kernel_->signalEvent(event);
  EXPECT_EQ(kernel_->poll(polled, -1ns), 1);
  EXPECT_EQ(polled[0].revents, POLLIN);
  kernel_->clearEvent(event);
  const auto before = kernel_->now();
  EXPECT_EQ(kernel_->poll(polled, 2ms), 0);
  EXPECT_GE(kernel_->now() - before, 2ms);
  kernel_->close(event);
}

TEST_F(SystemVideoKernelTest, ASystemWithoutFurtherDescriptorsIsTold) {
  const FewDescriptors few;
  std::vector<int> held;
  for (int one = 0; (one = ::open("/dev/null", O_RDONLY)) >= 0;) held.push_back(one);
  EXPECT_EQ(kernel_->makeEvent(), -EMFILE);
  for (const int one : held) ::close(one);
}

TEST_F(SystemVideoKernelTest, ASignalThatInterruptsAWaitIsAnEarlyReturn) {
  struct sigaction action {};
  action.sa_handler = [](int) {};
  struct sigaction before {};
  ::sigaction(SIGUSR1, &action, &before);
  const int event = kernel_->makeEvent();
  pollfd polled[] = {{event, POLLIN, POLLIN}};
  const pthread_t waiting = ::pthread_self();
  std::atomic<bool> returned = false;
  std::thread interrupter([&] {
    while (!returned) {
      std::this_thread::sleep_for(1ms);
      ::pthread_kill(waiting, SIGUSR1);
    }
  });
  EXPECT_EQ(kernel_->poll(polled, -1ns), 0);
  returned = true;
  EXPECT_EQ(polled[0].revents, 0);
  interrupter.join();
  ::sigaction(SIGUSR1, &before, nullptr);
  kernel_->close(event);
}

TEST_F(SystemVideoKernelTest, ADescriptorTooManyIsAnErrorOfTheWait) {
  const FewDescriptors few;
  std::vector<pollfd> many(FewDescriptors::kMaxCount + 1, pollfd{-1, POLLIN, 0});
  EXPECT_EQ(kernel_->poll(many, 0ns), -EINVAL);
}

TEST(UninterruptedTest, ACallThatSignalsInterruptIsMadeAgainAndTellsItsErrorNumber) {
  int calls = 0;
  const auto call = [&calls](int result, int number) {
    return uninterrupted([&, result, number] {
      errno = ++calls < 3 ? EINTR : number;
      return calls < 3 ? -1 : result;
    });
  };
  EXPECT_EQ(call(7, 0), 7);
  EXPECT_EQ(calls, 3);
  EXPECT_EQ(call(-1, EIO), -EIO);
  EXPECT_EQ(calls, 4);
}

TEST_F(SystemVideoKernelTest, GuardsDevices) {
  int number = 0;
  EXPECT_NE(kernel_->guardControls(path_, -1, {{1, 0}}, &number), nullptr);
  EXPECT_EQ(kernel_->guardControls("/nonexistent/video0", -1, {}, &number), nullptr);
  EXPECT_EQ(number, ENOENT);
}

}  // namespace
}  // namespace quazor
