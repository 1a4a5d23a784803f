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
  // False when there is nothing that another thread could wake this one by. A process that was made by fork would share
  // the wake-ups of its parent, and so gets its own.
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
      // A thread that changes the condition and finds no sleeper did so before `ready` is called here.
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
    // It can only fail where the thread is woken anyway: by a count that is as high as it can be.
    [[maybe_unused]] const ssize_t written = ::write(wakeUps_.get(), &one, sizeof one);
  }

 private:
  static timespec timespecOf(std::chrono::nanoseconds time) {
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
    return {static_cast<std::time_t>(seconds.count()), static_cast<long>((time - seconds).count())};
  }

  // Keeps the watches that are to be told, and with them their descriptors, for as long as the system looks at them.
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

  // Sleeps until something that was gathered is ready or the time is over, and signals the sources of what is ready.
  // May return early.
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
  pid_t process_ = 0;  // whose they are
  std::atomic<bool> asleep_{false};
  std::vector<std::weak_ptr<OneShotWatch>> watches_;
  // Of one call of ppoll: the wake-ups first, then what held_ has.
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
