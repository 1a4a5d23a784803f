// InterruptWatcher: Ctrl-C while diagnostics run.
#pragma once

#include <functional>
#include <thread>

#include <signal.h>

namespace quazor {

// While it lives, an interrupt from the keyboard (SIGINT) no longer ends the process but calls `interrupted`, once, on
// a thread of its own. Threads that start meanwhile inherit that. Where the process was started with interrupts
// ignored, they stay ignored.
// Thread: one at a time; `interrupted` is called on the watcher's own thread.
class InterruptWatcher {
 public:
  // Throws std::system_error when the system refuses what it needs.
  explicit InterruptWatcher(std::function<void()> interrupted);
  InterruptWatcher(const InterruptWatcher&) = delete;
  InterruptWatcher& operator=(const InterruptWatcher&) = delete;
  // Waits for `interrupted` to return if it is running.
  ~InterruptWatcher();

 private:
  void watch(const std::function<void()>& interrupted) const;

  sigset_t maskBefore_{};
  int signals_ = -1;  // readable when an interrupt has come
  int stop_ = -1;     // readable when the watcher is to end
  std::thread thread_;
};

}  // namespace quazor
