#include "host/system/file_size_limit.h"

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

TEST(FileSizeLimitTest, AWriteBeyondItFails) {
  const int status = statusOfWriting([] { failWritesBeyondFileSizeLimit(); });
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 42) << status;
}

TEST(FileSizeLimitTest, AChildHasTheSignalAsItWas) {
  const auto restore = [] {
    failWritesBeyondFileSizeLimit();
    failWritesBeyondFileSizeLimit();
    restoreFileSizeSignal();
  };
  const int status = statusOfWriting(restore);
  EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGXFSZ) << status;
}

}  // namespace
}  // namespace quazor
