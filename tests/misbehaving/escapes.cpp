// Diagnostics that try to outlive the program, or that attack the process that guards theirs. When they have done so,
// they create the file named in the environment.
#include "tests/misbehaving/misbehaviour.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdlib>

namespace quazor::misbehaving {

namespace {

void forgetParent() { ::prctl(PR_SET_PDEATHSIG, 0); }

void tellDone() {
  const char* const file = std::getenv("MISBEHAVIOUR_STATE");
  if (file != nullptr) ::close(::open(file, O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
}

void closeEverything() { ::syscall(SYS_close_range, 0, ~0U, 0); }

void ignoreAllSignals() {
  sigset_t all;
  sigfillset(&all);
  ::sigprocmask(SIG_SETMASK, &all, nullptr);
  for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, SIG_IGN);
}

// Nothing connects the daemon with this process; its parent has ended.
void startDaemon() {
  const pid_t child = ::fork();
  if (child != 0) return;
  ::setsid();
  if (::fork() != 0) ::_exit(0);
  forgetParent();
  closeEverything();
  ignoreAllSignals();
  tellDone();
  sleepForEver();
}

void killGuard() { ::kill(::getppid(), SIGKILL); }

}  // namespace

void addEscapes() {
  addDiagnostic("ForgetParent", {.inRun = [] {
                  forgetParent();
                  tellDone();
                  sleepForEver();
                }});
  addDiagnostic("ForgetParentAndSignals", {.inRun = [] {
                  forgetParent();
                  ignoreAllSignals();
                  tellDone();
                  sleepForEver();
                }});
  addDiagnostic("ForgetParentAndDescriptors", {.inRun = [] {
                  forgetParent();
                  closeEverything();
                  tellDone();
                  sleepForEver();
                }});
  addDiagnostic("LeaveDaemon", {.inRun = [] {
                  startDaemon();
                  sleepForEver();
                }});
  addDiagnostic("KillGuard", {.inRun = [] {
                  killGuard();
                  sleepForEver();
                }});
  addDiagnostic("KillGuardAndFinish", {.inRun = [] {
                  forgetParent();
                  startDaemon();
                  killGuard();
                }});
  addDiagnostic("StopGuard", {.inRun = [] {
                  ::kill(::getppid(), SIGSTOP);
                  sleepForEver();
                }});
}

}  // namespace quazor::misbehaving
