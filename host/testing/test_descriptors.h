// File descriptors in tests.
#pragma once

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

namespace quazor {

// The number that the next descriptor gets.
inline rlim_t nextDescriptor() {
  const int next = ::dup(STDIN_FILENO);
  ::close(next);
  return static_cast<rlim_t>(next);
}

// Leaves this process few descriptors during its lifetime: enough for one pipe, but not for two, so that no process can
// be made.
class FewDescriptors {
 public:
  FewDescriptors() {
    EXPECT_EQ(::getrlimit(RLIMIT_NOFILE, &before_), 0);
    const rlimit few{nextDescriptor() + 3, before_.rlim_max};
    EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &few), 0);
  }
  FewDescriptors(const FewDescriptors&) = delete;
  FewDescriptors& operator=(const FewDescriptors&) = delete;
  ~FewDescriptors() { ::setrlimit(RLIMIT_NOFILE, &before_); }

 private:
  rlimit before_{};
};

}  // namespace quazor
