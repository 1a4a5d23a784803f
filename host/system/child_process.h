// ChildProcess: a child process in which plug-in code runs, isolated from quazor.
#pragma once

#include "host/system/guard_process.h"
#include "host/system/watched_signals.h"

#include <cstdint>
#include <functional>
#include <optional>

#include <sys/types.h>

namespace quazor {

// A child in its own session, without a terminal, below a GuardProcess. It inherits only the descriptor of its
// connection; its standard input is empty, and its standard output and standard error go to outputDescriptor(). The
// process that makes one is not dumpable from then on.
//
// Thread: the one that made it, and no other thread may be there when it is made.
class ChildProcess {
 public:
  // Calls `body` in the child with the descriptor of its end of the connection. The child exits when `body` returns, or
  // aborts with SIGABRT if it throws. `memory` limits the child's address space in bytes; nothing means no new limit.
  // Throws std::system_error if the process cannot be created.
  ChildProcess(const WatchedSignals& signals, const std::function<void(int connection)>& body,
               std::optional<std::uint64_t> memory, IsCleanupProcess isCleanupProcess = nullptr);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  // Kills the child, its group and its remaining descendants, and waits for them with a timeout.
  ~ChildProcess();

  pid_t id() const { return guard_->child(); }
  // Both are read without blocking.
  int connectionDescriptor() const { return connection_; }
  int outputDescriptor() const { return output_; }
  // Readable when end() has news.
  int endDescriptor() const { return guard_->descriptor(); }

  // How the child ended, or nothing if it has not. Does not block.
  const std::optional<ProcessEnd>& end() { return guard_->end(); }
  // True if the guard was ended before the child, which is killed then.
  bool hasLostGuard() const { return guard_->isLost(); }

  // Sends the signal to the child and its whole group, and continues them if they were stopped.
  void signalGroup(int signal) const { guard_->signalGroup(signal); }

 private:
  int connection_ = -1;
  int output_ = -1;
  std::optional<GuardProcess> guard_;
};

}  // namespace quazor
