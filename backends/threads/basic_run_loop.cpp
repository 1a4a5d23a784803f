#include "backends/threads/basic_run_loop.h"

#include <utility>

namespace quazor {

class BasicRunLoop::Source final : public RunLoopSource {
 public:
  Source(std::shared_ptr<RunLoopWaiter> waiter, std::function<void()> handler)
      : waiter_(std::move(waiter)), handler_(std::move(handler)) {}

  void signal() override {
    if (!signalled_.exchange(true)) waiter_->wake();
  }
  bool signalled() const { return signalled_.load(); }
  // Returns whether it was signalled, and resets the signal.
  bool take() { return signalled_.load() && signalled_.exchange(false); }
  void handle() const { handler_(); }

 private:
  const std::shared_ptr<RunLoopWaiter> waiter_;
  const std::function<void()> handler_;
  std::atomic<bool> signalled_{false};
};

class BasicRunLoop::Observer final : public RunLoopObserver {
 public:
  Observer(RunLoopActivities observed, bool isRepeating, std::int64_t rank,
           std::function<void(RunLoopActivities)> function)
      : activities(observed), repeats(isRepeating), order(rank), handler(std::move(function)) {}

  const RunLoopActivities activities;
  const bool repeats;
  const std::int64_t order;
  const std::function<void(RunLoopActivities)> handler;
};

// A nested run. Saves a stop that was meant for an outer run and restores it afterwards.
class BasicRunLoop::Nesting {
 public:
  explicit Nesting(std::atomic<bool>& stopped) : stopped_(stopped), outer_(stopped.exchange(false)) {}
  Nesting(const Nesting&) = delete;
  Nesting& operator=(const Nesting&) = delete;
  ~Nesting() { stopped_.store(outer_); }

 private:
  std::atomic<bool>& stopped_;
  const bool outer_;
};

BasicRunLoop::BasicRunLoop(std::shared_ptr<RunLoopWaiter> waiter) : waiter_(std::move(waiter)) {}

BasicRunLoop::~BasicRunLoop() {
  // Removes each mode from the map before its contents are destroyed, because their destructors may call the loop.
  while (!modes_.empty()) modes_.extract(modes_.begin());
}

std::shared_ptr<RunLoopSource> BasicRunLoop::makeSource(std::function<void()> handler) {
  return std::make_shared<Source>(waiter_, std::move(handler));
}

void BasicRunLoop::addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
  modeToChange(mode).sources.add(std::static_pointer_cast<Source>(source), 0, ++additions_);
}

void BasicRunLoop::removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
  modeToChange(mode).sources.remove(static_cast<const Source*>(source.get()));
}

std::shared_ptr<RunLoopObserver> BasicRunLoop::makeObserver(RunLoopActivities activities, bool repeats,
                                                            std::int64_t order,
                                                            std::function<void(RunLoopActivities)> handler) {
  return std::make_shared<Observer>(activities, repeats, order, std::move(handler));
}

void BasicRunLoop::addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) {
  auto added = std::static_pointer_cast<Observer>(observer);
  const std::int64_t order = added->order;
  modeToChange(mode).observers.add(std::move(added), order, ++additions_);
}

void BasicRunLoop::removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) {
  modeToChange(mode).observers.remove(static_cast<const Observer*>(observer.get()));
}

RunLoopResult BasicRunLoop::runInMode(std::string_view name, std::chrono::nanoseconds limit,
                                      bool returnAfterSourceHandled) {
  Mode& mode = modeNamed(name);
  const std::chrono::nanoseconds deadline = deadlineAfter(limit);
  const Nesting nesting(stopped_);
  tell(mode, kRunLoopEntry);
  for (;;) {
    waiter_->look();
    const bool handled = handleSources(mode);
    if (const auto reason = reasonToEnd(mode, deadline, handled && returnAfterSourceHandled)) {
      tell(mode, kRunLoopExit);
      return *reason;
    }
    if (!hasWork(mode)) waitFor(mode, deadline);
  }
}

void BasicRunLoop::stop() {
  const std::shared_ptr<RunLoopWaiter> waiter = waiter_;  // keeps the waiter alive: a stopped run may destroy the loop
  if (!stopped_.exchange(true)) waiter->wake();
}

BasicRunLoop::Mode& BasicRunLoop::modeNamed(std::string_view name) {
  const auto found = modes_.find(name);
  return found != modes_.end() ? found->second : modes_[std::string(name)];
}

// kRunLoopCommonModes contains only the default mode.
BasicRunLoop::Mode& BasicRunLoop::modeToChange(std::string_view name) {
  return modeNamed(name == kRunLoopCommonModes ? kRunLoopDefaultMode : name);
}

void BasicRunLoop::tell(Mode& mode, RunLoopActivities activity) {
  mode.observers.visit(
      additions_, [activity](const Observer& observer) { return (observer.activities & activity) != 0; },
      [this, activity](const std::shared_ptr<Observer>& observer) {
        if (!observer->repeats) {
          for (auto& [name, other] : modes_) other.observers.remove(observer.get());
        }
        observer->handler(activity);
      });
}

// True if at least one source was handled.
bool BasicRunLoop::handleSources(Mode& mode) {
  if (!hasWork(mode)) return false;
  tell(mode, kRunLoopBeforeSources);
  bool handled = false;
  mode.sources.visit(
      additions_, [](Source& source) { return source.take(); },
      [&handled](const std::shared_ptr<Source>& source) {
        handled = true;
        source->handle();
      });
  return handled;
}

std::chrono::nanoseconds BasicRunLoop::deadlineAfter(std::chrono::nanoseconds limit) {
  const std::chrono::nanoseconds now = waiter_->now();
  return limit >= RunLoopWaiter::kNever - now ? RunLoopWaiter::kNever : now + limit;
}

std::optional<RunLoopResult> BasicRunLoop::reasonToEnd(const Mode& mode, std::chrono::nanoseconds deadline,
                                                       bool handledEnough) {
  if (handledEnough) return RunLoopResult::kHandledSource;
  if (deadline != RunLoopWaiter::kNever && waiter_->now() >= deadline) return RunLoopResult::kTimedOut;
  if (stopped_.load()) return RunLoopResult::kStopped;
  if (mode.sources.empty()) return RunLoopResult::kFinished;
  return std::nullopt;
}

bool BasicRunLoop::hasWork(const Mode& mode) const {
  return mode.sources.anyOf([](const Source& source) { return source.signalled(); });
}

void BasicRunLoop::waitFor(Mode& mode, std::chrono::nanoseconds deadline) {
  tell(mode, kRunLoopBeforeWaiting);
  waiter_->wait(deadline, [this, &mode] { return hasWork(mode) || stopped_.load() || mode.sources.empty(); });
  tell(mode, kRunLoopAfterWaiting);
}

}  // namespace quazor
