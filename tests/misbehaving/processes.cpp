// Diagnostics that create processes or modify their own.
#include "tests/misbehaving/misbehaviour.h"

#include "contract/log_channel.h"

#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>

namespace quazor::misbehaving {

namespace {

void forkOneThatStays() {
  if (::fork() == 0) sleepForEver();
}

// The daemon's parent has ended, and it has its own session.
void forkDaemon() {
  if (const pid_t child = ::fork(); child != 0) {
    ::waitpid(child, nullptr, 0);
    return;
  }
  ::setsid();
  if (::fork() != 0) ::_exit(0);
  ::signal(SIGTERM, SIG_IGN);
  ::signal(SIGHUP, SIG_IGN);
  sleepForEver();
}

// Both processes return to the host, the copy first.
void forkIntoHost() {
  const pid_t child = ::fork();
  if (child == 0) {
    logDefault("the copy logs");
  } else {
    ::waitpid(child, nullptr, 0);
  }
}

// Several generations of processes, created while the group is being killed; each is killed after it has created the
// next.
void forkGenerations() {
  if (::fork() != 0) return;
  for (int generation = 0; generation < 50; ++generation) {
    ::setsid();
    if (::fork() != 0) ::_exit(0);
    ::usleep(2000);
  }
  sleepForEver();
}

// Leaves the process group that the host created, so signals to the group do not reach this process.
void leaveGroupAndHang() {
  ::setpgid(0, ::getpgid(::getppid()));
  sleepForEver();
}

void becomeTrue() { ::execlp("true", "true", nullptr); }
void becomeSleep() { ::execlp("sleep", "sleep", "60", nullptr); }

void raiseLimits() {
  for (const auto resource : {RLIMIT_AS, RLIMIT_NOFILE, RLIMIT_STACK, RLIMIT_CORE}) {
    rlimit limit{};
    ::getrlimit(resource, &limit);
    limit.rlim_cur = limit.rlim_max;
    ::setrlimit(resource, &limit);
    limit = {RLIM_INFINITY, RLIM_INFINITY};
    ::setrlimit(resource, &limit);
  }
}

void changeSurroundings() {
  static_cast<void>(::chdir("/"));
  ::umask(0777);
  ::setenv("MISBEHAVED", "1", 1);
  ::signal(SIGPIPE, SIG_IGN);
  sigset_t all;
  sigfillset(&all);
  ::sigprocmask(SIG_BLOCK, &all, nullptr);
}

}  // namespace

void addProcesses() {
  addDiagnostic("ForkOneThatStays", {.inRun = forkOneThatStays});
  addDiagnostic("ForkOneThatStaysAndCrash", {.inRun = [] {
                  forkOneThatStays();
                  crash();
                }});
  addDiagnostic("ForkDaemon", {.inRun = forkDaemon});
  addDiagnostic("ForkDaemonAndHang", {.inRun = [] {
                  forkDaemon();
                  sleepForEver();
                }});
  addDiagnostic("ForkIntoHost", {.inRun = forkIntoHost});
  addDiagnostic("ForkGenerations", {.inRun = forkGenerations});
  addDiagnostic("LeaveGroupAndHang", {.inRun = leaveGroupAndHang});
  addDiagnostic("BecomeTrue", {.inRun = becomeTrue});
  addDiagnostic("BecomeSleep", {.inRun = becomeSleep});
  addDiagnostic("RaiseLimits", {.inRun = raiseLimits});
  addDiagnostic("ChangeSurroundings", {.inRun = changeSurroundings});
}

}  // namespace quazor::misbehaving
