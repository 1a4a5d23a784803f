// TaskList: a first-in first-out list from the threads that post tasks to the one thread that runs them.
//
// Tasks are stored in slots of one cache line each. Slots are grouped in segments, which are linked from the oldest to
// the newest. One word, the tail, contains the newest segment, the number of its claimed slots, and whether the
// consumer sleeps:
//
//   [ address of a segment | claimed slots, 0 to kSlots | asleep ]
//
// 1. A producer claims a slot by incrementing the count with a compare-and-exchange. No other thread accesses a claimed
//    slot or reuses its segment until the slot has been published and consumed, so it needs no other protection.
// 2. The producer moves its task there and publishes the slot with the slot's own flag. The consumer takes slots in the
//    order of the claims, so it waits for a slot that is claimed but not yet published.
// 3. The thread that claims the last slot of a segment links the next segment and moves the tail there before it
//    publishes the slot. The consumer therefore finds a link after every last slot. Other producers wait for the tail.
// 4. The consumer goes to sleep by setting the asleep bit, which succeeds only if the tail is at the consumer's slot:
//    nothing is claimed then. The next claim clears the bit, and the same instruction reveals that the consumer must be
//    woken. If the consumer is awake, a producer needs one atomic instruction and no system call.
// 5. A segment whose slots are all consumed becomes a spare, to be linked again later. Periodically, the consumer frees
//    the spares that were not needed since the last time. Memory use follows the number of pending tasks, and a list
//    under constant load does not allocate.
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

// A short pause in a loop that polls memory.
inline void cpuRelax() {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_ia32_pause();
#elif defined(__aarch64__)
  asm volatile("yield");
#endif
}

// Waits for another thread that is between two instructions, probably on another processor. Polls at first, and yields
// the processor if the other thread seems to have lost its own.
// Thread: one at a time.
class Backoff {
 public:
  void pause();

 private:
  int pauses_ = 0;
};

// Any number of producers, one consumer.
// Thread: any for push(); the consumer's for all other functions.
class TaskList {
 public:
  TaskList();
  TaskList(const TaskList&) = delete;
  TaskList& operator=(const TaskList&) = delete;
  // Destroys the remaining tasks. No other thread may use the list.
  ~TaskList();

  // Appends a task. Returns true if this ended the consumer's sleep: the caller must wake it. The process ends if there
  // is no memory, because a claimed slot that is never filled would block the list. Thread: any.
  [[nodiscard]] bool push(Task&& task) noexcept;

  // Ends the consumer's sleep without a task. Returns true if it slept: the caller must wake it. The consumer sees the
  // caller's earlier writes after its next beginSleep().
  // Thread: any.
  [[nodiscard]] bool endSleep() { return (tail_.fetch_and(~kAsleep, std::memory_order_acq_rel) & kAsleep) != 0; }

  // The oldest task, or null if none has been published. It is not moved while it runs.
  // Thread: the consumer.
  Task* front();

  // Destroys the oldest task. REQUIRES: front() has returned it.
  // Thread: the consumer.
  void pop();

  // Announces that the consumer is about to sleep. Returns false if a task has been claimed, published or not.
  // REQUIRES: front() has returned null.
  // Thread: the consumer.
  [[nodiscard]] bool beginSleep();

  // True if memory beyond the segment in use is kept without a task in it.
  // Thread: the consumer.
  bool hasSpares();
  // Frees the spares that were not needed since the last call.
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
    Segment* next = nullptr;  // written before the last slot is published, read afterwards
  };

  // Segments without tasks, linked through `next`. Last in, first out: the most recent is likely still in the cache.
  class Spares {
   public:
    ~Spares();
    void put(Segment* segment);
    // Null if there is none.
    Segment* take();
    bool empty();
    void freeUnneeded();

   private:
    std::mutex mutex_;          // locked once per segment, twice in its lifetime
    Segment* first_ = nullptr;  // guarded by mutex_, as all that follows
    std::size_t count_ = 0;
    std::size_t unneeded_ = 0;  // the lowest count since freeUnneeded
  };

  // NOLINTNEXTLINE(performance-no-int-to-ptr): a tail is a segment's address and, in its lower bits, a count
  static Segment* segmentOf(std::uintptr_t tail) { return reinterpret_cast<Segment*>(tail & ~(kSegmentAlignment - 1)); }
  // Claims a slot and returns the previous value of the tail.
  std::uintptr_t claim();
  std::uintptr_t awaitNextSegment() const;
  void linkNextSegment(Segment* full);

  // Written by producers.
  alignas(kCacheLine) std::atomic<std::uintptr_t> tail_;
  alignas(kCacheLine) Spares spares_;
  // Used only by the consumer: the slot that it consumes next.
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
