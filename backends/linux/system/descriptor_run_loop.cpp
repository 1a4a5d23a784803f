#include "backends/linux/system/descriptor_run_loop.h"

#include "backends/threads/basic_run_loop.h"
#include "backends/threads/watch.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <ctime>
#include <functional>
#include <utility>
#include <vector>

namespace quazor {
namespace {

class OneShotWatch final : public DescriptorWatch {
 public:
  OneShotWatch(std::shared_ptr<const FileDescriptor> descriptor, const std::shared_ptr<RunLoopSource>& source)
      : descriptor_(std::move(descriptor)), source_(source) {}

  void arm() override { armed_ = true; }

  bool isArmed() const { return armed_; }
  int descriptor() const { return descriptor_->get(); }
  void tell() {
    armed_ = false;
    if (const std::shared_ptr<RunLoopSource> source = source_.lock()) source->signal();
  }

 private:
  const std::shared_ptr<const FileDescriptor> descriptor_;
  const std::weak_ptr<RunLoopSource> source_;
  bool armed_ = false;
};

class DescriptorWaiter final : public RunLoopWaiter {
 public:
  // False if there is no descriptor to wake this thread with. A forked process gets its own, because it would otherwise
  // share the wake-ups of its parent.
  bool canBeWoken() {
    const pid_t process = ::getpid();
    if (!wakeUps_ || process != process_) wakeUps_ = FileDescriptor(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
    process_ = process;
    return static_cast<bool>(wakeUps_);
  }
  void add(const std::shared_ptr<OneShotWatch>& watch) { watches_.push_back(watch); }

  std::chrono::nanoseconds now() override { return std::chrono::steady_clock::now().time_since_epoch(); }

  void look() override {
    gather();
    if (!held_.empty()) poll(std::chrono::nanoseconds::zero());
  }

  void wait(std::chrono::nanoseconds deadline, const std::function<bool()>& ready) override {
    if (watch_.spin(
            ready, [this] { return now(); }, deadline))
      return;
    for (;;) {
      // A thread that changes the condition without seeing a sleeper did so before the following call of `ready`.
      asleep_.store(true);
      if (ready()) break;
      const std::chrono::nanoseconds left = deadline == kNever ? kNever : deadline - now();
      if (left <= std::chrono::nanoseconds::zero()) break;
      gather();
      poll(left);
    }
    asleep_.store(false);
  }

  void wake() override {
    if (!asleep_.load() || !asleep_.exchange(false)) return;
    const std::uint64_t one = 1;
    // It can fail only if the count is at its maximum, and then the thread is woken anyway.
    [[maybe_unused]] const ssize_t written = ::write(wakeUps_.get(), &one, sizeof one);
  }

 private:
  static timespec timespecOf(std::chrono::nanoseconds time) {
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
    return {static_cast<std::time_t>(seconds.count()), static_cast<long>((time - seconds).count())};
  }

  // Collects the armed watches and keeps their descriptors open during the system call.
  void gather() {
    std::erase_if(watches_, [](const std::weak_ptr<OneShotWatch>& watch) { return watch.expired(); });
    asked_ = {{wakeUps_.get(), POLLIN, 0}};
    for (const std::weak_ptr<OneShotWatch>& watch : watches_) {
      std::shared_ptr<OneShotWatch> held = watch.lock();
      if (held == nullptr || !held->isArmed()) continue;
      asked_.push_back({held->descriptor(), POLLIN, 0});
      held_.push_back(std::move(held));
    }
  }

  // Blocks until a collected descriptor is ready or the time is over, and signals the sources of ready descriptors. May
  // return early.
  void poll(std::chrono::nanoseconds longest) {
    const timespec timeout = timespecOf(longest);
    const int ready = ::ppoll(asked_.data(), asked_.size(), longest == kNever ? nullptr : &timeout, nullptr);
    asleep_.store(false);
    if (ready > 0) {
      if (asked_.front().revents != 0) forgetWakeUps();
      for (std::size_t i = 0; i < held_.size(); ++i) {
        if (asked_[i + 1].revents != 0) held_[i]->tell();
      }
    }
    held_.clear();
  }

  void forgetWakeUps() {
    std::uint64_t count = 0;
    [[maybe_unused]] const ssize_t got = ::read(wakeUps_.get(), &count, sizeof count);
  }

  Watch watch_;
  FileDescriptor wakeUps_;
  pid_t process_ = 0;  // the process that owns wakeUps_
  std::atomic<bool> asleep_{false};
  std::vector<std::weak_ptr<OneShotWatch>> watches_;
  // The arguments of one call of ppoll: the wake-ups first, then the descriptors of held_.
  std::vector<pollfd> asked_;
  std::vector<std::shared_ptr<OneShotWatch>> held_;
};

struct LoopOfThread {
  const std::shared_ptr<DescriptorWaiter> waiter = std::make_shared<DescriptorWaiter>();
  BasicRunLoop loop{waiter};
};

LoopOfThread& loopOfThisThread() {
  thread_local LoopOfThread loop;
  return loop;
}

class LinuxRunLoops final : public RunLoops {
 public:
  RunLoop* currentRunLoop() override {
    LoopOfThread& current = loopOfThisThread();
    return current.waiter->canBeWoken() ? &current.loop : nullptr;
  }
};

}  // namespace

std::shared_ptr<RunLoops> makeLinuxRunLoops() { return std::make_shared<LinuxRunLoops>(); }

std::shared_ptr<DescriptorWatch> watchDescriptor(RunLoop& loop, std::shared_ptr<const FileDescriptor> descriptor,
                                                 const std::shared_ptr<RunLoopSource>& source) {
  LoopOfThread& current = loopOfThisThread();
  if (&loop != &current.loop) return nullptr;
  auto watch = std::make_shared<OneShotWatch>(std::move(descriptor), source);
  current.waiter->add(watch);
  return watch;
}

}  // namespace quazor
