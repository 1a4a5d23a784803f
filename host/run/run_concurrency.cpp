#include "host/run/run_concurrency.h"

#include <atomic>
#include <cstdint>
#include <string>
#include <utility>

namespace quazor {

namespace {

// The number of this thread: 1 for the first that asks, 2 for the next.
std::uint64_t numberOfThread() {
  static std::atomic<std::uint64_t> threads{0};
  thread_local const std::uint64_t number = ++threads;
  return number;
}

// Thread: any.
class QueueOfRun final : public SerialQueue {
 public:
  // `traced` may be null: the tasks are not told. Otherwise it has a clock.
  QueueOfRun(std::shared_ptr<SerialQueue> queue, std::shared_ptr<const RunLog> log,
             std::shared_ptr<TracedStream> traced, std::shared_ptr<const Clock> clock)
      : queue_(std::move(queue)), log_(std::move(log)), traced_(std::move(traced)), clock_(std::move(clock)) {}

  void async(Task task) override { queue_->async(ofRun(std::move(task))); }
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override {
    queue_->asyncAfter(delay, ofRun(std::move(task)));
  }

 private:
  Task ofRun(Task task) const {
    const std::chrono::nanoseconds posted = traced_ == nullptr ? std::chrono::nanoseconds(0) : clock_->now();
    // Keeps the log alive, so that no later one has its address.
    return [log = log_, traced = traced_, posted, task = std::move(task)]() mutable {
      const RunLog::Owner owner(*log);
      const TracedDelivery delivery(traced, traced == nullptr ? 0 : numberOfThread(), posted);
      task();
      task.reset();  // what it owns may write a line when it is destroyed
      delivery.handBack();
    };
  }

  const std::shared_ptr<SerialQueue> queue_;
  const std::shared_ptr<const RunLog> log_;
  const std::shared_ptr<TracedStream> traced_;
  const std::shared_ptr<const Clock> clock_;
};

// Thread: any.
class ConcurrencyOfRun final : public Concurrency {
 public:
  ConcurrencyOfRun(std::shared_ptr<Concurrency> concurrency, std::shared_ptr<const RunLog> log, TaskTrace trace)
      : concurrency_(std::move(concurrency)), log_(std::move(log)), trace_(std::move(trace)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override {
    return std::make_shared<QueueOfRun>(concurrency_->makeSerialQueue(label, quality), log_, tracedQueue(label),
                                        trace_.clock);
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override { return concurrency_->makeSemaphore(count); }

 private:
  std::shared_ptr<TracedStream> tracedQueue(std::string_view label) const {
    return trace_.rings == nullptr ? nullptr
                                   : trace_.rings->addQueue(std::string(label), trace_.clock, trace_.whenFull);
  }

  const std::shared_ptr<Concurrency> concurrency_;
  const std::shared_ptr<const RunLog> log_;
  const TaskTrace trace_;
};

}  // namespace

std::shared_ptr<Concurrency> concurrencyOfRun(std::shared_ptr<Concurrency> concurrency,
                                              std::shared_ptr<const RunLog> log, TaskTrace trace) {
  return std::make_shared<ConcurrencyOfRun>(std::move(concurrency), std::move(log), std::move(trace));
}

}  // namespace quazor
