#include "backends/threads/thread_run_loop.h"

#include "backends/threads/basic_run_loop.h"
#include "backends/threads/parker.h"
#include "backends/threads/watch.h"

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>

namespace quazor {
namespace {

class ThreadWaiter final : public RunLoopWaiter {
 public:
  std::chrono::nanoseconds now() override { return std::chrono::steady_clock::now().time_since_epoch(); }

  void wait(std::chrono::nanoseconds deadline, const std::function<bool()>& ready) override {
    if (watch_.spin(
            ready, [this] { return now(); }, deadline))
      return;
    for (;;) {
      parker_.prepare();
      // A thread that changes the condition without seeing a sleeper did so before the following call of `ready`.
      asleep_.store(true);
      if (ready() || (deadline != kNever && now() >= deadline)) break;
      parker_.park(deadline);
    }
    asleep_.store(false);
  }

  void wake() override {
    if (asleep_.load() && asleep_.exchange(false)) parker_.unpark();
  }

 private:
  Watch watch_;
  Parker parker_;
  std::atomic<bool> asleep_{false};
};

}  // namespace

RunLoop* ThreadRunLoops::currentRunLoop() {
  thread_local BasicRunLoop loop(std::make_shared<ThreadWaiter>());
  return &loop;
}

}  // namespace quazor
