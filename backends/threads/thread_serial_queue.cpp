#include "backends/threads/thread_serial_queue.h"

#include "backends/threads/delayed_tasks.h"
#include "backends/threads/parker.h"
#include "backends/threads/task_list.h"

#include <pthread.h>
#include <sys/resource.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <string>
#include <thread>
#include <utility>

namespace quazor {

namespace {

std::chrono::nanoseconds steadyNow() { return std::chrono::steady_clock::now().time_since_epoch(); }

// At most one tick behind steadyNow(), and much cheaper. Both read the same clock (clock_gettime(2)).
std::chrono::nanoseconds coarseNow() {
  timespec time{};
  clock_gettime(CLOCK_MONOTONIC_COARSE, &time);
  return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

// The time `delay` from now, or never if it exceeds the range of the clock.
std::chrono::nanoseconds dueAfter(std::chrono::nanoseconds delay) {
  const std::chrono::nanoseconds now = steadyNow();
  return delay > DelayedTasks::kNever - now ? DelayedTasks::kNever : now + delay;
}

void nameThisThread(const std::string& label) {
  constexpr std::size_t kMaxNameLength = 15;  // pthread_setname_np(3): 16 bytes including the null
  const std::size_t surplus = label.size() > kMaxNameLength ? label.size() - kMaxNameLength : 0;
  pthread_setname_np(pthread_self(), label.c_str() + surplus);
}

void lowerPriorityOfThisThread() {
  constexpr int kBackgroundNice = 10;
  // On Linux each thread has its own nice value, and 0 means the calling thread (setpriority(2), "C library/kernel
  // differences").
  setpriority(PRIO_PROCESS, 0, kBackgroundNice);
}

}  // namespace

// The state shared by the queue and its thread. The thread keeps it until the thread ends.
class ThreadSerialQueue::Worker {
 public:
  // Thread: any that holds the queue.
  void post(Task&& task) {
    // Keeps the order: delayed tasks that have become due precede the new task.
    if (delayed_.nextDue() != DelayedTasks::kNever) [[unlikely]]
      postDue();
    push(std::move(task));
  }

  void postAfter(std::chrono::nanoseconds delay, Task&& task) {
    if (!delayed_.add(dueAfter(delay), std::move(task))) return;
    if (tasks_.endSleep()) parker_.unpark();  // the thread sleeps until a later due time
  }

  // The queue is being destroyed, so there are no other callers.
  void close() {
    postDue();
    delayed_.close();
    closed_.store(true, std::memory_order_release);
    if (tasks_.endSleep()) parker_.unpark();
  }

  // The thread's main function.
  void run() {
    while (!closed_.load(std::memory_order_acquire)) {
      if (!runWaiting() && !postDue() && !poll()) sleep();
    }
    runWaiting();
    delayed_.clear();
  }

 private:
  // About five microseconds, the cost of a sleep and a wake-up.
  static constexpr int kPolls = 200;
  // Few enough to be cheap, enough to notice that tasks arrive quickly again.
  static constexpr int kMinPolls = 10;
  // Kernels tick at least 100 times a second.
  static constexpr std::chrono::nanoseconds kMaxTick = std::chrono::milliseconds(10);
  // Memory that was not needed for this long is freed.
  static constexpr std::chrono::nanoseconds kMemoryPeriod = std::chrono::milliseconds(100);

  void push(Task&& task) {
    if (tasks_.push(std::move(task))) [[unlikely]]
      parker_.unpark();
  }

  bool postDue() {
    const std::chrono::nanoseconds due = delayed_.nextDue();
    if (due == DelayedTasks::kNever || due - coarseNow() > kMaxTick) return false;
    const std::chrono::nanoseconds now = steadyNow();
    return now >= delayed_.nextDue() && delayed_.postDue(now, [this](Task&& task) { push(std::move(task)); });
  }

  bool runWaiting() {
    Task* task = tasks_.front();
    if (task == nullptr) return false;
    do {
      (*task)();
      tasks_.pop();
      task = tasks_.front();
    } while (task != nullptr);
    return true;
  }

  // Polls briefly for a task and returns whether one has arrived. Polls less after each failure: the next task is then
  // far off, or the thread that would post it is waiting for this processor.
  bool poll() {
    for (int i = 0; i < polls_; ++i) {
      cpuRelax();
      if (tasks_.front() != nullptr) {
        polls_ = kPolls;
        return true;
      }
    }
    polls_ = std::max(kMinPolls, polls_ / 2);
    return false;
  }

  void sleep() {
    parker_.prepare();
    if (!tasks_.beginSleep()) {
      // A thread has claimed a slot but not yet filled it.
      Backoff backoff;
      while (tasks_.front() == nullptr) backoff.pause();
      return;
    }
    // From here on every post, every earlier due time and the end of the queue wakes this thread; all earlier changes
    // are visible to it.
    if (!closed_.load(std::memory_order_acquire)) parker_.park(std::min(delayed_.nextDue(), tidyMemory()));
    static_cast<void>(tasks_.endSleep());
  }

  // Frees memory periodically. Returns the time at which it is due again.
  std::chrono::nanoseconds tidyMemory() {
    if (!tasks_.hasSpares()) return DelayedTasks::kNever;
    const std::chrono::nanoseconds now = steadyNow();
    if (now >= next_tidying_) {
      tasks_.freeUnneededSpares();
      next_tidying_ = now + kMemoryPeriod;
    }
    return next_tidying_;
  }

  TaskList tasks_;
  Parker parker_;
  DelayedTasks delayed_;
  std::atomic<bool> closed_{false};
  // Used only by the thread.
  int polls_ = kMinPolls;
  std::chrono::nanoseconds next_tidying_{};
};

ThreadSerialQueue::ThreadSerialQueue(std::string_view label, QualityOfService quality)
    : worker_(std::make_shared<Worker>()) {
  std::thread([worker = worker_, name = std::string(label), quality] {
    nameThisThread(name);
    if (quality == QualityOfService::kBackground) lowerPriorityOfThisThread();
    worker->run();
  }).detach();
}

ThreadSerialQueue::~ThreadSerialQueue() { worker_->close(); }

void ThreadSerialQueue::async(Task task) { worker_->post(std::move(task)); }

void ThreadSerialQueue::asyncAfter(std::chrono::nanoseconds delay, Task task) {
  if (delay <= std::chrono::nanoseconds::zero()) {
    worker_->post(std::move(task));
  } else {
    worker_->postAfter(delay, std::move(task));
  }
}

}  // namespace quazor
