#include "host/system/child_process.h"

#include "host/system/file_size_limit.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/close_range.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/signalfd.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <thread>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

// High enough to avoid descriptors that a plug-in opens, or closes by mistake.
constexpr int kConnection = 250;
constexpr SteadyClock::duration kMaxWait = 5s;
// The time limit of a cleanup process.
constexpr SteadyClock::duration kMaxTidying = 1s;

[[noreturn]] void refuse(const char* what) { throw std::system_error(errno, std::generic_category(), what); }

sigset_t watchedSet() {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, SIGCHLD);
  for (const int one : {SIGINT, SIGTERM, SIGHUP}) {
    struct sigaction action {};
    if (sigaction(one, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) continue;
    sigaddset(&set, one);
  }
  return set;
}

// A pipe from the child; reading does not block. Closes the ends that it still has.
// Thread: the one that made it.
class Pipe {
 public:
  Pipe() {
    if (::pipe2(ends_, O_CLOEXEC) != 0) refuse("making a pipe");
    ::fcntl(ends_[0], F_SETFL, O_NONBLOCK);
  }
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;
  ~Pipe() {
    if (ends_[0] >= 0) ::close(ends_[0]);
    ::close(ends_[1]);
  }

  int writeEnd() const { return ends_[1]; }
  int takeReadEnd() { return std::exchange(ends_[0], -1); }

 private:
  int ends_[2] = {-1, -1};
};

// The child processes of this process (proc(5), /proc/PID/stat, field 4).
std::vector<pid_t> childrenOfThisProcess() {
  std::vector<pid_t> children;
  const pid_t self = ::getpid();
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator("/proc", error)) {
    const std::string name = entry.path().filename();
    if (name.find_first_not_of("0123456789") != std::string::npos) continue;
    std::ifstream file(entry.path() / "stat");
    std::string line;
    std::getline(file, line);
    const std::size_t afterName = line.rfind(')');  // the name may contain any character
    int parent = 0;
    if (afterName == std::string::npos || std::sscanf(line.c_str() + afterName, ") %*c %d", &parent) != 1) continue;
    if (parent == self) children.push_back(static_cast<pid_t>(std::stol(name)));
  }
  return children;
}

// The name of a process; nothing if it has ended.
std::string nameOfProcess(pid_t process) {
  std::ifstream file("/proc/" + std::to_string(process) + "/comm");
  std::string name;
  std::getline(file, name);
  return name;
}

// The last descriptor if the limit on descriptors is lower than kConnection.
int numberOfConnection() {
  rlimit limit{};
  ::getrlimit(RLIMIT_NOFILE, &limit);
  return static_cast<int>(std::min<rlim_t>(kConnection, limit.rlim_cur - 1));
}

// What PR_GET_DUMPABLE told when it was first asked for.
int isParentDumpable() {
  static const int dumpable = ::prctl(PR_GET_DUMPABLE);
  return dumpable;
}

// Returns the descriptor of the child's end of the connection.
int becomeChild(pid_t parent, const WatchedSignals& signals, const Pipe& connection, const Pipe& output,
                std::optional<std::uint64_t> memory) {
  ::setsid();  // detaches the child from its parent's terminal
  ::prctl(PR_SET_DUMPABLE, isParentDumpable());
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (::getppid() != parent) ::_exit(EXIT_FAILURE);  // the parent ended before the call above
  const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
  ::dup2(nothing, STDIN_FILENO);
  ::dup2(output.writeEnd(), STDOUT_FILENO);
  ::dup2(output.writeEnd(), STDERR_FILENO);
  const int number = numberOfConnection();
  ::dup3(connection.writeEnd(), number, O_CLOEXEC);
  ::syscall(SYS_close_range, 3, number - 1, 0);
  ::syscall(SYS_close_range, number + 1, ~0U, 0);
  if (memory) {
    const rlimit limit{*memory, *memory};
    ::setrlimit(RLIMIT_AS, &limit);
  }
  signals.restore();
  restoreFileSizeSignal();
  return number;
}

// An exception must terminate the child: it must not propagate to callers that belong to the parent's copy.
void doWork(const std::function<void(int)>& body, int connection) noexcept { body(connection); }

}  // namespace

std::string textOf(const ProcessEnd& end) {
  const std::string number = std::to_string(end.number);
  if (!end.bySignal) return "exit code " + number;
  const char* const name = ::sigabbrev_np(end.number);
  return "signal " + number + (name == nullptr ? std::string() : " (SIG" + std::string(name) + ")");
}

