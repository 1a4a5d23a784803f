#include "backends/simulated/time/virtual_scheduler.h"

#include "backends/simulated/time/fiber.h"
#include "backends/simulated/time/simulation_stall.h"
#include "contract/message_format.h"

#include <algorithm>
#include <exception>
#include <stdexcept>

namespace quazor {

// A task on its own stack.
class VirtualScheduler::Flow {
 public:
  Flow() : fiber_([this] { runTask(); }) {}

  void begin(std::shared_ptr<Strand> strand, Task task) {
    strand_ = std::move(strand);
    task_ = std::move(task);
  }
  // Runs until the task blocks or has ended.
  void resume() { fiber_.resume(); }
  // Suspends the task until it is resumed; throws if it has been cancelled.
  void block(const Wait& wait, const VirtualScheduler& scheduler) {
    if (!cancelled_) {
      wait_ = &wait;
      fiber_.suspend();
      wait_ = nullptr;
    }
    if (cancelled_) scheduler.stall(wait.what);
  }
  // Makes every later blocking call of the task throw.
  void cancel() { cancelled_ = true; }

  // The blocking call of the task; null after its end.
  const Wait* wait() const { return wait_; }
  const std::shared_ptr<Strand>& strand() const { return strand_; }
  // For a task that has ended: its strand, and its exception or null.
  std::shared_ptr<Strand> takeStrand() { return std::exchange(strand_, nullptr); }
  std::exception_ptr takeFailure() { return std::exchange(failure_, nullptr); }
  bool cancelled() const { return cancelled_; }

 private:
  void runTask() {
    try {
      task_();
    } catch (...) {
      failure_ = std::current_exception();
    }
    task_.reset();
  }

