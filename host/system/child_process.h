// ChildProcess: a child process in which plug-in code runs, isolated from quazor.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <signal.h>
#include <sys/types.h>

namespace quazor {

// How a process ended: by an exit code or by a signal.
struct ProcessEnd {
  bool bySignal = false;
  int number = 0;  // the exit code or the signal
};

// "exit code 3", "signal 11 (SIGSEGV)".
std::string textOf(const ProcessEnd& end);

// The signals of a supervising process: the end of its children, and requests to end. While this object lives, SIGINT,
// SIGTERM, SIGHUP and SIGCHLD are delivered through it, except those that the process was started to ignore.
//
// Thread: the one that made it, and no other thread may be there.
class WatchedSignals {
 public:
  // Throws std::system_error if a system call fails.
  WatchedSignals();
  WatchedSignals(const WatchedSignals&) = delete;
  WatchedSignals& operator=(const WatchedSignals&) = delete;
  ~WatchedSignals();

  // Readable when a signal is pending.
  int descriptor() const { return descriptor_; }
  // Reads the pending signals.
  void drain();
  // The number of requests to end: SIGINT, SIGTERM and SIGHUP.
  int requestsToEnd() const { return requestsToEnd_; }
  // Restores the original signal handling in a new child.
  void restore() const;

 private:
  sigset_t before_{};
  struct sigaction childrenBefore_ {};
  int descriptor_ = -1;
  int requestsToEnd_ = 0;
};

// A child in its own session, without a terminal. It inherits only the descriptor of its connection; its standard input
// is empty, and its standard output and standard error go to outputDescriptor(). The process that makes one is not
// dumpable from then on.
//
// Thread: the one that made it, and no other thread may be there when it is made.
class ChildProcess {
 public:
  // The name of a process (proc(5), /proc/PID/comm) that restores the hardware after a child, and is given time for it.
  using IsCleanupProcess = bool (*)(std::string_view name);

  // Calls `body` in the child with the descriptor of its end of the connection. The child exits when `body` returns, or
  // aborts with SIGABRT if it throws. `memory` limits the child's address space in bytes; nothing means no new limit.
  // Throws std::system_error if the process cannot be created.
  ChildProcess(const WatchedSignals& signals, const std::function<void(int connection)>& body,
               std::optional<std::uint64_t> memory, IsCleanupProcess isCleanupProcess = nullptr);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  // Kills the child, its group and its remaining descendants, and waits for them with a timeout.
  ~ChildProcess();

  pid_t id() const { return id_; }
  // Both are read without blocking.
  int connectionDescriptor() const { return connection_; }
  int outputDescriptor() const { return output_; }

  // How the child ended, or nothing if it has not. Does not block.
  const std::optional<ProcessEnd>& end();

  // Reaps the descendants of the child that have ended and whose parents have ended before. Until then each takes up a
  // process ID of the user.
  void reapOrphans() const;

  // Sends the signal to the child and its whole group, and continues them if they were stopped.
  void signalGroup(int signal) const;

 private:
  const IsCleanupProcess isCleanupProcess_;
  pid_t id_ = -1;
  int connection_ = -1;
  int output_ = -1;
  std::optional<ProcessEnd> end_;
  std::vector<pid_t> others_;  // children that this process already had
};

}  // namespace quazor
