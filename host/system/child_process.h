// ChildProcess: a process of quazor's own in which a plug-in's code runs, so that whatever it does ends with it.
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

// The signals of a process that watches others: its children's ends, and what asks itself to end. While it lives, none
// of SIGINT, SIGTERM, SIGHUP and SIGCHLD acts by itself, but for one that the process was started to ignore.
//
// Thread: the one that made it, and no other thread may be there.
class WatchedSignals {
 public:
  // Throws std::system_error when the system refuses what it needs.
  WatchedSignals();
  WatchedSignals(const WatchedSignals&) = delete;
  WatchedSignals& operator=(const WatchedSignals&) = delete;
  ~WatchedSignals();

  // Readable when a signal has come.
  int descriptor() const { return descriptor_; }
  // Takes what has come.
  void drain();
  // How often the process was asked to end; SIGINT and SIGTERM count, and SIGHUP.
  int requestsToEnd() const { return requestsToEnd_; }
  // For a new child: makes signals act as they did.
  void restore() const;

 private:
  sigset_t before_{};
  struct sigaction childrenBefore_ {};
  int descriptor_ = -1;
  int requestsToEnd_ = 0;
};

// A child in a process group of its own. It sees none of this process's descriptors but its connection; its standard
// input is empty, its standard output and error stream go to outputDescriptor().
//
// Thread: the one that made it, and no other thread may be there when it is made.
class ChildProcess {
 public:
  // The name of a process (proc(5), /proc/PID/comm) that restores the hardware after a child, and is given time for it.
  using IsCleanupProcess = bool (*)(std::string_view name);

  // Calls `body` in the child, with the descriptor of its end of the connection, and ends the child when it returns;
  // what it throws ends the child by SIGABRT.
  // `memory` limits the child's address space, in bytes; nothing leaves it as it is. Throws std::system_error when the
  // system refuses a process.
  ChildProcess(const WatchedSignals& signals, const std::function<void(int connection)>& body,
               std::optional<std::uint64_t> memory, IsCleanupProcess isCleanupProcess = nullptr);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  // Ends the child, its group and whatever of its descendants is left, and waits for that, but not for ever.
  ~ChildProcess();

  pid_t id() const { return id_; }
  // Both are read without blocking.
  int connectionDescriptor() const { return connection_; }
  int outputDescriptor() const { return output_; }

  // How the child ended, once it has. Does not wait.
  const std::optional<ProcessEnd>& end();

  // Sends the signal to the child and its whole group, and lets them go on if they were stopped.
  void signalGroup(int signal) const;

 private:
  const IsCleanupProcess isCleanupProcess_;
  pid_t id_ = -1;
  int connection_ = -1;
  int output_ = -1;
  std::optional<ProcessEnd> end_;
  std::vector<pid_t> others_;  // children of this process that were there before
};

}  // namespace quazor