  std::shared_ptr<Strand> strand_;
  Task task_;
  const Wait* wait_ = nullptr;
  bool cancelled_ = false;
  std::exception_ptr failure_;
  Fiber fiber_;
};

VirtualScheduler::VirtualScheduler(std::shared_ptr<ScheduleStrategy> chooser) : chooser_(std::move(chooser)) {}

VirtualScheduler::~VirtualScheduler() { discardPending(); }

std::chrono::nanoseconds VirtualScheduler::after(std::chrono::nanoseconds delay) const {
  if (delay <= std::chrono::nanoseconds::zero()) return now_;
  return delay >= kNever - now_ ? kNever : now_ + delay;
}

std::shared_ptr<VirtualScheduler::Strand> VirtualScheduler::makeStrand() { return std::make_shared<Strand>(); }

std::shared_ptr<VirtualScheduler::Strand> VirtualScheduler::currentStrand() const {
  return current_ != nullptr ? current_->strand() : nullptr;
}

void VirtualScheduler::submit(const std::shared_ptr<Strand>& strand, Task task) {
  strand->due.push_back(std::move(task));
  if (!strand->running && strand->due.size() == 1) runnable_.push_back(strand);
}

void VirtualScheduler::submitAt(std::chrono::nanoseconds due, const std::shared_ptr<Strand>& strand, Task task) {
  if (due <= now_) {
    submit(strand, std::move(task));
  } else {
    delayed_.emplace(DueTime{due, submitted_++}, Delayed{strand, std::move(task)});
  }
}

void VirtualScheduler::dropDelayed(const Strand& strand) {
  std::vector<Task> dropped;  // destroyed last, because a task's destructor may call the scheduler
  for (auto entry = delayed_.begin(); entry != delayed_.end();) {
    if (entry->second.strand.get() == &strand) {
      dropped.push_back(std::move(entry->second.task));
      entry = delayed_.erase(entry);
    } else {
      ++entry;
    }
  }
}

void VirtualScheduler::discardPending() {
  while (!blocked_.empty() || !delayed_.empty() || !runnable_.empty()) {
    for (std::unique_ptr<Flow>& flow : std::exchange(blocked_, {})) {
      flow->cancel();
      resume(std::move(flow));
    }
    std::map<DueTime, Delayed> delayed;
    delayed.swap(delayed_);
    std::vector<std::shared_ptr<Strand>> strands;
    strands.swap(runnable_);
    for (const std::shared_ptr<Strand>& strand : strands) {
      std::deque<Task> due;
      due.swap(strand->due);
    }
  }
}

void VirtualScheduler::blockUntil(std::chrono::nanoseconds due, std::string_view what) {
  block({[this, due] { return now_ >= due; }, due, what});
}

void VirtualScheduler::blockUntil(const std::function<bool()>& condition, std::string_view what) {
  block({condition, kNever, what});
}

void VirtualScheduler::blockUntil(const std::function<bool()>& condition, std::chrono::nanoseconds due,
                                  std::string_view what) {
  block({[this, &condition, due] { return now_ >= due || condition(); }, due, what});
}

void VirtualScheduler::stall(std::string_view what) const {
  const double seconds = static_cast<double>(now_.count()) / 1e9;
  throw SimulationStall(
      formatMessage("The simulated phone waits for ever: %@, at %@ s of virtual time.", what, seconds));
}

void VirtualScheduler::block(const Wait& wait) {
  if (current_ != nullptr) {
    current_->block(wait, *this);
  } else {
    runUntilReady(wait);
  }
}

void VirtualScheduler::runUntilReady(const Wait& wait) {
  constexpr std::size_t kMainFlow = static_cast<std::size_t>(-1);
  for (;;) {
    std::vector<std::size_t> ready;  // kMainFlow, or an index of blocked_
    if (wait.condition()) ready.push_back(kMainFlow);
    for (std::size_t i = 0; i < blocked_.size(); ++i) {
      if (blocked_[i]->wait()->condition()) ready.push_back(i);
    }
    const std::size_t count = ready.size() + runnable_.size();
    if (count == 0) {
      const std::chrono::nanoseconds next = nextDue(wait.due);
      if (next == kNever) stall(wait.what);
      advanceTo(next);
      continue;
    }
    const std::size_t choice = choose(count);
    if (choice >= ready.size()) {
      beginTaskOf(choice - ready.size());
    } else if (ready[choice] == kMainFlow) {
      return;
    } else {
      const auto chosen = blocked_.begin() + static_cast<std::ptrdiff_t>(ready[choice]);
      std::unique_ptr<Flow> flow = std::move(*chosen);
      blocked_.erase(chosen);
      resume(std::move(flow));
    }
  }
}

std::chrono::nanoseconds VirtualScheduler::nextDue(std::chrono::nanoseconds due) const {
  if (!delayed_.empty()) due = std::min(due, delayed_.begin()->first.first);
  for (const std::unique_ptr<Flow>& flow : blocked_) due = std::min(due, flow->wait()->due);
  return due;
}

std::size_t VirtualScheduler::choose(std::size_t count) {
  if (count == 1) return 0;
  const std::size_t choice = chooser_->choose(count);
  if (choice >= count) throw std::out_of_range("The schedule strategy chose an event that does not exist.");
  return choice;
}

void VirtualScheduler::beginTaskOf(std::size_t position) {
  std::unique_ptr<Flow> flow;
  if (idle_.empty()) {
    flow = std::make_unique<Flow>();
  } else {
    flow = std::move(idle_.back());
    idle_.pop_back();
  }
  std::shared_ptr<Strand> strand = runnable_[position];
  runnable_.erase(runnable_.begin() + static_cast<std::ptrdiff_t>(position));
  strand->running = true;
  Task task = std::move(strand->due.front());
  strand->due.pop_front();
  flow->begin(std::move(strand), std::move(task));
  resume(std::move(flow));
}

void VirtualScheduler::resume(std::unique_ptr<Flow> flow) {
  Flow* resumer = std::exchange(current_, flow.get());
  flow->resume();
  current_ = resumer;
  if (flow->wait() != nullptr) {
    blocked_.push_back(std::move(flow));
    return;
  }
  const std::shared_ptr<Strand> strand = flow->takeStrand();
  strand->running = false;
  if (!strand->due.empty()) runnable_.push_back(strand);
  const std::exception_ptr failure = flow->takeFailure();
  if (flow->cancelled()) return;  // the exception was caused by cancel()
  idle_.push_back(std::move(flow));
  if (failure != nullptr) std::rethrow_exception(failure);
}

void VirtualScheduler::advanceTo(std::chrono::nanoseconds time) {
  now_ = time;
  while (!delayed_.empty() && delayed_.begin()->first.first <= now_) {
    auto entry = delayed_.extract(delayed_.begin());
    submit(entry.mapped().strand, std::move(entry.mapped().task));
  }
}

}  // namespace quazor
