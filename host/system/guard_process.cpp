#include "host/system/guard_process.h"

#include "host/system/watched_signals.h"

#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <system_error>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

// The name of the guard in process lists (at most 15 characters).
constexpr const char* kName = "quazor-guard";
// How long the guard may take to end: longer than it tries to end the child.
constexpr SteadyClock::duration kMaxWait = kMaxEnding + 1s;

// The guard's messages: first that the child was created, then how it ended.
struct Message {
  int child = -1;
  int failure = 0;  // the error number if the child could not be created
  int code = 0;     // si_code and si_status of waitid(2)
  int status = 0;
};

// True if waitid(2) tells of a stop and not of an end: a process that asked this one to trace it has got a signal.
bool isTraced(const siginfo_t& info) { return info.si_code == CLD_TRAPPED; }

ProcessEnd endOf(int code, int status) { return {code != CLD_EXITED, status}; }

// What the guard does in its own process.
// Thread: the only one of the guard.
class Guard {
 public:
  Guard(int channel, IsCleanupProcess isCleanupProcess) : channel_(channel), isCleanupProcess_(isCleanupProcess) {}

  [[noreturn]] void guard(const std::function<void()>& child) {
    ::setsid();  // out of reach of the terminal and of signals to the group of this program
    ::prctl(PR_SET_NAME, kName);
    ::prctl(PR_SET_CHILD_SUBREAPER, 1);
    start(child);
    closeAllButChannel();
    watch();
    ::kill(-child_, SIGKILL);
    ::_exit(endChildren({}, isCleanupProcess_) ? EXIT_SUCCESS : EXIT_FAILURE);
  }

 private:
  void start(const std::function<void()>& child) {
    const pid_t self = ::getpid();
    child_ = ::fork();
    if (child_ == 0) {
      ::prctl(PR_SET_PDEATHSIG, SIGKILL);  // the first defence if the guard is killed
      if (::getppid() != self) ::_exit(EXIT_FAILURE);
      child();
      ::_exit(EXIT_FAILURE);
    }
    tell({child_, child_ < 0 ? errno : 0, 0, 0});
    if (child_ < 0) ::_exit(EXIT_SUCCESS);
  }

  void closeAllButChannel() const {
    if (channel_ > 0) ::syscall(SYS_close_range, 0, channel_ - 1, 0);
    ::syscall(SYS_close_range, channel_ + 1, ~0U, 0);
  }

  // Returns when the object in the other process is destroyed or that process has ended.
  void watch() {
    sigset_t ends;
    sigemptyset(&ends);
    sigaddset(&ends, SIGCHLD);
    const int children = ::signalfd(-1, &ends, SFD_CLOEXEC | SFD_NONBLOCK);
    if (children < 0) ::_exit(EXIT_FAILURE);
    for (;;) {
      reap();
      pollfd watched[] = {{channel_, POLLIN, 0}, {children, POLLIN, 0}};
      if (::poll(watched, 2, -1) < 0 && errno != EINTR) ::_exit(EXIT_FAILURE);  // the child took its descriptors away
      if (watched[0].revents != 0) return;
      signalfd_siginfo taken;
      while (::read(children, &taken, sizeof taken) == sizeof taken) {
      }
    }
  }

  // Reaps orphans that have ended; until then each takes up a process ID of the user. The child itself is not reaped,
  // so that its process ID is not reused.
  void reap() {
    for (;;) {
      siginfo_t info{};
      if (::waitid(P_ALL, 0, &info, WEXITED | WNOHANG | WNOWAIT) != 0 || info.si_pid == 0) return;
      if (isTraced(info)) {
        if (::ptrace(PTRACE_DETACH, info.si_pid, nullptr, static_cast<std::intptr_t>(info.si_status)) == 0) continue;
        return;  // it ends now, and its end is told
      }
      if (info.si_pid == child_) {
        if (!hasTold_) tell({child_, 0, info.si_code, info.si_status});
        hasTold_ = true;
        return;
      }
      ::waitpid(info.si_pid, nullptr, WNOHANG);
    }
  }

  void tell(const Message& message) const { ::send(channel_, &message, sizeof message, MSG_NOSIGNAL); }

  const int channel_;
  const IsCleanupProcess isCleanupProcess_;
  pid_t child_ = -1;
  bool hasTold_ = false;
};

