// Diagnostics that end their process or never return.
#include "tests/misbehaving/misbehaviour.h"

#include "platform/concurrency.h"
#include "platform/platform.h"

#include <pthread.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <exception>
#include <memory>
#include <new>
#include <stdexcept>
#include <thread>
#include <vector>

namespace quazor::misbehaving {

namespace {

constexpr std::size_t kBlock = 1 << 20;

void spinForEver() {
  for (volatile bool goOn = true; goOn;) {
  }
}

void terminateOnAnotherThread() {
  std::thread([] { std::terminate(); }).join();
}

// Overflows the stack unless `wanted` is small.
std::size_t recurse(const volatile std::size_t& wanted, std::size_t depth) {
  volatile char frame[4096] = {};
  frame[depth % sizeof frame] = 1;
  return depth >= wanted ? depth : recurse(wanted, depth + 1) + static_cast<std::size_t>(frame[depth % sizeof frame]);
}

void overflowStack() {
  const volatile std::size_t wanted = SIZE_MAX;
  recurse(wanted, 0);
}

void allocateForEver() {
  std::vector<std::unique_ptr<char[]>> blocks;
  for (;;) blocks.push_back(std::make_unique<char[]>(kBlock));
}

// Exhausts the memory, down to blocks of a few bytes.
void allocateAndKeep() {
  for (std::size_t size = kBlock; size >= sizeof(void*); size /= 2) {
    while (::operator new(size, std::nothrow) != nullptr) {
    }
  }
}

void sleepWithoutSigterm() {
  ::signal(SIGTERM, SIG_IGN);
  sleepForEver();
}

void sleepWithoutSignals() {
  sigset_t all;
  sigfillset(&all);
  ::pthread_sigmask(SIG_SETMASK, &all, nullptr);
  sleepForEver();
}

void stopItself() { ::raise(SIGSTOP); }

// Acts when it is destroyed.
class LateAct {
 public:
  explicit LateAct(void (*what)()) : what_(what) {}
  LateAct(const LateAct&) = delete;
  LateAct& operator=(const LateAct&) = delete;
  ~LateAct() { what_(); }

 private:
  void (*const what_)();
};

// Calls `what` when the phone, which must have virtual time, is destroyed, after the results were sent.
void actWithThePhone(void (*what)()) {
  const auto act = std::make_shared<LateAct>(what);
  const auto queue = installedPlatform().concurrency->makeSerialQueue("Late", QualityOfService::kDefault);
  // The queue lives as long as the task, which the phone keeps.
  queue->asyncAfter(std::chrono::hours(1), [act, queue] {});
}

// Leaves a task that is due in an hour, and one that never returns if the phone has real time.
void leaveTasks() {
  const std::shared_ptr<Concurrency>& concurrency = installedPlatform().concurrency;
  const auto pending = concurrency->makeSerialQueue("Pending", QualityOfService::kDefault);
  pending->asyncAfter(std::chrono::hours(1), [pending] {});
  concurrency->makeSerialQueue("Sleeping", QualityOfService::kDefault)->async([] { sleepForEver(); });
}

}  // namespace

void addEndings() {
  addDiagnostic("CrashInSetup", {.inSetup = crash});
  addDiagnostic("CrashInRun", {.inRun = crash});
  addDiagnostic("CrashInTeardown", {.inTeardown = crash});
  addDiagnostic("CrashInDestructor", {.inDestructor = crash});
  addDiagnostic("CrashInAnalysis", {.inAnalysis = crash});
  addDiagnostic("CrashWithThePhone", {.inRun = [] { actWithThePhone(crash); }});
  addDiagnostic("LeaveWithThePhone", {.inRun = [] { actWithThePhone([] { ::_exit(7); }); }});
  addDiagnostic("HangWithThePhone", {.inRun = [] { actWithThePhone([] { sleepForEver(); }); }});
  addDiagnostic("LeaveTasks", {.inRun = leaveTasks});
  addDiagnostic("HangInSetup", {.inSetup = sleepForEver});
  addDiagnostic("HangInRun", {.inRun = sleepForEver});
  addDiagnostic("BusyLoopInRun", {.inRun = spinForEver});
  addDiagnostic("HangInTeardown", {.inTeardown = sleepForEver});
  addDiagnostic("HangInDestructor", {.inDestructor = sleepForEver});
  addDiagnostic("HangInAnalysis", {.inAnalysis = sleepForEver});
  addDiagnostic("HangWithoutSigterm", {.inRun = sleepWithoutSigterm});
  addDiagnostic("HangWithoutSignals", {.inRun = sleepWithoutSignals});
  addDiagnostic("StopItself", {.inRun = stopItself});
  addDiagnostic("Abort", {.inRun = std::abort});
  addDiagnostic("Exit", {.inRun = [] { std::exit(0); }});
  addDiagnostic("LeaveAtOnce", {.inRun = [] { ::_exit(0); }});
  addDiagnostic("LeaveWithCode", {.inAnalysis = [] { ::_exit(7); }});
  addDiagnostic("TerminateOnAnotherThread", {.inRun = terminateOnAnotherThread});
  addDiagnostic("OverflowStack", {.inRun = overflowStack});
  addDiagnostic("ThrowException", {.inRun = [] { throw std::runtime_error("the lamp is out"); }});
  addDiagnostic("ThrowNumber", {.inAnalysis = [] { throw 7; }});
  addDiagnostic("ThrowInDestructor", {.inDestructor = [] { throw std::runtime_error("too late"); }});
  addDiagnostic("AllocateForEver", {.inRun = allocateForEver});
  addDiagnostic("AllocateAndKeep", {.inRun = allocateAndKeep});
}

}  // namespace quazor::misbehaving
