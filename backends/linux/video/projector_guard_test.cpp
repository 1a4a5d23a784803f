#include "backends/linux/video/projector_guard.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Simulates the device: the values that the guard sets are written to this file.
class Device {
 public:
  Device() {
    std::string name = (std::filesystem::temp_directory_path() / "guarded-XXXXXX").string();
    ::close(::mkstemp(name.data()));
    path_ = name;
  }
  ~Device() { std::filesystem::remove(path_); }

  const std::string& path() const { return path_; }
  std::string content() const {
    std::ifstream file(path_);
    std::string line;
    std::getline(file, line, '\0');
    return line;
  }
  // Waits up to a few seconds for the content to equal `wanted`, and returns it.
  std::string contentOnceIs(const std::string& wanted) const {
    for (int i = 0; i < 5000 && content() != wanted; ++i) std::this_thread::sleep_for(1ms);
    return content();
  }

 private:
  std::string path_;
};

void note(int descriptor, const ControlValue& value) {
  const char text[] = {static_cast<char>('a' + value.control), static_cast<char>('0' + value.value), ' '};
  if (::write(descriptor, text, sizeof text) < 0) ::_exit(1);
}

const std::vector<ControlValue> kOff{{0, 5}, {1, 0}};

std::unique_ptr<ControlGuard> guardOf(const Device& device) {
  int number = -1;
  std::unique_ptr<ControlGuard> guard = startProjectorGuard({device.path()}, kOff, &note, &number);
  EXPECT_EQ(number, 0);
  return guard;
}

// The only child of this process; 0 if there is none.
pid_t childOf(pid_t parent) {
  std::ifstream file("/proc/" + std::to_string(parent) + "/task/" + std::to_string(parent) + "/children");
  pid_t child = 0;
  file >> child;
  return child;
}

TEST(ProjectorGuardTest, SetsTheValuesInOrderWhenItIsDestroyedAndLeavesNoProcess) {
  const Device device;
  std::unique_ptr<ControlGuard> guard = guardOf(device);
  ASSERT_NE(guard, nullptr);
  EXPECT_NE(childOf(::getpid()), 0);
  EXPECT_EQ(device.content(), "");
  guard.reset();
  EXPECT_EQ(device.content(), "a5 b0 ");
  EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG), -1);
  EXPECT_EQ(errno, ECHILD);
}

// Calls `end` in a process with a guard and returns the guard's process ID.
template <class End>
pid_t processThatEnds(const Device& device, End&& end) {
  ::prctl(PR_SET_CHILD_SUBREAPER, 1);
  int ends[2];
  EXPECT_EQ(::pipe(ends), 0);
  const pid_t process = ::fork();
  if (process == 0) {
    const auto guard = guardOf(device);
    const pid_t number = childOf(::getpid());
    if (::write(ends[1], &number, sizeof number) < 0) ::_exit(1);
    end();
    ::_exit(0);
  }
  pid_t guard = 0;
  EXPECT_EQ(::read(ends[0], &guard, sizeof guard), static_cast<ssize_t>(sizeof guard));
  ::close(ends[0]);
  ::close(ends[1]);
  EXPECT_EQ(::waitpid(process, nullptr, 0), process);
  return guard;
}

TEST(ProjectorGuardTest, SetsTheValuesWhenItsProcessIsKilledAndEndsItself) {
  const Device device;
  const pid_t guard = processThatEnds(device, [] { ::raise(SIGKILL); });
  EXPECT_EQ(device.contentOnceIs("a5 b0 "), "a5 b0 ");
  int status = -1;
  EXPECT_EQ(::waitpid(guard, &status, 0), guard) << "it came to this process and ended";
  EXPECT_EQ(status, 0) << "by itself";
}

TEST(ProjectorGuardTest, SetsTheValuesWhenItsProcessExitsWithoutDestroyingIt) {
  const Device device;
  const pid_t guard = processThatEnds(device, [] { ::_exit(3); });
  EXPECT_EQ(device.contentOnceIs("a5 b0 "), "a5 b0 ");
  ::waitpid(guard, nullptr, 0);
}

