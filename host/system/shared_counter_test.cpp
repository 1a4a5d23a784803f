#include "host/system/shared_counter.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

namespace quazor {
namespace {

TEST(SharedCounter, IsSeenByAChildAndItsParent) {
  SharedCounter counter;
  EXPECT_EQ(counter.get(), 0U);
  counter.set(5);
  const pid_t child = ::fork();
  if (child == 0) {
    const bool seen = counter.get() == 5;
    counter.set(UINT64_MAX);
    ::_exit(seen ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(counter.get(), UINT64_MAX);
}

}  // namespace
}  // namespace quazor
