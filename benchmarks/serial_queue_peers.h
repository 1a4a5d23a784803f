// The serial queues in serial_queue_benchmark: ours, and five others with the same interface.
#pragma once

#include "backends/threads/thread_serial_queue.h"
#include "platform/task.h"

#include <concurrentqueue/blockingconcurrentqueue.h>
#include <tbb/flow_graph.h>
#include <tbb/global_control.h>
#include <asio.hpp>

#include <array>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {

// Ours, through its public interface.
class QuazorQueue {
 public:
  template <class Function>
  void post(Function function) {
    queue_->async(std::move(function));
  }

 private:
  std::shared_ptr<SerialQueue> queue_ =
      std::make_shared<ThreadSerialQueue>("benchmark", QualityOfService::kUserInteractive);
};

// A strand of standalone Asio on a pool of two threads.
class AsioStrand {
 public:
  ~AsioStrand() { pool_.join(); }

  template <class Function>
  void post(Function function) {
    asio::post(strand_, std::move(function));
  }

 private:
  asio::thread_pool pool_{2};
  asio::strand<asio::thread_pool::executor_type> strand_{pool_.get_executor()};
};

// A pool of standalone Asio with one thread.
class AsioPool {
 public:
  ~AsioPool() { pool_.join(); }

  template <class Function>
  void post(Function function) {
    asio::post(pool_, std::move(function));
  }

 private:
  asio::thread_pool pool_{1};
};

// A serial node of a oneTBB flow graph.
class TbbNode {
 public:
  ~TbbNode() { graph_.wait_for_all(); }

  template <class Function>
  void post(Function function) {
    node_.try_put(std::move(function));
  }

 private:
  using Callable = std::function<void()>;

  // one worker thread in addition to the calling one, on any machine
  tbb::global_control control_{tbb::global_control::max_allowed_parallelism, 2};
  tbb::flow::graph graph_;
  tbb::flow::function_node<Callable> node_{graph_, tbb::flow::serial, [](const Callable& callable) {
                                             callable();
                                             return tbb::flow::continue_msg();
                                           }};
};

// moodycamel's queue with a single consumer that takes tasks in bulk. It keeps the order of each producer's tasks, but
// not the order across producers.
class MoodycamelBulk {
 public:
  MoodycamelBulk() : thread_([this] { run(); }) {}
  ~MoodycamelBulk() {
    post([this] { closed_ = true; });
    thread_.join();
  }

  template <class Function>
  void post(Function function) {
    waiting_.enqueue(Task(std::move(function)));
  }

 private:
  static constexpr std::size_t kMaxBatch = 256;

  void run() {
    std::array<Task, kMaxBatch> batch;
    while (!closed_) {
      const std::size_t count = waiting_.wait_dequeue_bulk(batch.begin(), batch.size());
      for (std::size_t i = 0; i < count; ++i) {
        batch[i]();
        batch[i].reset();
      }
    }
  }

  moodycamel::BlockingConcurrentQueue<Task> waiting_;
  bool closed_ = false;  // used only by the consumer
  std::thread thread_;
};

// A hand-written queue: a vector under a mutex, which the thread swaps with its own empty one.
class MutexQueue {
 public:
  MutexQueue() : thread_([this] { run(); }) {}
  ~MutexQueue() {
    {
      const std::lock_guard lock(mutex_);
      closed_ = true;
    }
    changed_.notify_one();
    thread_.join();
  }

  template <class Function>
  void post(Function function) {
    bool was_empty = false;
    {
      const std::lock_guard lock(mutex_);
      was_empty = waiting_.empty();
      waiting_.emplace_back(std::move(function));
    }
    if (was_empty) changed_.notify_one();
  }

 private:
  void run() {
    std::vector<Task> batch;
    for (;;) {
      {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, [this] { return closed_ || !waiting_.empty(); });
        if (waiting_.empty()) return;
        batch.swap(waiting_);
      }
      for (Task& task : batch) {
        task();
        task.reset();
      }
      batch.clear();
    }
  }

  std::mutex mutex_;
  std::condition_variable changed_;
  std::vector<Task> waiting_;  // guarded by mutex_
  bool closed_ = false;        // guarded by mutex_
  std::thread thread_;
};

}  // namespace quazor
