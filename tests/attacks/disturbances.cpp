// Ways that change the process and return: the diagnostic must pass all the same, and the next one must not notice.
#include "tests/attacks/ways.h"

#include "contract/lab.h"
#include "contract/log_channel.h"

#include <fcntl.h>
#include <malloc.h>
#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <stdio.h>
#include <sys/personality.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <cfenv>
#include <clocale>
#include <cstdlib>
#include <iostream>
#include <locale>
#include <new>
#include <thread>

namespace quazor::attacks {

namespace {

class CommaEverywhere : public std::numpunct<char> {
  char do_decimal_point() const override { return ','; }
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\1"; }
};

template <int kResource>
void limitToNothing() {
  const rlimit none{0, 0};
  ::setrlimit(static_cast<__rlimit_resource>(kResource), &none);
}

void stayInRemovedDirectory() {
  const std::string folder = stateFile("removed");
  ::mkdir(folder.c_str(), 0700);
  if (::chdir(folder.c_str()) != 0) std::abort();
  ::rmdir(folder.c_str());
}

template <int kSignal>
void ignoreSignal() {
  ::signal(kSignal, SIG_IGN);
}

void blockAllSignals() {
  sigset_t all;
  sigfillset(&all);
  ::pthread_sigmask(SIG_SETMASK, &all, nullptr);
}

void handleAllSignals() {
  for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, [](int) { ::_exit(0); });
}

void startTimer() {
  itimerval soon{{0, 0}, {60, 0}};
  ::setitimer(ITIMER_REAL, &soon, nullptr);
}

void fillEnvironment() {
  for (int i = 0; i < 10'000; ++i) ::setenv(("ATTACK_" + std::to_string(i)).c_str(), "x", 1);
}

void manyThreads() {
  for (int i = 0; i < 200; ++i) std::thread([] { hang(); }).detach();
}

void spinningThreads() {
  for (int i = 0; i < 4; ++i) {
    std::thread([] {
      for (volatile bool goOn = true; goOn;) {
      }
    }).detach();
  }
}

void openAllDescriptors() {
  while (::open("/dev/null", O_RDONLY | O_CLOEXEC) >= 0) {
  }
}

void registerMore() {
  QZLab::defaultLab().addDiagnosticWithName("Late", "Comes late.", "None", "None");
  QZLab::defaultLab().addExperimentWithName("WellBehavedExperiment", nullptr);
}

void logThousandTimes() {
  for (int i = 0; i < 1000; ++i) logDefault("%@", std::string(1000, 'x'));
}

void closeStreams() {
  std::cout.rdbuf(nullptr);
  std::cerr.rdbuf(nullptr);
  ::fclose(stdout);
}

thread_local struct Late {
  ~Late() { std::abort(); }
  int value = 0;
} late;

struct AtTheEnd {
  ~AtTheEnd() { std::abort(); }
};

void abortAtTheEnd() {
  static const AtTheEnd atTheEnd;
  late.value = 1;
  std::atexit([] { std::abort(); });
  std::at_quick_exit([] { std::abort(); });
}

}  // namespace

std::vector<Way> disturbances() {
  return {
      {"removedDirectory", stayInRemovedDirectory},
      {"umask", [] { ::umask(0777); }},
      {"noFiles", limitToNothing<RLIMIT_NOFILE>},
      {"noFileSize", limitToNothing<RLIMIT_FSIZE>},
      {"noProcesses", limitToNothing<RLIMIT_NPROC>},
      {"noStack", limitToNothing<RLIMIT_STACK>},
      {"noLocks", limitToNothing<RLIMIT_MEMLOCK>},
      {"noQueues", limitToNothing<RLIMIT_SIGPENDING>},
      {"niceness", [] { static_cast<void>(::nice(19)); }},
      {"idle",
       [] {
         const sched_param none{};
         ::sched_setscheduler(0, SCHED_IDLE, &none);
       }},
      {"oneProcessor",
       [] {
         cpu_set_t first;
         CPU_ZERO(&first);
         CPU_SET(0, &first);
         ::sched_setaffinity(0, sizeof first, &first);
       }},
      {"personality", [] { ::personality(ADDR_NO_RANDOMIZE); }},
      {"newSession", [] { ::setsid(); }},
      {"otherGroup", [] { ::setpgid(0, ::getpgid(::getppid())); }},
      {"notDumpable", [] { ::prctl(PR_SET_DUMPABLE, 0); }},
      {"noNewPrivileges", [] { ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0); }},
      {"noDeathSignal", [] { ::prctl(PR_SET_PDEATHSIG, 0); }},
      {"deathSignalStop", [] { ::prctl(PR_SET_PDEATHSIG, SIGSTOP); }},
      {"namedGuardItself", [] { ::prctl(PR_SET_NAME, "quazor-guard"); }},
      {"namedOddly", [] { ::prctl(PR_SET_NAME, ") R 1 1\n("); }},
      {"subreaper", [] { ::prctl(PR_SET_CHILD_SUBREAPER, 1); }},
      {"ignoreTerminate", ignoreSignal<SIGTERM>},
      {"ignoreChildren", ignoreSignal<SIGCHLD>},
      {"ignorePipes", ignoreSignal<SIGPIPE>},
      {"blockSignals", blockAllSignals},
      {"handleSignals", handleAllSignals},
      {"timer", startTimer},
      {"noEnvironment", [] { ::clearenv(); }},
      {"fullEnvironment", fillEnvironment},
      {"otherHome",
       [] {
         ::setenv("HOME", "/nowhere", 1);
         ::setenv("XDG_STATE_HOME", "/nowhere", 1);
       }},
      {"commaLocale", [] { std::locale::global(std::locale(std::locale::classic(), new CommaEverywhere)); }},
      {"cLocale", [] { std::setlocale(LC_ALL, "de_DE.UTF-8"); }},
      {"roundUp", [] { std::fesetround(FE_UPWARD); }},
      {"trapNumbers", [] { ::feenableexcept(FE_ALL_EXCEPT); }},
      {"raiseNumbers", [] { std::feraiseexcept(FE_ALL_EXCEPT); }},
      {"terminateHandler", [] { std::set_terminate([] { ::_exit(0); }); }},
      {"newHandler", [] { std::set_new_handler([] { hang(); }); }},
      {"closedStreams", closeStreams},
      {"oneArena",
       [] {
         ::mallopt(M_ARENA_MAX, 1);
         ::mallopt(M_PERTURB, 0x5A);
       }},
      {"manyThreads", manyThreads},
      {"spinningThreads", spinningThreads},
      {"allDescriptors", openAllDescriptors},
      {"registerMore", registerMore},
      {"logLongLines", logThousandTimes},
      {"abortAtTheEnd", abortAtTheEnd},
  };
}

}  // namespace quazor::attacks
