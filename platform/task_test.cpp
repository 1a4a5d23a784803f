#include "platform/task.h"

#include <gtest/gtest.h>

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <type_traits>

namespace quazor {
namespace {

static_assert(std::is_nothrow_move_constructible_v<Task>);
static_assert(std::is_nothrow_move_assignable_v<Task>);
static_assert(!std::is_copy_constructible_v<Task>);
static_assert(!std::is_constructible_v<Task, int>);
static_assert(!std::is_constructible_v<Task, void (*)(int)>);

struct Counts {
  int runs = 0;
  int constructions = 0;
  int destructions = 0;
  const void* ranAt = nullptr;

  int alive() const { return constructions - destructions; }
};

// A callable of a given size that counts its constructions, calls and destructions.
template <std::size_t kSize, bool kMovesWithoutThrowing = true>
class Counted {
 public:
  explicit Counted(Counts& counts) : counts_(&counts) { ++counts_->constructions; }
  Counted(Counted&& other) noexcept(kMovesWithoutThrowing) : counts_(other.counts_) { ++counts_->constructions; }
  Counted(const Counted& other) = delete;
  Counted& operator=(const Counted& other) = delete;
  ~Counted() { ++counts_->destructions; }
  void operator()() {
    ++counts_->runs;
    counts_->ranAt = this;
  }

 private:
  Counts* counts_;
  std::array<std::byte, kSize - sizeof(Counts*)> ballast_{};
};
using Small = Counted<16>;
using Largest = Counted<Task::kInlineSize>;
using Large = Counted<Task::kInlineSize + 8>;
using Throwing = Counted<16, false>;
static_assert(sizeof(Largest) == Task::kInlineSize);
static_assert(sizeof(Large) == Task::kInlineSize + 8);

template <class Callable>
class TaskTest : public testing::Test {
 protected:
  Counts counts_;
};

struct CallableNames {
  template <class Callable>
  static std::string GetName(int /*index*/) {
    if (std::is_same_v<Callable, Small>) return "Small";
    if (std::is_same_v<Callable, Largest>) return "LargestInline";
    return std::is_same_v<Callable, Large> ? "Large" : "MoveMayThrow";
  }
};
using Callables = testing::Types<Small, Largest, Large, Throwing>;
TYPED_TEST_SUITE(TaskTest, Callables, CallableNames);

bool isInside(const void* place, const Task& task) {
  return std::bit_cast<std::uintptr_t>(place) - std::bit_cast<std::uintptr_t>(&task) < sizeof(Task);
}

TYPED_TEST(TaskTest, RunsItsCallableEachTimeItIsCalled) {
  Task task{TypeParam(this->counts_)};
  EXPECT_TRUE(task);
  task();
  task();
  EXPECT_EQ(this->counts_.runs, 2);
}

TYPED_TEST(TaskTest, HoldsOnlySmallCallablesThatMoveSafelyInPlace) {
  Task task{TypeParam(this->counts_)};
  task();
  constexpr bool inPlace = std::is_same_v<TypeParam, Small> || std::is_same_v<TypeParam, Largest>;
  EXPECT_EQ(isInside(this->counts_.ranAt, task), inPlace);
}

TYPED_TEST(TaskTest, DestroysItsCallableWithItself) {
  {
    const Task task{TypeParam(this->counts_)};
    EXPECT_EQ(this->counts_.alive(), 1);
  }
  EXPECT_EQ(this->counts_.alive(), 0);
  EXPECT_EQ(this->counts_.runs, 0);
}

TYPED_TEST(TaskTest, MovingHandsTheCallableOver) {
  Task first{TypeParam(this->counts_)};
  Task second(std::move(first));
  EXPECT_FALSE(first);  // NOLINT(bugprone-use-after-move): what is left is promised to be empty
  EXPECT_TRUE(second);
  EXPECT_EQ(this->counts_.alive(), 1);
  second();
  EXPECT_EQ(this->counts_.runs, 1);
}

TYPED_TEST(TaskTest, AssigningDestroysTheCallableBefore) {
  Counts before;
  Task task{TypeParam(before)};
  task = Task{TypeParam(this->counts_)};
  EXPECT_EQ(before.alive(), 0);
  EXPECT_EQ(this->counts_.alive(), 1);
  task();
  EXPECT_EQ(before.runs, 0);
  EXPECT_EQ(this->counts_.runs, 1);
}

TYPED_TEST(TaskTest, AssigningToItselfChangesNothing) {
  Task task{TypeParam(this->counts_)};
  Task& same = task;
  task = std::move(same);
  EXPECT_EQ(this->counts_.alive(), 1);
  task();
  EXPECT_EQ(this->counts_.runs, 1);
}

TYPED_TEST(TaskTest, ResettingDestroysTheCallableOnce) {
  Task task{TypeParam(this->counts_)};
  task.reset();
  EXPECT_FALSE(task);
  EXPECT_EQ(this->counts_.alive(), 0);
  task.reset();
  EXPECT_EQ(this->counts_.alive(), 0);
}

TEST(EmptyTaskTest, HoldsNothingAndMovesAsNothing) {
  Task empty;
  EXPECT_FALSE(empty);
  Task moved(std::move(empty));
  EXPECT_FALSE(moved);
  Counts counts;
  Task task{Small(counts)};
  task = std::move(moved);
  EXPECT_FALSE(task);
  EXPECT_EQ(counts.alive(), 0);
}

TEST(TaskOwnershipTest, ACallableThatOwnsItsTaskMayDropIt) {
  // As in a queue: destroying the task releases the last reference to its own owner.
  auto task = std::make_shared<Task>();
  const std::weak_ptr<Task> watch = task;
  *task = Task([task] {});
  Task& inner = *task;
  task.reset();
  EXPECT_FALSE(watch.expired());
  Task taken = std::move(inner);
  taken.reset();
  EXPECT_TRUE(watch.expired());
}

TEST(TaskOwnershipTest, TakesCallablesThatCannotBeCopied) {
  int seen = 0;
  Task task([number = std::make_unique<int>(7), &seen] { seen = *number; });
  task();
  EXPECT_EQ(seen, 7);
}

TEST(TaskOwnershipTest, CopiesACallableThatIsNoTemporary) {
  int runs = 0;
  const auto callable = [&runs] { ++runs; };
  Task task(callable);
  task();
  callable();
  EXPECT_EQ(runs, 2);
}

struct alignas(64) Overaligned {
  bool* aligned;
  void operator()() const { *aligned = reinterpret_cast<std::uintptr_t>(this) % 64 == 0; }
};

TEST(TaskOwnershipTest, KeepsTheAlignmentOfCallablesThatNeedMore) {
  bool aligned = false;
  Task task(Overaligned{&aligned});
  Task moved(std::move(task));
  moved();
  EXPECT_TRUE(aligned);
}

}  // namespace
}  // namespace quazor
