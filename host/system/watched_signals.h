// WatchedSignals: the signals that ask this process to end, while it supervises children.
#pragma once

#include <chrono>
#include <vector>

#include <signal.h>
#include <time.h>

namespace quazor {

// While this object lives, SIGINT, SIGTERM and SIGHUP count as requests to end, except those that the process was
// started to ignore:
//
// - the first two only count; who supervises a child ends it then;
// - the third ends this process at once, with the exit code of an interrupt;
// - after the second, so does an output that blocks for two seconds: a time in which this process neither computes nor
//   waits for a child.
//
// The object also makes this process the parent of orphans among its descendants. There is at most one at a time.
//
// Thread: the one that made it, and no other thread may be there.
class WatchedSignals {
 public:
  // Throws std::system_error if a system call fails.
  WatchedSignals();
  WatchedSignals(const WatchedSignals&) = delete;
  WatchedSignals& operator=(const WatchedSignals&) = delete;
  ~WatchedSignals();

  // Readable when a request to end has come since the last drain().
  int descriptor() const { return descriptor_; }
  void drain() const;
  int requestsToEnd() const;
  // Waits that long, or until there is a request to end.
  void wait(std::chrono::nanoseconds time) const;
  // Restores the original signal handling, in a new child.
  void restore() const;

 private:
  struct Replaced {
    int signal;
    struct sigaction before;
  };

  void handle(int signal, void (*handler)(int));

  sigset_t maskBefore_{};
  std::vector<Replaced> replaced_;
  int descriptor_ = -1;
  timer_t timer_{};
};

// During the lifetime of this object this process waits for a child, not for the reader of an output.
//
// Thread: the one of WatchedSignals; objects do not overlap.
class WaitForChild {
 public:
  WaitForChild();
  WaitForChild(const WaitForChild&) = delete;
  WaitForChild& operator=(const WaitForChild&) = delete;
  ~WaitForChild();
};

}  // namespace quazor
