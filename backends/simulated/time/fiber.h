// Fiber: a coroutine with its own stack.
#pragma once

#include <ucontext.h>

#include <cstddef>
#include <functional>

namespace quazor {

// Runs a body on its own stack; the body can suspend in the middle and continue later. A resumed fiber runs on the
// resumer's thread until it suspends or its body returns; then resume() returns.
//
// Uses the context functions of POSIX.1-2001. Informs the sanitizers of every switch, and gives each fiber its own
// exception state, so a fiber may suspend in an exception handler.
//
// Thread: one for all calls of a fiber.
class Fiber final {
 public:
  // Nothing runs before the first resume(). `body` must not throw; after it has returned, the next resume() starts it
  // again. Throws std::bad_alloc if there is no memory for the stack.
  explicit Fiber(std::function<void()> body);
  Fiber(const Fiber&) = delete;
  Fiber& operator=(const Fiber&) = delete;
  // REQUIRES: the body is not suspended, because the objects on its stack would never be destroyed.
  ~Fiber();

  // REQUIRES: called from outside the fiber.
  void resume();
  // Returns to the resumer. REQUIRES: called by the body.
  void suspend();

 private:
  // The C++ runtime's exception state: the caught exceptions and the number of uncaught ones.
  struct ExceptionState {
    void* caught = nullptr;
    unsigned uncaught = 0;
  };

  static void enter();
  static ExceptionState exchangeExceptionState(const ExceptionState& state);
  [[noreturn]] void run();

  std::function<void()> body_;
  std::byte* memory_ = nullptr;  // a guard page, then the stack
  ucontext_t own_{};
  ucontext_t resumer_{};
  ExceptionState exceptions_;

  // Used by the sanitizers.
  void* ownFakeStack_ = nullptr;
  const void* resumerStack_ = nullptr;
  std::size_t resumerStackSize_ = 0;
  void* ownHandle_ = nullptr;
  void* resumerHandle_ = nullptr;
};

}  // namespace quazor
