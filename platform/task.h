// Task: a callable for a queue.
#pragma once

#include "contract/contract.h"

#include <concepts>
#include <cstddef>
#include <new>
#include <type_traits>
#include <utility>

namespace QUAZOR_CONTRACT {

// A move-only callable without arguments or result. Callables of at most kInlineSize bytes that have a nothrow move and
// need no stricter alignment than a pointer are stored inline, so that posting them does not allocate; others are
// stored on the heap.
//
// The callable is destroyed with the Task that holds it.
// Thread: one at a time.
class Task {
 public:
  static constexpr std::size_t kInlineSize = 48;
  static constexpr std::size_t kInlineAlignment = alignof(void*);

  Task() = default;
  template <class F>
  requires(!std::same_as<std::remove_cvref_t<F>, Task> && std::invocable<std::remove_cvref_t<F>&>) Task(F&& callable) {
    using Callable = std::remove_cvref_t<F>;
    if constexpr (fitsInline<Callable>()) {
      ::new (static_cast<void*>(storage_)) Callable(std::forward<F>(callable));
      operations_ = &kInlineOperations<Callable>;
    } else {
      ::new (static_cast<void*>(storage_)) Callable*(new Callable(std::forward<F>(callable)));
      operations_ = &kHeapOperations<Callable>;
    }
  }
  Task(Task&& other) noexcept { take(other); }
  Task& operator=(Task&& other) noexcept {
    if (this != &other) {
      reset();
      take(other);
    }
    return *this;
  }
  Task(const Task&) = delete;
  Task& operator=(const Task&) = delete;
  ~Task() { reset(); }

  explicit operator bool() const { return operations_ != nullptr; }

  // Runs the callable. REQUIRES: this Task has one.
  void operator()() { operations_->run(storage_); }

  // Destroys the callable, if there is one.
  void reset() {
    if (operations_ == nullptr) return;
    const Operations* operations = std::exchange(operations_, nullptr);
    operations->destroy(storage_);
  }

 private:
  struct Operations {
    void (*run)(void* storage);
    void (*move)(void* from, void* to) noexcept;  // constructs at `to` and destroys at `from`
    void (*destroy)(void* storage) noexcept;
  };

  template <class F>
  static constexpr bool fitsInline() {
    return sizeof(F) <= kInlineSize && alignof(F) <= kInlineAlignment && std::is_nothrow_move_constructible_v<F>;
  }

  template <class F>
  static constexpr Operations kInlineOperations{[](void* storage) { (*static_cast<F*>(storage))(); },
                                                [](void* from, void* to) noexcept {
                                                  ::new (to) F(std::move(*static_cast<F*>(from)));
                                                  static_cast<F*>(from)->~F();
                                                },
                                                [](void* storage) noexcept { static_cast<F*>(storage)->~F(); }};

  template <class F>
  static constexpr Operations kHeapOperations{
      [](void* storage) { (**static_cast<F**>(storage))(); },
      [](void* from, void* to) noexcept { ::new (to) F*(*static_cast<F**>(from)); },
      [](void* storage) noexcept { delete *static_cast<F**>(storage); }};

  void take(Task& other) noexcept {
    operations_ = std::exchange(other.operations_, nullptr);
    if (operations_ != nullptr) operations_->move(other.storage_, storage_);
  }

  alignas(kInlineAlignment) std::byte storage_[kInlineSize];
  const Operations* operations_ = nullptr;
};

}  // namespace QUAZOR_CONTRACT