// Receives a message. Returns its length, 0 at the end of the channel, or -1.
ssize_t receive(int channel, Message* message, int flags) {
  ssize_t length = -1;
  do {
    length = ::recv(channel, message, sizeof *message, flags);
  } while (length < 0 && errno == EINTR);
  return length;
}

// Reaps a process that ends now. Returns its status (waitpid(2)).
int reap(pid_t process) {
  int status = -1;
  while (::waitpid(process, &status, 0) < 0 && errno == EINTR) {
  }
  return status;
}

// Waits until the other end of the channel is closed. Returns false after a timeout.
bool waitForEndOf(int channel) {
  const WaitForChild wait;
  const SteadyClock::time_point limit = SteadyClock::now() + kMaxWait;
  for (;;) {
    Message message;
    const ssize_t length = receive(channel, &message, MSG_DONTWAIT);
    if (length == 0 || (length < 0 && errno != EAGAIN)) return true;
    if (length > 0) continue;
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(limit - SteadyClock::now());
    if (left.count() <= 0) return false;
    pollfd watched{channel, POLLIN, 0};
    ::poll(&watched, 1, static_cast<int>(left.count()));
  }
}

}  // namespace

GuardProcess::GuardProcess(const std::function<void()>& child, IsCleanupProcess isCleanupProcess)
    : isCleanupProcess_(isCleanupProcess), others_(childrenOfThisProcess()) {
  int ends[2] = {-1, -1};
  if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) {
    throw std::system_error(errno, std::generic_category(), "making a socket");
  }
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  ::sigprocmask(SIG_SETMASK, &all, &before);
  guard_ = ::fork();
  int failure = errno;
  if (guard_ == 0) {
    ::close(ends[0]);
    Guard(ends[1], isCleanupProcess).guard(child);
  }
  ::sigprocmask(SIG_SETMASK, &before, nullptr);
  ::close(ends[1]);
  channel_ = ends[0];
  Message created;
  if (guard_ > 0 && receive(channel_, &created, 0) == sizeof created) {
    child_ = created.child;
    failure = created.failure;
    if (child_ > 0) return;
  } else if (guard_ > 0) {
    failure = ECHILD;  // the guard was killed
  }
  ::close(channel_);
  if (guard_ > 0) reap(guard_);
  throw std::system_error(failure, std::generic_category(), "making a process");
}

GuardProcess::~GuardProcess() {
  bool isClean = false;
  if (!isLost_) {
    ::shutdown(channel_, SHUT_WR);
    ::kill(guard_, SIGCONT);  // the child may have stopped it
    if (!waitForEndOf(channel_)) ::kill(guard_, SIGKILL);
    const int status = reap(guard_);
    isClean = WIFEXITED(status) && WEXITSTATUS(status) == EXIT_SUCCESS;
  }
  ::close(channel_);
  if (isClean) return;
  const WaitForChild wait;
  endChildren(others_, isCleanupProcess_);
}

const std::optional<ProcessEnd>& GuardProcess::end() {
  if (end_) return end_;
  Message message;
  const ssize_t length = isLost_ ? -1 : receive(channel_, &message, MSG_DONTWAIT);
  if (length == sizeof message) {
    end_ = endOf(message.code, message.status);
  } else if (!isLost_ && (length == 0 || errno != EAGAIN)) {
    lose();
  }
  siginfo_t info{};
  if (isLost_ && ::waitid(P_PID, static_cast<id_t>(child_), &info, WEXITED | WNOHANG | WNOWAIT) == 0 &&
      info.si_pid == child_ && !isTraced(info)) {
    end_ = endOf(info.si_code, info.si_status);
  }
  return end_;
}

void GuardProcess::lose() {
  isLost_ = true;
  const WaitForChild wait;
  ::kill(guard_, SIGKILL);
  reap(guard_);  // its children are those of this process from now on
  signalGroup(SIGKILL);
}

void GuardProcess::signalGroup(int signal) const {
  if (!isLost_) ::kill(guard_, SIGCONT);
  // The child may have left its process group.
  for (const pid_t whom : {-child_, child_}) {
    ::kill(whom, signal);
    ::kill(whom, SIGCONT);
  }
}

}  // namespace quazor
