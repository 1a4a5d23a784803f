// Diagnostics that end their process or never return.
#include "tests/misbehaving/misbehaviour.h"

#include <pthread.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

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

}  // namespace

void addEndings() {
  addDiagnostic("CrashInSetup", {.inSetup = crash});
  addDiagnostic("CrashInRun", {.inRun = crash});
  addDiagnostic("CrashInTeardown", {.inTeardown = crash});
  addDiagnostic("CrashInDestructor", {.inDestructor = crash});
  addDiagnostic("CrashInAnalysis", {.inAnalysis = crash});
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
