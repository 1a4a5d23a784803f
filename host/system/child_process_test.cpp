#include "host/system/child_process.h"

#include "backends/linux/video/projector_guard.h"
#include "host/system/child_for_tests.h"
#include "host/testing/test_signals.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <thread>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Waits up to a minute for the child to end.
std::string endOf(ChildProcess& child) {
  for (int i = 0; i < 60'000 && !child.end(); ++i) std::this_thread::sleep_for(1ms);
  return child.end() ? textOf(*child.end()) : "it has not ended";
}

// Reads from the descriptor until the other end is closed or `maximum` bytes have arrived.
std::string readAll(int descriptor, std::size_t maximum = SIZE_MAX) {
  std::string text;
  while (text.size() < maximum) {
    pollfd watched{descriptor, POLLIN, 0};
    if (::poll(&watched, 1, 60'000) != 1) return text + "... nothing more came";
    char buffer[256];
    const ssize_t count = ::read(descriptor, buffer, std::min(sizeof buffer, maximum - text.size()));
    if (count <= 0) break;
    text.append(buffer, static_cast<std::size_t>(count));
  }
  return text;
}

// The state of a process (proc(5), /proc/PID/stat): 'T' if it is stopped, 0 if there is none.
char stateOf(pid_t process) {
  std::ifstream file("/proc/" + std::to_string(process) + "/stat");
  std::string line;
  std::getline(file, line);
  const std::size_t afterName = line.rfind(") ");
  return afterName == std::string::npos ? '\0' : line[afterName + 2];
}

bool isBlocked(int signal) {
  sigset_t mask;
  ::sigprocmask(SIG_BLOCK, nullptr, &mask);
  return sigismember(&mask, signal) == 1;
}

class ChildProcessTest : public testing::Test {
 protected:
  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
};

TEST_F(ChildProcessTest, TellsHowItEnded) {
  struct Row {
    std::function<void(int)> body;
    const char* end;
  };
  const Row rows[] = {
      {[](int) {}, "exit code 0"},
      {[](int) { ::_exit(3); }, "exit code 3"},
      {[](int) { ::raise(SIGKILL); }, "signal 9 (SIGKILL)"},
      {[](int) { ::raise(SIGTERM); }, "signal 15 (SIGTERM)"},
      {[](int) { ::raise(SIGINT); }, "signal 2 (SIGINT)"},
  };
  for (const Row& row : rows) {
    ChildProcess child(signals_, row.body, std::nullopt);
    EXPECT_EQ(endOf(child), row.end);
    EXPECT_EQ(endOf(child), row.end) << "asked again";
  }
}

TEST_F(ChildProcessTest, EndsByWhatItsWorkThrows) {
  ChildProcess child(
      signals_, [](int) { throw std::runtime_error("it threw"); }, std::nullopt);
  EXPECT_EQ(endOf(child), "signal 6 (SIGABRT)");
  EXPECT_THAT(readAll(child.outputDescriptor()), testing::HasSubstr("it threw"));
}

TEST_F(ChildProcessTest, DoesNotWaitForItsEnd) {
  ChildProcess child(
      signals_, [](int) { hang(); }, std::nullopt);
  EXPECT_FALSE(child.end());
  child.signalGroup(SIGTERM);
  EXPECT_EQ(endOf(child), "signal 15 (SIGTERM)");
}

TEST_F(ChildProcessTest, HasAConnectionAndAnOutput) {
  const auto body = [](int connection) {
    say(connection, "said");
    std::printf("printed, ");
    std::fflush(stdout);
    say(STDERR_FILENO, "and complained");
    char byte = 0;
    if (::read(STDIN_FILENO, &byte, 1) != 0) ::_exit(1);
  };
  ChildProcess child(signals_, body, std::nullopt);
  EXPECT_EQ(readAll(child.connectionDescriptor()), "said");
  EXPECT_EQ(readAll(child.outputDescriptor()), "printed, and complained");
  EXPECT_EQ(endOf(child), "exit code 0");
}

TEST_F(ChildProcessTest, IsReadWithoutBlocking) {
  ChildProcess child(
      signals_, [](int) { hang(); }, std::nullopt);
  char byte = 0;
  EXPECT_EQ(::read(child.connectionDescriptor(), &byte, 1), -1);
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_EQ(::read(child.outputDescriptor(), &byte, 1), -1);
  EXPECT_EQ(errno, EAGAIN);
}

TEST_F(ChildProcessTest, SeesNoOtherDescriptorOfItsParent) {
  const int low = ::open("/dev/null", O_RDONLY);
  const int high = ::fcntl(low, F_DUPFD, 300);
  ASSERT_GE(high, 300);
  const auto body = [](int connection) {
    std::string open;
    for (int descriptor = 0; descriptor < 400; ++descriptor) {
      if (::fcntl(descriptor, F_GETFD) >= 0 && descriptor != connection) open += std::to_string(descriptor) + " ";
    }
    say(connection, open);
  };
  ChildProcess child(signals_, body, std::nullopt);
  EXPECT_EQ(readAll(child.connectionDescriptor()), "0 1 2 ");
  ::close(low);
  ::close(high);
}

TEST_F(ChildProcessTest, HasAConnectionWhereThereMayBeFewDescriptors) {
  rlimit before{};
  ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
  const rlimit few{30, before.rlim_max};
  ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &few), 0);
  {
    ChildProcess child(
        signals_, [](int connection) { say(connection, std::to_string(connection)); }, std::nullopt);
    EXPECT_EQ(readAll(child.connectionDescriptor()), "29");
  }
  EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
}

TEST_F(ChildProcessTest, IsTheFirstOfItsOwnGroupWithTheSignalsAsTheyWere) {
  const auto body = [](int connection) {
    const bool asItWas = !isBlocked(SIGINT) && !isBlocked(SIGTERM) && !isBlocked(SIGHUP) && !isBlocked(SIGCHLD);
    say(connection, ::getpgrp() == ::getpid() && asItWas ? "yes" : "no");
  };
  ChildProcess child(signals_, body, std::nullopt);
  EXPECT_EQ(readAll(child.connectionDescriptor()), "yes");
  EXPECT_GT(child.id(), 0);
}

TEST_F(ChildProcessTest, HasASessionOfItsOwn) {
  ChildProcess child(
      signals_, [](int connection) { say(connection, ::getsid(0) == ::getpid() ? "yes" : "no"); }, std::nullopt);
  EXPECT_EQ(readAll(child.connectionDescriptor()), "yes");
}

TEST_F(ChildProcessTest, CannotTraceItsParentButMayBeTraced) {
  const auto body = [](int connection) { say(connection, ::prctl(PR_GET_DUMPABLE) == 1 ? "yes" : "no"); };
  for (int i = 0; i < 2; ++i) {
    ChildProcess child(signals_, body, std::nullopt);
    EXPECT_EQ(readAll(child.connectionDescriptor()), "yes");
    EXPECT_EQ(::prctl(PR_GET_DUMPABLE), 0);
  }
}

TEST_F(ChildProcessTest, HasAsMuchMemoryAsItIsGiven) {
  rlimit own{};
  ASSERT_EQ(::getrlimit(RLIMIT_AS, &own), 0);
  const auto limitIn = [this](std::optional<std::uint64_t> memory) {
    const auto body = [](int connection) {
      rlimit limit{};
      ::getrlimit(RLIMIT_AS, &limit);
      say(connection, std::to_string(limit.rlim_cur) + " " + std::to_string(limit.rlim_max));
    };
    ChildProcess child(signals_, body, memory);
    return readAll(child.connectionDescriptor());
  };
  const std::uint64_t memory = std::uint64_t{1} << 45;
  EXPECT_EQ(limitIn(memory), std::to_string(memory) + " " + std::to_string(memory));
  EXPECT_EQ(limitIn(std::nullopt), std::to_string(own.rlim_cur) + " " + std::to_string(own.rlim_max));
}

TEST_F(ChildProcessTest, GoesWithEverythingThatItStarted) {
  pid_t grandchild = 0;
  pid_t orphan = 0;
  {
    const auto body = [](int connection) {
      if (::fork() == 0) hang();
      const pid_t inGroup = ::fork();
      if (inGroup == 0) hang();
      if (::fork() == 0) {
        ::setsid();
        const pid_t left = ::fork();
        if (left == 0) hang();
        say(connection, std::to_string(inGroup) + " " + std::to_string(left) + "\n");
        ::_exit(0);
      }
      hang();
    };
    const ChildProcess child(signals_, body, std::nullopt);
    std::string text;
    while (!text.ends_with('\n')) text += readAll(child.connectionDescriptor(), 1);
    ASSERT_EQ(std::sscanf(text.c_str(), "%d %d", &grandchild, &orphan), 2) << text;
    EXPECT_EQ(::kill(grandchild, 0), 0);
    EXPECT_EQ(::kill(orphan, 0), 0);
  }
  EXPECT_EQ(::kill(grandchild, 0), -1);
  EXPECT_EQ(::kill(orphan, 0), -1);
}

// A process ends and leaves a cleanup process that needs `duration` to switch the light off. Returns whether it did.
bool goesDark(const WatchedSignals& signals, std::chrono::milliseconds duration) {
  static std::chrono::milliseconds takes;
  takes = duration;
  std::string device = (std::filesystem::temp_directory_path() / "guarded-XXXXXX").string();
  ::close(::mkstemp(device.data()));
  {
    const auto body = [&device](int) {
      const auto darken = [](int descriptor, const ControlValue&) {
        std::this_thread::sleep_for(takes);
        if (::write(descriptor, "dark", 4) < 0) ::_exit(1);
      };
      int number = 0;
      const auto guard = startProjectorGuard({device}, {{1, 0}}, darken, &number);
      ::raise(SIGKILL);
    };
    ChildProcess child(signals, body, std::nullopt, [](std::string_view name) { return name == kProjectorGuardName; });
    while (!child.end()) std::this_thread::sleep_for(1ms);
  }
  const bool isDark = std::filesystem::file_size(device) == 4;
  std::filesystem::remove(device);
  return isDark;
}

TEST_F(ChildProcessTest, LeavesAProjectorsGuardTheTimeToPutTheLightOut) {
  EXPECT_TRUE(goesDark(signals_, 100ms));
  EXPECT_FALSE(goesDark(signals_, 30s)) << "but not for ever";
}

TEST_F(ChildProcessTest, LeavesOtherChildrenAlone) {
  const pid_t other = ::fork();
  if (other == 0) hang();
  {
    const ChildProcess child(
        signals_, [](int) { hang(); }, std::nullopt);
  }
  EXPECT_EQ(::waitpid(other, nullptr, WNOHANG), 0);
  ::kill(other, SIGKILL);
  EXPECT_EQ(::waitpid(other, nullptr, 0), other);
}

TEST_F(ChildProcessTest, EndsByASignalToItsGroupEvenWhenItWasStopped) {
  ChildProcess child(
      signals_, [](int) { ::raise(SIGSTOP); }, std::nullopt);
  for (int i = 0; i < 60'000 && stateOf(child.id()) != 'T'; ++i) std::this_thread::sleep_for(1ms);
  ASSERT_EQ(stateOf(child.id()), 'T');
  EXPECT_FALSE(child.end());
  child.signalGroup(SIGTERM);
  EXPECT_EQ(endOf(child), "signal 15 (SIGTERM)");
}

TEST_F(ChildProcessTest, WakesItsParentByItsEnd) {
  ChildProcess child(
      signals_, [](int) {}, std::nullopt);
  pollfd watched{child.endDescriptor(), POLLIN, 0};
  EXPECT_EQ(::poll(&watched, 1, 60'000), 1);
  EXPECT_TRUE(child.end());
  EXPECT_EQ(::poll(&watched, 1, 0), 0);
}

TEST_F(ChildProcessTest, IsKilledWithItsDescendantsWhenItsGuardIs) {
  pid_t orphan = 0;
  {
    const auto body = [](int connection) {
      ::prctl(PR_SET_PDEATHSIG, 0);
      const pid_t other = ::fork();
      if (other == 0) {
        ::setsid();
        hang();
      }
      say(connection, std::to_string(other) + "\n");
      ::kill(::getppid(), SIGKILL);
      hang();
    };
    ChildProcess child(signals_, body, std::nullopt);
    std::string text;
    while (!text.ends_with('\n')) text += readAll(child.connectionDescriptor(), 1);
    orphan = std::stoi(text);
    EXPECT_EQ(endOf(child), "signal 9 (SIGKILL)");
    EXPECT_TRUE(child.hasLostGuard());
  }
  EXPECT_EQ(::kill(orphan, 0), -1);
}

TEST_F(ChildProcessTest, EndsAsWellWhenItsGuardIsStopped) {
  pid_t guard = 0;
  {
    const auto body = [](int connection) {
      say(connection, std::to_string(::getppid()) + "\n");
      ::kill(::getppid(), SIGSTOP);
      hang();
    };
    ChildProcess child(signals_, body, std::nullopt);
    std::string text;
    while (!text.ends_with('\n')) text += readAll(child.connectionDescriptor(), 1);
    guard = std::stoi(text);
    for (int i = 0; i < 60'000 && stateOf(guard) != 'T'; ++i) std::this_thread::sleep_for(1ms);
    child.signalGroup(SIGTERM);
    EXPECT_EQ(endOf(child), "signal 15 (SIGTERM)");
    ::kill(guard, SIGSTOP);
    for (int i = 0; i < 60'000 && stateOf(guard) != 'T'; ++i) std::this_thread::sleep_for(1ms);
  }
  EXPECT_EQ(::kill(guard, 0), -1);
}

// A child can take away from its guard the descriptors that it needs to wait, and to see whom to end.
TEST_F(ChildProcessTest, LeavesNothingWhenItsGuardMayOpenNoFile) {
  for (const rlim_t most : {rlim_t{0}, rlim_t{2}}) {
    pid_t orphan = 0;
    {
      const auto body = [most](int connection) {
        ::prctl(PR_SET_PDEATHSIG, 0);
        const pid_t other = ::fork();
        if (other == 0) {
          ::setsid();
          hang();
        }
        const rlimit few{most, most};
        if (::prlimit(::getppid(), RLIMIT_NOFILE, &few, nullptr) != 0) ::_exit(1);
        say(connection, std::to_string(other) + "\n");
      };
      ChildProcess child(signals_, body, std::nullopt);
      std::string text;
      while (!text.ends_with('\n')) text += readAll(child.connectionDescriptor(), 1);
      orphan = std::stoi(text);
      const std::string end = endOf(child);  // whether the guard is lost shows no earlier
      EXPECT_EQ(end.substr(0, 4), child.hasLostGuard() ? "sign" : "exit");
    }
    EXPECT_EQ(::kill(orphan, 0), -1) << most;
    ::kill(orphan, SIGKILL);
  }
}

// A child can make its guard trace it; a stop for the tracer is not an end.
TEST_F(ChildProcessTest, HasNotEndedWhenItStopsForItsGuard) {
  const auto goOn = [](int) {
    ::signal(SIGUSR1, [](int) {});
    ::ptrace(PTRACE_TRACEME);
    ::raise(SIGUSR1);
    ::_exit(7);
  };
  ChildProcess goingOn(signals_, goOn, std::nullopt);
  EXPECT_EQ(endOf(goingOn), "exit code 7");
  const auto crash = [](int) {
    ::signal(SIGSEGV, SIG_DFL);  // a sanitizer handles it
    ::ptrace(PTRACE_TRACEME);
    ::raise(SIGSEGV);
  };
  ChildProcess crashing(signals_, crash, std::nullopt);
  EXPECT_EQ(endOf(crashing), "signal 11 (SIGSEGV)");
}

TEST(ProcessEnds, HaveATextWithTheSignalsName) {
  EXPECT_EQ(textOf({false, 0}), "exit code 0");
  EXPECT_EQ(textOf({true, SIGSEGV}), "signal 11 (SIGSEGV)");
  EXPECT_EQ(textOf({true, 64}), "signal 64");
}

TEST(ChildProcess, TellsItsEndWhereTheEndsOfChildrenWereIgnored) {
  const SignalAction ignored(SIGCHLD, SIG_IGN);
  {
    const WatchedSignals signals;
    ChildProcess child(
        signals, [](int) { ::_exit(3); }, std::nullopt);
    EXPECT_EQ(endOf(child), "exit code 3");
  }
  struct sigaction after {};
  ASSERT_EQ(sigaction(SIGCHLD, nullptr, &after), 0);
  EXPECT_EQ(after.sa_handler, SIG_IGN);
}

}  // namespace
}  // namespace quazor
