#include "host/run/run_concurrency.h"

#include <utility>

namespace quazor {

namespace {

// Thread: any.
class QueueOfRun final : public SerialQueue {
 public:
  QueueOfRun(std::shared_ptr<SerialQueue> queue, std::shared_ptr<const RunLog> log)
      : queue_(std::move(queue)), log_(std::move(log)) {}

  void async(Task task) override { queue_->async(ofRun(std::move(task))); }
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override {
    queue_->asyncAfter(delay, ofRun(std::move(task)));
  }

 private:
  Task ofRun(Task task) const {
    // Keeps the log alive, so that no later one has its address.
    return [log = log_, task = std::move(task)]() mutable {
      const RunLog::Owner owner(*log);
      task();
      task.reset();  // what it owns may write a line when it is destroyed
    };
  }

  const std::shared_ptr<SerialQueue> queue_;
  const std::shared_ptr<const RunLog> log_;
};

// Thread: any.
class ConcurrencyOfRun final : public Concurrency {
 public:
  ConcurrencyOfRun(std::shared_ptr<Concurrency> concurrency, std::shared_ptr<const RunLog> log)
      : concurrency_(std::move(concurrency)), log_(std::move(log)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override {
    return std::make_shared<QueueOfRun>(concurrency_->makeSerialQueue(label, quality), log_);
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override { return concurrency_->makeSemaphore(count); }

 private:
  const std::shared_ptr<Concurrency> concurrency_;
  const std::shared_ptr<const RunLog> log_;
};

}  // namespace

std::shared_ptr<Concurrency> concurrencyOfRun(std::shared_ptr<Concurrency> concurrency,
                                              std::shared_ptr<const RunLog> log) {
  return std::make_shared<ConcurrencyOfRun>(std::move(concurrency), std::move(log));
}

}  // namespace quazor
