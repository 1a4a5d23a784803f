#include "host/system/standard_descriptors.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <initializer_list>

namespace quazor {
namespace {

// The number that the next file gets in a process that was started without `missing`.
int nextDescriptorWithout(std::initializer_list<int> missing) {
  const pid_t child = ::fork();
  if (child == 0) {
    for (const int one : missing) ::close(one);
    openStandardDescriptors();
    ::_exit(::open("/dev/null", O_RDONLY));
  }
  int status = 0;
  ::waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

// The same where nothing is missing.
int firstFreeDescriptor() {
  const int free = ::open("/dev/null", O_RDONLY);
  ::close(free);
  return free;
}

TEST(StandardDescriptorsTest, NoOtherFileGetsTheirNumbers) {
  const int expected = firstFreeDescriptor();
  ASSERT_GT(expected, STDERR_FILENO);
  EXPECT_EQ(nextDescriptorWithout({}), expected);
  for (const int one : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) EXPECT_EQ(nextDescriptorWithout({one}), expected);
  EXPECT_EQ(nextDescriptorWithout({STDIN_FILENO, STDERR_FILENO}), expected);
  EXPECT_EQ(nextDescriptorWithout({STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}), expected);
}

TEST(StandardDescriptorsTest, AMissingOneRefusesAsBefore) {
  const pid_t child = ::fork();
  if (child == 0) {
    for (const int one : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) ::close(one);
    openStandardDescriptors();
    char byte = 0;
    const bool refused = ::read(STDIN_FILENO, &byte, 1) < 0 && ::write(STDOUT_FILENO, &byte, 1) < 0 &&
                         ::write(STDERR_FILENO, &byte, 1) < 0;
    ::_exit(refused ? 42 : 1);
  }
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 42) << status;
}

TEST(StandardDescriptorsTest, OpenOnesAreLeftAlone) {
  int ends[2] = {};
  ASSERT_EQ(::pipe(ends), 0);
  const pid_t child = ::fork();
  if (child == 0) {
    ::dup2(ends[1], STDOUT_FILENO);
    openStandardDescriptors();
    ::_exit(::write(STDOUT_FILENO, "x", 1) == 1 ? 0 : 1);
  }
  ::close(ends[1]);
  char byte = 0;
  EXPECT_EQ(::read(ends[0], &byte, 1), 1);
  ::close(ends[0]);
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace quazor
