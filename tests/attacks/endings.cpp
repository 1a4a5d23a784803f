// Ways that end the process or never return.
#include "tests/attacks/ways.h"

#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <linux/seccomp.h>
#include <csetjmp>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <thread>

namespace quazor::attacks {

namespace {

void divideByZero() {
  volatile int zero = 0;
  volatile int one = 1;
  one = one / zero;
}

// Reads a page of a file that is behind its end.
void readBehindFile() {
  const int file = ::open(stateFile("short").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  const auto* const page = static_cast<volatile char*>(::mmap(nullptr, 4096, PROT_READ, MAP_SHARED, file, 0));
  static_cast<void>(page[0]);
}

void runData() {
  static unsigned char data[] = {0xC3};
  reinterpret_cast<void (*)()>(reinterpret_cast<std::uintptr_t>(data))();
}

void freeTwice() {
  void* volatile block = std::malloc(64);
  void* const same = block;
  std::free(block);
  std::free(same);
}

void unmapOwnCode() {
  const auto here = reinterpret_cast<std::uintptr_t>(&unmapOwnCode) & ~std::uintptr_t{4095};
  ::munmap(reinterpret_cast<void*>(here), 8192);
}

std::size_t recurse(std::size_t depth) {
  volatile char frame[4096] = {};
  frame[depth % sizeof frame] = 1;
  return depth == SIZE_MAX ? depth : recurse(depth + 1) + static_cast<std::size_t>(frame[0]);
}

void overflowStackOfThread() {
  std::thread([] { recurse(0); }).join();
}

std::jmp_buf place;

[[gnu::noinline]] void leavePlace() { static_cast<void>(setjmp(place)); }

// Jumps to a frame that is no more.
void jumpNowhere() {
  leavePlace();
  std::longjmp(place, 1);
}

void becomeThisProgram() { ::execl("/proc/self/exe", "quazor", "--version", nullptr); }

void becomeScriptThatSucceeds() { ::execl("/bin/sh", "sh", "-c", "exit 0", nullptr); }

void endMainThread() { ::syscall(SYS_exit, 0); }

void endMainThreadOnly() {
  std::thread([] { hang(); }).detach();
  ::syscall(SYS_exit, 0);
}

void ptraceAndStop() {
  ::ptrace(PTRACE_TRACEME);
  ::raise(SIGSTOP);
}

void ptraceAndCrash() {
  ::ptrace(PTRACE_TRACEME);
  ::raise(SIGSEGV);
}

void ptraceAndExecute() {
  ::ptrace(PTRACE_TRACEME);
  becomeScriptThatSucceeds();
}

void stopAgainAndAgain() {
  ::signal(SIGCONT, [](int) { ::raise(SIGSTOP); });
  ::raise(SIGSTOP);
  hang();
}

void lockTwice() {
  static std::mutex mutex;
  mutex.lock();
  mutex.lock();
}

void joinThreadThatHangs() {
  std::thread([] { hang(); }).join();
}

void waitForReader() {
  const std::string fifo = stateFile("fifo");
  ::unlink(fifo.c_str());
  if (::syscall(SYS_mknodat, AT_FDCWD, fifo.c_str(), 0010600, 0) == 0) ::open(fifo.c_str(), O_RDONLY | O_CLOEXEC);
}

void waitForPipe() {
  int ends[2];
  char byte = 0;
  if (::pipe(ends) == 0) static_cast<void>(::read(ends[0], &byte, 1));
}

// Its handlers of all signals return to the loop.
void spinWithHandlers() {
  for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, [](int) {});
  for (volatile bool goOn = true; goOn;) {
  }
}

void vforkAndHang() {
  if (::syscall(SYS_clone, 0x4100 | SIGCHLD, nullptr, nullptr, nullptr, nullptr) == 0) hang();
}

}  // namespace

void hang() {
  for (;;) ::pause();
}

void endBySignal(int signal) {
  struct sigaction action {};
  ::sigaction(signal, &action, nullptr);
  sigset_t none;
  sigemptyset(&none);
  ::sigprocmask(SIG_SETMASK, &none, nullptr);
  ::kill(::getpid(), signal);
}

std::vector<Way> endings() {
  return {
      {"exit0", [] { std::exit(0); }},
      {"exit3", [] { std::exit(3); }},
      {"exit255", [] { ::_exit(-1); }},
      {"atOnce0", [] { ::_exit(0); }},
      {"quick0", [] { std::quick_exit(0); }},
      {"onThread0", [] { std::thread([] { std::exit(0); }).join(); }},
      {"exitGroup", [] { ::syscall(SYS_exit_group, 0); }},
      {"endMainThread", endMainThread},
      {"endMainThreadOnly", endMainThreadOnly},
      {"pthreadExit", [] { ::pthread_exit(nullptr); }},
      {"exitInHandler",
       [] {
         std::atexit([] { std::abort(); });
         std::exit(0);
       }},
      {"abort", std::abort},
      {"trap", [] { __builtin_trap(); }},
      {"divideByZero", divideByZero},
      {"readBehindFile", readBehindFile},
      {"runData", runData},
      {"freeTwice", freeTwice},
      {"unmapOwnCode", unmapOwnCode},
      {"overflowStackOfThread", overflowStackOfThread},
      {"jumpNowhere", jumpNowhere},
      {"becomeThisProgram", becomeThisProgram},
      {"becomeScript", becomeScriptThatSucceeds},
      {"seccompStrict", [] { ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_STRICT); }},
      {"ptraceAndStop", ptraceAndStop},
      {"ptraceAndCrash", ptraceAndCrash},
      {"ptraceAndExecute", ptraceAndExecute},
      {"stopAgain", stopAgainAndAgain},
      {"stopByTerminal",
       [] {
         ::raise(SIGTSTP);
         ::raise(SIGTTIN);
         ::raise(SIGSTOP);
       }},
      {"lockTwice", lockTwice},
      {"joinHanging", joinThreadThatHangs},
      {"waitForReader", waitForReader},
      {"waitForPipe", waitForPipe},
      {"spinWithHandlers", spinWithHandlers},
      {"vforkAndHang", vforkAndHang},
  };
}

}  // namespace quazor::attacks
