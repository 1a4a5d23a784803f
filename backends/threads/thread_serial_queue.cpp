#include "backends/threads/thread_serial_queue.h"

#include "backends/threads/delayed_tasks.h"
#include "backends/threads/parker.h"
#include "backends/threads/task_list.h"

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <utility>

namespace quazor {

namespace {

std::chrono::nanoseconds steadyNow() { return std::chrono::steady_clock::now().time_since_epoch(); }

// The moment `delay` from now, or never when the clock does not reach that far.
std::chrono::nanoseconds dueAfter(std::chrono::nanoseconds delay) {
  const std::chrono::nanoseconds now = steadyNow();
  return delay > DelayedTasks::kNever - now ? DelayedTasks::kNever : now + delay;
}

void nameThisThread(const std::string& label) {
  constexpr std::size_t kLongestName = 15;  // pthread_setname_np(3): 16 bytes with the closing null
  const std::size_t surplus = label.size() > kLongestName ? label.size() - kLongestName : 0;
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
  explicit Worker(QualityOfService quality) : polls_(quality == QualityOfService::kBackground ? 0 : kPolls) {}

  // Any thread that holds the queue.
  void post(Task task) {
    // Whoever posts after a delayed task has become due posts that one first.
    if (delayed_.nextDue() != DelayedTasks::kNever) [[unlikely]]
      postDue();
    push(std::move(task));
  }

  void postAfter(std::chrono::nanoseconds delay, Task task) {
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

  void push(Task&& task) {
    if (tasks_.push(std::move(task))) [[unlikely]]
      parker_.unpark();
  }

  bool postDue() {
    if (delayed_.nextDue() == DelayedTasks::kNever) return false;
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

  // Watches for a task for a short time. True when one has come.
  bool poll() {
    for (int i = 0; i < polls_; ++i) {
      relaxProcessor();
      if (tasks_.front() != nullptr) return true;
    }
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
    if (!closed_.load(std::memory_order_acquire)) parker_.park(delayed_.nextDue());
    static_cast<void>(tasks_.endSleep());
  }

  TaskList tasks_;
  Parker parker_;
  DelayedTasks delayed_;
  std::atomic<bool> closed_{false};
  const int polls_;
};

ThreadSerialQueue::ThreadSerialQueue(std::string_view label, QualityOfService quality)
    : worker_(std::make_shared<Worker>(quality)) {
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
