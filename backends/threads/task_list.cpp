#include "backends/threads/task_list.h"

#include <algorithm>
#include <chrono>
#include <thread>

namespace quazor {

void Backoff::pause() {
  constexpr int kPolls = 64;
  constexpr int kYields = 16;
  ++pauses_;
  if (pauses_ <= kPolls) {
    cpuRelax();
  } else if (pauses_ <= kPolls + kYields) {
    std::this_thread::yield();
  } else {
    // A yield alone would not give time to a thread of lower priority.
    std::this_thread::sleep_for(std::chrono::microseconds(50));
  }
}

TaskList::TaskList() : head_(new Segment) {
  tail_.store(reinterpret_cast<std::uintptr_t>(head_), std::memory_order_relaxed);
}

TaskList::~TaskList() {
  while (front() != nullptr) pop();
  delete head_;
}

bool TaskList::hasSpares() { return !spares_.empty(); }

void TaskList::freeUnneededSpares() { spares_.freeUnneeded(); }

bool TaskList::beginSleep() {
  std::uintptr_t tail = reinterpret_cast<std::uintptr_t>(head_) + consumed_ * kOneSlot;
  return tail_.compare_exchange_strong(tail, tail | kAsleep, std::memory_order_acq_rel, std::memory_order_relaxed);
}

std::uintptr_t TaskList::awaitNextSegment() const {
  Backoff backoff;
  std::uintptr_t tail = 0;
  do {
    backoff.pause();
    tail = tail_.load(std::memory_order_relaxed);
  } while ((tail & kCountMask) == kCountMask);
  return tail;
}

void TaskList::linkNextSegment(Segment* full) {
  Segment* next = spares_.take();
  if (next == nullptr) next = new Segment;
  full->next = next;
  // An exchange instead of a store continues the release sequence of endSleep().
  tail_.exchange(reinterpret_cast<std::uintptr_t>(next), std::memory_order_acq_rel);
}

TaskList::Spares::~Spares() {
  while (Segment* const segment = take()) delete segment;
}

void TaskList::Spares::put(Segment* segment) {
  const std::lock_guard lock(mutex_);
  segment->next = std::exchange(first_, segment);
  ++count_;
}

TaskList::Segment* TaskList::Spares::take() {
  const std::lock_guard lock(mutex_);
  if (first_ == nullptr) return nullptr;
  Segment* const segment = std::exchange(first_, first_->next);
  segment->next = nullptr;
  --count_;
  unneeded_ = std::min(unneeded_, count_);
  return segment;
}

bool TaskList::Spares::empty() {
  const std::lock_guard lock(mutex_);
  return first_ == nullptr;
}

void TaskList::Spares::freeUnneeded() {
  std::size_t surplus = 0;
  {
    const std::lock_guard lock(mutex_);
    surplus = unneeded_;
  }
  for (; surplus > 0; --surplus) delete take();
  const std::lock_guard lock(mutex_);
  unneeded_ = count_;
}

}  // namespace quazor