WatchedSignals::WatchedSignals() {
  const sigset_t watched = watchedSet();
  descriptor_ = ::signalfd(-1, &watched, SFD_CLOEXEC | SFD_NONBLOCK);
  if (descriptor_ < 0) refuse("watching for signals");
  ::sigprocmask(SIG_BLOCK, &watched, &before_);
  // Restores the default for SIGCHLD, because a parent program may have left it ignored, and then waiting for children
  // fails.
  struct sigaction action {};
  action.sa_handler = SIG_DFL;
  ::sigaction(SIGCHLD, &action, &childrenBefore_);
  // Orphaned descendants of a child become children of this process, which kills them.
  ::prctl(PR_SET_CHILD_SUBREAPER, 1);
}

WatchedSignals::~WatchedSignals() {
  ::close(descriptor_);
  ::prctl(PR_SET_CHILD_SUBREAPER, 0);
  restore();
}

void WatchedSignals::drain() {
  signalfd_siginfo taken;
  while (::read(descriptor_, &taken, sizeof taken) == sizeof taken) {
    if (taken.ssi_signo != SIGCHLD) ++requestsToEnd_;
  }
}

void WatchedSignals::restore() const {
  ::sigaction(SIGCHLD, &childrenBefore_, nullptr);
  ::sigprocmask(SIG_SETMASK, &before_, nullptr);
}

ChildProcess::ChildProcess(const WatchedSignals& signals, const std::function<void(int)>& body,
                           std::optional<std::uint64_t> memory, IsCleanupProcess isCleanupProcess)
    : isCleanupProcess_(isCleanupProcess), others_(childrenOfThisProcess()) {
  Pipe connection;
  Pipe output;
  const pid_t parent = ::getpid();
  std::fflush(nullptr);
  // From now on other processes of the user, such as the child, may neither trace this one nor open its descriptors.
  isParentDumpable();
  ::prctl(PR_SET_DUMPABLE, 0);
  id_ = ::fork();
  if (id_ < 0) refuse("making a process");
  if (id_ == 0) {
    doWork(body, becomeChild(parent, signals, connection, output, memory));
    ::_exit(EXIT_SUCCESS);
  }
  connection_ = connection.takeReadEnd();
  output_ = output.takeReadEnd();
}

ChildProcess::~ChildProcess() {
  ::close(connection_);
  ::close(output_);
  const SteadyClock::time_point begin = SteadyClock::now();
  signalGroup(SIGKILL);
  for (;;) {
    std::vector<pid_t> left;
    for (const pid_t one : childrenOfThisProcess()) {
      if (std::find(others_.begin(), others_.end(), one) != others_.end()) continue;
      const bool isRestoring = isCleanupProcess_ != nullptr && isCleanupProcess_(nameOfProcess(one));
      if (!isRestoring || SteadyClock::now() >= begin + kMaxTidying) ::kill(one, SIGKILL);
      if (::waitpid(one, nullptr, WNOHANG) == 0) left.push_back(one);
    }
    // Killing a process can add its orphans to this process's children, so the loop ends only when no child is left.
    if (left.empty() && childrenOfThisProcess().size() <= others_.size()) return;
    if (SteadyClock::now() >= begin + kMaxWait) return;
    std::this_thread::sleep_for(1ms);
  }
}

const std::optional<ProcessEnd>& ChildProcess::end() {
  siginfo_t info{};
  // WNOWAIT keeps the zombie until the destructor reaps it, so the process ID is not reused before.
  if (!end_ && ::waitid(P_PID, static_cast<id_t>(id_), &info, WEXITED | WNOHANG | WNOWAIT) == 0 && info.si_pid == id_) {
    end_ = ProcessEnd{info.si_code != CLD_EXITED, info.si_status};
  }
  return end_;
}

void ChildProcess::reapOrphans() const {
  siginfo_t info{};
  while (::waitid(P_ALL, 0, &info, WEXITED | WNOHANG | WNOWAIT) == 0 && info.si_pid > 0 && info.si_pid != id_) {
    if (std::find(others_.begin(), others_.end(), info.si_pid) != others_.end()) return;
    ::waitpid(info.si_pid, nullptr, WNOHANG);
    info = {};
  }
}

void ChildProcess::signalGroup(int signal) const {
  // The child may have left its process group.
  for (const pid_t whom : {-id_, id_}) {
    ::kill(whom, signal);
    ::kill(whom, SIGCONT);
  }
}

}  // namespace quazor
