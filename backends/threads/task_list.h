// TaskList: the first-in first-out list between the threads that post tasks and the one thread that runs them.
//
// Tasks lie in place in slots of one cache line each; slots lie in segments; segments are linked from the oldest to
// the newest. One word, the tail, holds the newest segment, the number of its slots that are claimed, and whether the
// consumer sleeps:
//
//   [ address of a segment | claimed slots, 0 to kSlots | asleep ]
//
// 1. A producer claims a slot by raising the count with one compare-and-exchange. No other thread touches a claimed
//    slot, and its segment stays, until the slot has been published and consumed: a claim needs no other protection.
// 2. It moves its task there and publishes the slot through the slot's own flag. The consumer takes slots in the order
//    of the claims, so it waits at a slot that is claimed and not yet published.
// 3. The thread that claims the last slot of a segment links the next segment and moves the tail there before
// publishing the
//    slot. So the consumer finds a link behind every last slot. Other producers wait for the tail meanwhile.
// 4. The consumer goes to sleep by setting the asleep bit, and only while the tail is where the consumer is: nothing
//    is claimed then. The claim that follows clears the bit, and so learns, from the same instruction, that there is
//    somebody to wake. A producer that finds the consumer awake does one atomic instruction and no system call.
// 5. A segment whose slots are all consumed becomes a spare, from which the next link is made. The consumer frees, from
//    time to time, the spares that were not needed since the last time. So memory follows the number of waiting tasks,
//    and a list that is as busy as it was before allocates nothing.
#pragma once

#include "platform/task.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <utility>

namespace quazor {

inline constexpr std::size_t kCacheLine = 64;

// A short pause in a loop that polls memory which another thread is about to write.
inline void cpuRelax() {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_ia32_pause();
#elif defined(__aarch64__)
  asm volatile("yield");
#endif
}

// Waits for another thread that is between two instructions, most likely on another processor: polls at first, and
// gives the processor away when the other thread has evidently lost its own.
// Thread: one at a time.
class Backoff {
 public:
  void pause();

 private:
  int pauses_ = 0;
};

// Any number of producers, one consumer.
// Thread: any for push(); all else the one consumer's.
class TaskList {
 public:
  TaskList();
  TaskList(const TaskList&) = delete;
  TaskList& operator=(const TaskList&) = delete;
  // Destroys the tasks that are left. No other thread may be inside.
  ~TaskList();

  // Appends a task. True when this ended the consumer's sleep: the caller must wake it. Without memory the process
  // ends: a place that is claimed and never filled would hold up all that follow. Thread: any.
  [[nodiscard]] bool push(Task&& task) noexcept;

  // Ends the consumer's sleep without a task. True when it slept: the caller must wake it. What the caller wrote before
  // is seen by the consumer after its next beginSleep.
  // Thread: any.
  [[nodiscard]] bool endSleep() { return (tail_.fetch_and(~kAsleep, std::memory_order_acq_rel) & kAsleep) != 0; }

  // The oldest task, or null when none has been published. It stays in place while it runs.
  // Thread: the consumer.
  Task* front();

  // Destroys the oldest task. REQUIRES: front() has shown it.
  // Thread: the consumer.
  void pop();

  // Announces that the consumer is about to sleep. False when a task has been claimed, and is or will be published.
  // REQUIRES: front() has shown nothing.
  // Thread: the consumer.
  [[nodiscard]] bool beginSleep();

  // True when memory is kept that no task lies in, beyond the segment in use.
  // Thread: the consumer.
  bool hasSpares();
  // Frees what was not needed since the last call.
  // Thread: the consumer.
  void freeUnneededSpares();

 private:
  static constexpr std::size_t kSlots = 127;
  static constexpr std::uintptr_t kAsleep = 1;
  static constexpr std::uintptr_t kOneSlot = 2;
  static constexpr std::uintptr_t kCountMask = kSlots * kOneSlot;
  static constexpr std::size_t kSegmentAlignment = 256;
  static_assert((kAsleep | kCountMask) == kSegmentAlignment - 1, "a segment's address and its count share one word");

  // Holds a task while it is published. One cache line.
  struct alignas(kCacheLine) Slot {
    Slot() {}
    Slot(const Slot&) = delete;
    Slot& operator=(const Slot&) = delete;
    ~Slot() {}

    union {
      Task task;
    };
    std::atomic<bool> published{false};
  };
  static_assert(sizeof(Slot) == kCacheLine);

  struct alignas(kSegmentAlignment) Segment {
    Slot slots[kSlots];
    Segment* next = nullptr;  // written before the last slot is published, read after
  };

  // Segments without tasks, linked through their `next`. The one used last is used first: it may still be in the cache.
  class Spares {
   public:
    ~Spares();
    void put(Segment* segment);
    // Null when there is none.
    Segment* take();
    bool empty();
    void freeUnneeded();

   private:
    std::mutex mutex_;          // taken once for each segment, twice in its life
    Segment* first_ = nullptr;  // guarded by mutex_, as all that follows
    std::size_t count_ = 0;
    std::size_t unneeded_ = 0;  // the lowest count since freeUnneeded
  };

  // NOLINTNEXTLINE(performance-no-int-to-ptr): a tail is a segment's address and, in its lower bits, a count
  static Segment* segmentOf(std::uintptr_t tail) { return reinterpret_cast<Segment*>(tail & ~(kSegmentAlignment - 1)); }
  // Claims a slot; returns the tail as it was before.
  std::uintptr_t claim();
  std::uintptr_t awaitNextSegment() const;
  void linkNextSegment(Segment* full);

  // Written by the producers.
  alignas(kCacheLine) std::atomic<std::uintptr_t> tail_;
  alignas(kCacheLine) Spares spares_;
  // The consumer's own: the slot that it consumes next.
  alignas(kCacheLine) Segment* head_;
  std::size_t consumed_ = 0;  // slots of head_; always below kSlots
};

inline std::uintptr_t TaskList::claim() {
  std::uintptr_t tail = tail_.load(std::memory_order_relaxed);
  for (;;) {
    if ((tail & kCountMask) == kCountMask) [[unlikely]] {
      tail = awaitNextSegment();
    } else if (tail_.compare_exchange_weak(tail, (tail & ~kAsleep) + kOneSlot, std::memory_order_acq_rel,
                                           std::memory_order_relaxed)) {
      return tail;
    }
  }
}

inline bool TaskList::push(Task&& task) noexcept {
  const std::uintptr_t tail = claim();
  Segment* const segment = segmentOf(tail);
  const std::size_t index = (tail & kCountMask) / kOneSlot;
  if (index == kSlots - 1) [[unlikely]]
    linkNextSegment(segment);
  Slot& slot = segment->slots[index];
  std::construct_at(&slot.task, std::move(task));
  slot.published.store(true, std::memory_order_release);
  return (tail & kAsleep) != 0;
}

inline Task* TaskList::front() {
  Slot& slot = head_->slots[consumed_];
  return slot.published.load(std::memory_order_acquire) ? &slot.task : nullptr;
}

inline void TaskList::pop() {
  Slot& slot = head_->slots[consumed_];
  std::destroy_at(&slot.task);
  slot.published.store(false, std::memory_order_relaxed);
  if (++consumed_ == kSlots) [[unlikely]] {
    Segment* const consumed = std::exchange(head_, head_->next);
    consumed_ = 0;
    spares_.put(consumed);
  }
}

}  // namespace quazor
