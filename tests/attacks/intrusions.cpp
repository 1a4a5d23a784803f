// Ways that use what belongs to the host: its descriptors, its memory and its processes.
#include "tests/attacks/ways.h"

#include "contract/log_channel.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <string_view>

namespace quazor::attacks {

namespace {

constexpr int kMaxDescriptors = 1024;

template <class Act>
void withEachDescriptor(Act&& act) {
  for (int descriptor = STDERR_FILENO + 1; descriptor < kMaxDescriptors; ++descriptor) {
    if (::fcntl(descriptor, F_GETFD) >= 0) act(descriptor);
  }
}

void overwriteEach(int with) {
  withEachDescriptor([with](int descriptor) { ::dup2(with, descriptor); });
}

void sayToEach(const std::string& line) {
  withEachDescriptor([&line](int descriptor) { static_cast<void>(::write(descriptor, line.data(), line.size())); });
}

constexpr const char* kPass = R"({"event":"diagnosticCompleted"})";

// Writes to every private or shared mapping without a file that is not the heap, the stack or a thread's: where the
// host shares memory with its children.
void overwriteSharedMemory(int byte) {
  std::ifstream maps("/proc/self/maps");
  for (std::string line; std::getline(maps, line);) {
    unsigned long begin = 0;
    unsigned long end = 0;
    char mode[5] = {};
    if (std::sscanf(line.c_str(), "%lx-%lx %4s", &begin, &end, mode) != 3 || std::string_view(mode) != "rw-s") continue;
    std::memset(reinterpret_cast<void*>(begin), byte, end - begin);
  }
}

pid_t guard() { return ::getppid(); }

void leaveDaemon() {
  ::prctl(PR_SET_PDEATHSIG, 0);
  if (::fork() != 0) return;
  ::setsid();
  ::syscall(SYS_close_range, 0, ~0U, 0);
  hang();
}

template <int kResource>
void limitGuard() {
  leaveDaemon();
  const rlimit none{0, 0};
  ::prlimit(guard(), static_cast<__rlimit_resource>(kResource), &none, nullptr);
}

// Many chains of processes, each of which only starts the next and ends.
void chains() {
  for (int i = 0; i < 8; ++i) {
    if (::fork() != 0) continue;
    ::setsid();
    for (;;) {
      const pid_t next = ::fork();
      if (next > 0) ::_exit(0);
      if (next < 0) ::usleep(1000);
    }
  }
}

void hundredChildren() {
  for (int i = 0; i < 100; ++i) {
    if (::fork() == 0) hang();
  }
}

// Processes of the guard and not of this one.
void siblings() {
  for (int i = 0; i < 5; ++i) {
    if (::syscall(SYS_clone, 0x8000 | SIGCHLD, nullptr, nullptr, nullptr, nullptr) == 0) hang();
  }
}

// Its end sends no signal.
void quietChild() {
  if (::syscall(SYS_clone, 0, nullptr, nullptr, nullptr, nullptr) == 0) {
    ::setsid();
    hang();
  }
}

void namedLikeCleanup(const char* name) {
  if (::fork() != 0) return;
  ::setsid();
  ::prctl(PR_SET_NAME, name);
  for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, SIG_IGN);
  hang();
}

// A descendant that owns the processes below it.
void otherReaper() {
  if (::fork() != 0) return;
  ::setsid();
  ::prctl(PR_SET_CHILD_SUBREAPER, 1);
  for (int i = 0; i < 5; ++i) {
    if (::fork() != 0) continue;
    if (::fork() != 0) ::_exit(0);
    hang();
  }
  hang();
}

void stopGuardAgainAndAgain() {
  const pid_t whom = guard();
  if (::fork() != 0) return;
  ::setsid();
  for (;;) {
    ::kill(whom, SIGSTOP);
    ::usleep(500);
  }
}

void signalGuard() {
  for (int signal = 1; signal < NSIG; ++signal) {
    if (signal != SIGKILL && signal != SIGSTOP) ::kill(guard(), signal);
  }
}

// A thread takes the lines on their way.
void readConnection() {
  const int reader = ::open("/proc/self/fd/250", O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  for (int i = 0; i < 1000; ++i) logDefault("line %@", i);
  char bytes[65536];
  while (::read(reader, bytes, sizeof bytes) > 0) {
  }
}

// The host's code in a copy of this process.
void forkAndGoOn() {
  if (::fork() == 0) return;
}

void forkAndLeaveToChild() {
  if (::fork() != 0) ::_exit(0);
}

}  // namespace

std::vector<Way> intrusions() {
  return {
      {"overwriteByNull", [] { overwriteEach(::open("/dev/null", O_WRONLY | O_CLOEXEC)); }},
      {"overwriteByFull", [] { overwriteEach(::open("/dev/full", O_WRONLY | O_CLOEXEC)); }},
      {"overwriteByFile",
       [] { overwriteEach(::open(stateFile("over").c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600)); }},
      {"overwriteByOutput", [] { overwriteEach(STDOUT_FILENO); }},
      {"overwriteBySocket",
       [] {
         int ends[2];
         if (::socketpair(AF_UNIX, SOCK_STREAM, 0, ends) == 0) overwriteEach(ends[0]);
       }},
      {"sayWithoutToken", [] { sayToEach(std::string(kPass) + "\n"); }},
      {"sayWithZeros", [] { sayToEach(std::string(32, '0') + kPass + "\n"); }},
      {"sayWithFs", [] { sayToEach(std::string(32, 'f') + kPass + "\n"); }},
      {"sayShortToken", [] { sayToEach(std::string(31, '0') + kPass + "\n"); }},
      {"sayNothing", [] { sayToEach("\n"); }},
      {"sayNul", [] { sayToEach(std::string("\0\n", 2)); }},
      {"sayLineBreaks", [] { sayToEach(std::string(1000, '\n')); }},
      {"sayHalfWithoutEnd", [] { sayToEach("x"); }},
      {"printEvents", [] { static_cast<void>(::write(STDOUT_FILENO, "{\"event\":\"runEnded\"}\n", 21)); }},
      {"closeOutput",
       [] {
         ::close(STDOUT_FILENO);
         ::close(STDERR_FILENO);
         ::close(STDIN_FILENO);
       }},
      {"emptyShared", [] { overwriteSharedMemory(0); }},
      {"fillShared", [] { overwriteSharedMemory(0xFF); }},
      {"fillSharedAndCrash",
       [] {
         overwriteSharedMemory(1);
         endBySignal(SIGSEGV);
       }},
      {"fillSharedAndLeave",
       [] {
         overwriteSharedMemory(1);
         ::_exit(0);
       }},
      {"limitGuardFiles", limitGuard<RLIMIT_NOFILE>},
      {"limitGuardMemory", limitGuard<RLIMIT_AS>},
      {"limitGuardTime", limitGuard<RLIMIT_CPU>},
      {"limitGuardStack", limitGuard<RLIMIT_STACK>},
      {"limitGuardProcesses", limitGuard<RLIMIT_NPROC>},
      {"limitGuardSignals", limitGuard<RLIMIT_SIGPENDING>},
      {"chains", chains},
      {"hundredChildren", hundredChildren},
      {"siblings", siblings},
      {"quietChild", quietChild},
      {"namedGuard", [] { namedLikeCleanup("quazor-guard"); }},
      {"namedProjector", [] { namedLikeCleanup("quazor-dark"); }},
      {"otherReaper", otherReaper},
      {"stopGuardAgain", stopGuardAgainAndAgain},
      {"signalGuard", signalGuard},
      {"readConnection", readConnection},
      {"forkAndGoOn", forkAndGoOn},
      {"forkAndLeaveToChild", forkAndLeaveToChild},
  };
}

}  // namespace quazor::attacks