TEST(ProjectorGuardTest, SetsTheValuesWhenItsProcessIsKilledThoughACopyOfThatLivesOn) {
  const Device device;
  const pid_t guard = processThatEnds(device, [] {
    if (::fork() == 0) {  // the copy also holds the connection
      ::alarm(10);
      ::pause();
    }
    ::raise(SIGKILL);
  });
  EXPECT_EQ(device.contentOnceIs("a5 b0 "), "a5 b0 ");
  EXPECT_EQ(::waitpid(guard, nullptr, 0), guard);
  const pid_t copy = childOf(::getpid());
  ASSERT_NE(copy, 0);
  ::kill(copy, SIGKILL);
  EXPECT_EQ(::waitpid(copy, nullptr, 0), copy);
}

TEST(ProjectorGuardTest, SignalsThatCanBeBlockedDoNotEndIt) {
  const Device device;
  std::unique_ptr<ControlGuard> guard = guardOf(device);
  const pid_t process = childOf(::getpid());
  ASSERT_NE(process, 0);
  EXPECT_EQ(::getsid(process), process) << "it is in a session of its own";
  for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGPIPE}) ::kill(process, signal);
  EXPECT_EQ(device.content(), "");
  guard.reset();
  EXPECT_EQ(device.content(), "a5 b0 ");
}

TEST(ProjectorGuardTest, HasNoDescriptorsButItsThree) {
  const Device device;
  const int open = ::open("/dev/null", O_RDONLY);
  const int above = ::fcntl(open, F_DUPFD, 200);
  ASSERT_GE(above, 200);
  const std::unique_ptr<ControlGuard> guard = guardOf(device);
  const std::filesystem::path process = "/proc/" + std::to_string(childOf(::getpid()));
  std::string held;
  int count = 0;
  for (const auto& entry : std::filesystem::directory_iterator(process / "fd")) {
    std::error_code problem;
    held += std::filesystem::read_symlink(entry.path(), problem).string() + " ";
    ++count;
  }
  EXPECT_EQ(count, 3) << held;
  EXPECT_NE(held.find(device.path()), std::string::npos) << held;
  EXPECT_NE(held.find("socket:"), std::string::npos) << held;
  EXPECT_NE(held.find("pidfd"), std::string::npos) << held;
  std::ifstream name(process / "comm");
  std::string line;
  std::getline(name, line);
  EXPECT_EQ(line, kProjectorGuardName);
  ::close(above);
  ::close(open);
}

TEST(ProjectorGuardTest, WhoKilledItDoesNotEndTheProcessThatLetsGoOfIt) {
  const Device device;
  std::unique_ptr<ControlGuard> guard = guardOf(device);
  ::kill(childOf(::getpid()), SIGKILL);
  std::this_thread::sleep_for(3ms);
  guard.reset();
  EXPECT_EQ(device.content(), "");
}

TEST(ProjectorGuardTest, AProcessThatIgnoresTheEndsOfItsChildrenCanLetGoOfIt) {
  const Device device;
  std::unique_ptr<ControlGuard> guard = guardOf(device);
  const auto before = ::signal(SIGCHLD, SIG_IGN);
  guard.reset();
  ::signal(SIGCHLD, before);
  EXPECT_EQ(device.content(), "a5 b0 ");
}

TEST(ProjectorGuardTest, ACopyOfItsProcessDoesNotKeepItAlive) {
  const Device device;
  std::unique_ptr<ControlGuard> guard = guardOf(device);
  const pid_t copy = ::fork();
  if (copy == 0) {
    ::pause();
    ::_exit(0);
  }
  guard.reset();
  EXPECT_EQ(device.content(), "a5 b0 ");
  ::kill(copy, SIGKILL);
  ::waitpid(copy, nullptr, 0);
}

TEST(ProjectorGuardTest, ADeviceThatCannotBeOpenedIsRefused) {
  int number = 0;
  EXPECT_EQ(startProjectorGuard({"/nonexistent/video0"}, kOff, &note, &number), nullptr);
  EXPECT_EQ(number, ENOENT);
}

