// Fiber: a flow of execution with a stack of its own.
#pragma once

#include <ucontext.h>

#include <cstddef>
#include <functional>

namespace quazor {

// Runs a body on its own stack, so that the body can stop in the middle and go on later while others run meanwhile.
// A resumed fiber runs on the resumer's thread until it suspends itself or its body returns; then resume() returns.
//
// Built on the context functions of POSIX.1-2001. Sanitizers are told of every switch, and each fiber has its own
// state of exception handling, so that it may suspend in a handler.
//
// Thread: one for all calls of a fiber.
class Fiber final {
 public:
  // Nothing runs before the first resume(). `body` must not throw; when it has returned, the next resume() begins it
  // anew. Throws std::bad_alloc when there is no memory for the stack.
  explicit Fiber(std::function<void()> body);
  Fiber(const Fiber&) = delete;
  Fiber& operator=(const Fiber&) = delete;
  // REQUIRES: the body is not suspended in its middle; what is on its stack would never be destroyed.
  ~Fiber();

  // REQUIRES: called from outside the fiber.
  void resume();
  // Back to the resumer. REQUIRES: called by the body.
  void suspend();

 private:
  // What the C++ runtime keeps for each flow: the exceptions in its handlers, and how many are on their way.
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

  // For the sanitizers.
  void* ownFakeStack_ = nullptr;
  const void* resumerStack_ = nullptr;
  std::size_t resumerStackSize_ = 0;
  void* ownHandle_ = nullptr;
  void* resumerHandle_ = nullptr;
};

}  // namespace quazor
