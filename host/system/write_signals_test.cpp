#include "host/system/write_signals.h"

#include "host/testing/test_directory.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

namespace quazor {
namespace {

// How a child ends that writes two bytes to a file of which only one is allowed: the status of waitpid().
template <class Prepare>
int statusOfWriting(const Prepare& prepare) {
  const TestDirectory directory;
  const std::string file = directory.path() / "file";
  const pid_t child = ::fork();
  if (child == 0) {
    ::signal(SIGXFSZ, SIG_DFL);
    const rlimit limits{1, 1};
    ::setrlimit(RLIMIT_FSIZE, &limits);
    const rlimit noCore{0, 0};
    ::setrlimit(RLIMIT_CORE, &noCore);
    prepare();
    const int descriptor = ::open(file.c_str(), O_WRONLY | O_CREAT, 0600);
    if (::write(descriptor, "x", 1) != 1) ::_exit(1);
    ::_exit(::write(descriptor, "x", 1) < 0 && errno == EFBIG ? 42 : 2);
  }
  int status = 0;
  EXPECT_EQ(::waitpid(child, &status, 0), child);
  return status;
}

TEST(WriteSignalsTest, AWriteBeyondTheLimitOfFilesFails) {
  const int status = statusOfWriting([] { failWritesWithoutSignals(); });
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 42) << status;
}

TEST(WriteSignalsTest, AChildHasTheSignalOfTheLimitAsItWas) {
  const auto restore = [] {
    failWritesWithoutSignals();
    failWritesWithoutSignals();
    restoreWriteSignals();
  };
  const int status = statusOfWriting(restore);
  EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGXFSZ) << status;
}

// How a child ends that writes to a pipe which nobody reads: the status of waitpid().
template <class Prepare>
int statusOfWritingToNobody(const Prepare& prepare) {
  const pid_t child = ::fork();
  if (child == 0) {
    ::signal(SIGPIPE, SIG_DFL);
    prepare();
    int ends[2];
    if (::pipe(ends) != 0 || ::close(ends[0]) != 0) ::_exit(1);
    ::_exit(::write(ends[1], "x", 1) < 0 && errno == EPIPE ? 42 : 2);
  }
  int status = 0;
  EXPECT_EQ(::waitpid(child, &status, 0), child);
  return status;
}

TEST(WriteSignalsTest, AWriteToAClosedPipeFails) {
  const int status = statusOfWritingToNobody([] { failWritesWithoutSignals(); });
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 42) << status;
}

TEST(WriteSignalsTest, AChildHasTheSignalOfPipesAsItWas) {
  const int status = statusOfWritingToNobody([] {
    failWritesWithoutSignals();
    failWritesWithoutSignals();
    restoreWriteSignals();
  });
  EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGPIPE) << status;
}

}  // namespace
}  // namespace quazor