TEST(ProjectorGuardTest, ASystemWithoutFurtherDescriptorsIsRefused) {
  const Device device;
  rlimit before{};
  ::getrlimit(RLIMIT_NOFILE, &before);
  const rlimit few{64, before.rlim_max};
  ::setrlimit(RLIMIT_NOFILE, &few);
  std::vector<int> held;
  for (int one = 0; (one = ::open("/dev/null", O_RDONLY)) >= 0;) held.push_back(one);
  const auto refused = [&](std::size_t left) {
    for (std::size_t i = 0; i < left; ++i) ::close(held[held.size() - 1 - i]);
    int number = 0;
    EXPECT_EQ(startProjectorGuard({device.path()}, kOff, &note, &number), nullptr) << left;
    for (std::size_t i = 0; i < left; ++i) held[held.size() - 1 - i] = ::open("/dev/null", O_RDONLY);
    return number;
  };
  EXPECT_EQ(refused(0), EMFILE) << "the device";
  EXPECT_EQ(refused(1), EMFILE) << "the end of this process";
  EXPECT_EQ(refused(2), EMFILE) << "the connection";
  for (const int one : held) ::close(one);
  ::setrlimit(RLIMIT_NOFILE, &before);
}

TEST(ProjectorGuardTest, AnotherDeviceAtThePathIsRefused) {
  const Device device;
  const Device other;
  const int opened = ::open(device.path().c_str(), O_RDWR);
  int number = 0;
  EXPECT_EQ(startProjectorGuard({other.path(), opened}, kOff, &note, &number), nullptr);
  EXPECT_EQ(number, ENODEV);
  EXPECT_EQ(startProjectorGuard({"/dev/null", opened}, kOff, &note, &number), nullptr);
  EXPECT_NE(startProjectorGuard({device.path(), opened}, kOff, &note, &number), nullptr);
  ::close(opened);
  EXPECT_EQ(other.content(), "");
}

// Runs in a copy of this process: closes all descriptors but three, and returns how many of five others remain.
int remainingAfter(RangeCloser closer) {
  const pid_t copy = ::fork();
  if (copy == 0) {
    const GuardDescriptors kept{::dup(0), ::dup(0), ::dup(0)};
    std::array<int, 5> others{};
    for (int& one : others) one = ::dup(0);
    others[4] = ::dup2(0, 200);
    closeAllBut(kept, closer);
    int remaining = 0;
    for (const int one : others) remaining += ::fcntl(one, F_GETFD) >= 0 ? 1 : 0;
    const bool all = ::fcntl(kept.connection, F_GETFD) >= 0 && ::fcntl(kept.guarded, F_GETFD) >= 0 &&
                     ::fcntl(kept.device, F_GETFD) >= 0;
    ::_exit(all ? remaining : 100);
  }
  int status = 0;
  ::waitpid(copy, &status, 0);
  return WEXITSTATUS(status);
}

TEST(ProjectorGuardTest, ItClosesAllOtherDescriptorsAlsoWithoutCloseRange) {
  EXPECT_EQ(remainingAfter(&closeRange), 0);
  EXPECT_EQ(remainingAfter([](unsigned int, unsigned int) {
              errno = ENOSYS;
              return -1;
            }),
            0);
}

bool endsCopies = false;

TEST(ProjectorGuardTest, OneThatIsEndedBeforeItIsReadyIsRefused) {
  const Device device;
  ASSERT_EQ(::pthread_atfork(nullptr, nullptr,
                             [] {
                               if (endsCopies) ::_exit(1);
                             }),
            0);
  endsCopies = true;
  int number = 0;
  EXPECT_EQ(startProjectorGuard({device.path()}, kOff, &note, &number), nullptr);
  endsCopies = false;
  EXPECT_EQ(number, ECHILD);
  EXPECT_EQ(childOf(::getpid()), 0) << "no process is left";
}

TEST(ProjectorGuardTest, ItsWorkBeginsWithTheEndOfTheConnectionOrAByte) {
  for (const bool says : {false, true}) {
    const Device device;
    const int file = ::open(device.path().c_str(), O_RDWR);
    int ends[2];
    ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, ends), 0);
    EXPECT_EQ(says ? ::send(ends[0], "", 1, 0) : ::close(ends[0]), says ? 1 : 0);
    guardControlsUntilEnd({ends[1], -1, file}, kOff.data(), kOff.size(), &note);
    EXPECT_EQ(device.content(), "a5 b0 ");
    if (says) ::close(ends[0]);
    ::close(ends[1]);
    ::close(file);
  }
}

TEST(ProjectorGuardTest, SettingAControlOfWhatIsNoVideoDeviceDoesNothing) {
  const Device device;
  const int file = ::open(device.path().c_str(), O_RDWR);
  setVideoControl(file, {1, 2, false});
  setVideoControl(file, {1, 2, true});
  EXPECT_EQ(device.content(), "");
  ::close(file);
}

}  // namespace
}  // namespace quazor
