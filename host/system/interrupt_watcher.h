// InterruptWatcher: handles Ctrl-C while diagnostics run.
#pragma once

#include <functional>
#include <thread>

#include <signal.h>

namespace quazor {

// While this object lives, SIGINT does not end the process but calls `interrupted` once, on a separate thread. Threads
// started in the meantime inherit this. If the process was started with SIGINT ignored, it stays ignored.
// Thread: one at a time; `interrupted` is called on the watcher's own thread.
class InterruptWatcher {
 public:
  // Throws std::system_error if a system call fails.
  explicit InterruptWatcher(std::function<void()> interrupted);
  InterruptWatcher(const InterruptWatcher&) = delete;
  InterruptWatcher& operator=(const InterruptWatcher&) = delete;
  // Waits for `interrupted` to return if it is running.
  ~InterruptWatcher();

 private:
  void watch(const std::function<void()>& interrupted) const;

  sigset_t maskBefore_{};
  int signals_ = -1;  // readable when an interrupt has arrived
  int stop_ = -1;     // readable when the watcher is to stop
  std::thread thread_;
};

}  // namespace quazor
