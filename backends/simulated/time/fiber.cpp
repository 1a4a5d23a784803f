#include "backends/simulated/time/fiber.h"

#include <cxxabi.h>
#include <sys/mman.h>

#include <cstring>
#include <new>
#include <utility>

#ifdef QUAZOR_ADDRESS_SANITIZER
#include <sanitizer/asan_interface.h>
#include <sanitizer/common_interface_defs.h>
#endif
#ifdef QUAZOR_THREAD_SANITIZER
#include <sanitizer/tsan_interface.h>
#endif

namespace quazor {
namespace {

constexpr std::size_t kGuardSize = std::size_t{64} * 1024;  // a multiple of every page size in use
constexpr std::size_t kStackSize = std::size_t{512} * 1024;

thread_local Fiber* entering = nullptr;  // makecontext() passes only integers to the entry function

// Calls of the sanitizers; empty in other builds.
void beginSwitch([[maybe_unused]] void** fakeStack, [[maybe_unused]] const void* stack,
                 [[maybe_unused]] std::size_t size, [[maybe_unused]] void* handle) {
#ifdef QUAZOR_ADDRESS_SANITIZER
  __sanitizer_start_switch_fiber(fakeStack, stack, size);
#endif
#ifdef QUAZOR_THREAD_SANITIZER
  __tsan_switch_to_fiber(handle, 0);
#endif
}

void endSwitch([[maybe_unused]] void* fakeStack, [[maybe_unused]] const void** fromStack,
               [[maybe_unused]] std::size_t* fromSize) {
#ifdef QUAZOR_ADDRESS_SANITIZER
  __sanitizer_finish_switch_fiber(fakeStack, fromStack, fromSize);
#endif
}

void* currentHandle() {
#ifdef QUAZOR_THREAD_SANITIZER
  return __tsan_get_current_fiber();
#else
  return nullptr;
#endif
}

void* newHandle() {
#ifdef QUAZOR_THREAD_SANITIZER
  return __tsan_create_fiber(0);
#else
  return nullptr;
#endif
}

void forget([[maybe_unused]] void* handle, [[maybe_unused]] std::byte* memory) {
#ifdef QUAZOR_THREAD_SANITIZER
  __tsan_destroy_fiber(handle);
#endif
#ifdef QUAZOR_ADDRESS_SANITIZER
  __asan_unpoison_memory_region(memory, kGuardSize + kStackSize);
#endif
}

}  // namespace

Fiber::Fiber(std::function<void()> body) : body_(std::move(body)) {
  void* memory = mmap(nullptr, kGuardSize + kStackSize, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::bad_alloc();
  memory_ = static_cast<std::byte*>(memory);
  mprotect(memory_, kGuardSize, PROT_NONE);  // a stack overflow ends the program instead of corrupting its memory
  ownHandle_ = newHandle();
  getcontext(&own_);
  own_.uc_stack.ss_sp = memory_ + kGuardSize;
  own_.uc_stack.ss_size = kStackSize;
  own_.uc_link = nullptr;
  makecontext(&own_, &Fiber::enter, 0);
}

Fiber::~Fiber() {
  forget(ownHandle_, memory_);
  munmap(memory_, kGuardSize + kStackSize);
}

void Fiber::resume() {
  const ExceptionState resumersExceptions = exchangeExceptionState(exceptions_);
  entering = this;
  resumerHandle_ = currentHandle();
  void* fakeStack = nullptr;
  beginSwitch(&fakeStack, memory_ + kGuardSize, kStackSize, ownHandle_);
  swapcontext(&resumer_, &own_);
  endSwitch(fakeStack, nullptr, nullptr);
  exceptions_ = exchangeExceptionState(resumersExceptions);
}

void Fiber::suspend() {
  beginSwitch(&ownFakeStack_, resumerStack_, resumerStackSize_, resumerHandle_);
  swapcontext(&own_, &resumer_);
  endSwitch(ownFakeStack_, &resumerStack_, &resumerStackSize_);
}

void Fiber::enter() { entering->run(); }

void Fiber::run() {
  endSwitch(nullptr, &resumerStack_, &resumerStackSize_);
  for (;;) {
    body_();
    suspend();
  }
}

// The layout of the Itanium C++ ABI, 2.2.2 "Caught exception stack".
Fiber::ExceptionState Fiber::exchangeExceptionState(const ExceptionState& state) {
  void* globals = abi::__cxa_get_globals();
  ExceptionState previous;
  std::memcpy(&previous, globals, sizeof(previous));
  std::memcpy(globals, &state, sizeof(state));
  return previous;
}

}  // namespace quazor
