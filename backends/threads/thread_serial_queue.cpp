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

// At most a tick behind steadyNow(), and a fraction of its price. Both read the same clock (clock_gettime(2)).
std::chrono::nanoseconds coarseNow() {
  timespec time{};
  clock_gettime(CLOCK_MONOTONIC_COARSE, &time);
  return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

// The moment `delay` from now, or never when the clock does not reach that far.
std::chrono::nanoseconds dueAfter(std::chrono::nanoseconds delay) {
  const std::chrono::nanoseconds now = steadyNow();
  return delay > DelayedTasks::kNever - now ? DelayedTasks::kNever : now + delay;
}

void nameThisThread(const std::string& label) {
  constexpr std::size_t kMaxNameLength = 15;  // pthread_setname_np(3): 16 bytes with the closing null
  const std::size_t surplus = label.size() > kMaxNameLength ? label.size() - kMaxNameLength : 0;
  pthread_setname_np(pthread_self(), label.c_str() + surplus);
}

void lowerPriorityOfThisThread() {
  constexpr int kBackgroundNice = 10;
  // Linux keeps a nice value for each thread, and 0 is the calling one (setpriority(2), "C library/kernel
  // differences").
  setpriority(PRIO_PROCESS, 0, kBackgroundNice);
}

}  // namespace

// What the queue and its thread share. The thread holds it until its end.
class ThreadSerialQueue::Worker {
 public:
  // Any thread that holds the queue.
  void post(Task&& task) {
    // A thread that posts after a delayed task has become due posts the delayed task first.
    if (delayed_.nextDue() != DelayedTasks::kNever) [[unlikely]]
      postDue();
    push(std::move(task));
  }

  void postAfter(std::chrono::nanoseconds delay, Task&& task) {
    if (!delayed_.add(dueAfter(delay), std::move(task))) return;
    if (tasks_.endSleep()) parker_.unpark();  // the thread sleeps until a later moment
  }

  // The queue is being destroyed, so no other thread posts any more.
  void close() {
    postDue();
    delayed_.close();
    closed_.store(true, std::memory_order_release);
    if (tasks_.endSleep()) parker_.unpark();
  }

  // The thread's life.
  void run() {
    while (!closed_.load(std::memory_order_acquire)) {
      if (!runWaiting() && !postDue() && !poll()) sleep();
    }
    runWaiting();
    delayed_.clear();
  }

 private:
  // About five microseconds: as long as a sleep and a wake-up take.
  static constexpr int kPolls = 200;
  // So few that they cost nothing, and enough to notice that the next task comes soon again.
  static constexpr int kMinPolls = 10;
  // Kernels tick at least 100 times a second.
  static constexpr std::chrono::nanoseconds kMaxTick = std::chrono::milliseconds(10);
  // Memory that was of no use for so long is given back.
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

  // Watches for a task for a short time. True when one has come. Watches the shorter the more often it was in vain: the
  // next task is far off then, or the thread that is to post it waits for this very processor.
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
      // A task is on its way: its thread has claimed a place and not yet filled it.
      Backoff backoff;
      while (tasks_.front() == nullptr) backoff.pause();
      return;
    }
    // From here on every post, every earlier due time and the end of the queue wakes this thread; what came before is
    // visible to it.
    if (!closed_.load(std::memory_order_acquire)) parker_.park(std::min(delayed_.nextDue(), tidyMemory()));
    static_cast<void>(tasks_.endSleep());
  }

  // Gives memory back when it is time to. Returns when it will be time again.
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
  // The thread's own.
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
