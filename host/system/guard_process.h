// GuardProcess: a process that ends a child and all that it started, also when this process is killed.
#pragma once

#include "host/system/descendants.h"
#include "host/system/process_end.h"

#include <functional>
#include <optional>
#include <vector>

#include <sys/types.h>

namespace quazor {

// The guard is the parent of the child and becomes that of its orphans. It runs no plug-in code, and no other process
// of the user may trace it. When this process destroys the object or ends for any reason, the guard kills all of them:
// nothing that the child does to itself prevents that, unlike PR_SET_PDEATHSIG (prctl(2)).
//
// The child can kill the guard, or leave it no descriptors. This process then becomes the parent of its processes and
// kills them itself. For that it must be a subreaper.
//
// Thread: the one that made it, and no other thread may be there when it is made.
class GuardProcess {
 public:
  // Runs `child` in the child, with all signals blocked; it must not return. Throws std::system_error if a process
  // cannot be created.
  GuardProcess(const std::function<void()>& child, IsCleanupProcess isCleanupProcess);
  GuardProcess(const GuardProcess&) = delete;
  GuardProcess& operator=(const GuardProcess&) = delete;
  // Ends the child, its group and its remaining descendants, and waits for them with a timeout.
  ~GuardProcess();

  // The child's process ID, which is not reused during the lifetime of this object.
  pid_t child() const { return child_; }
  // Readable when end() has news.
  int descriptor() const { return channel_; }
  // How the child ended, or nothing if it has not. Does not block.
  const std::optional<ProcessEnd>& end();
  // True if the guard ended before the child; the child is killed then.
  bool isLost() const { return isLost_; }

  // Sends the signal to the child and its whole group, and continues them and the guard if they were stopped.
  void signalGroup(int signal) const;

 private:
  void lose();

  const IsCleanupProcess isCleanupProcess_;
  const std::vector<pid_t> others_;  // children that this process already had
  pid_t guard_ = -1;
  pid_t child_ = -1;
  int channel_ = -1;
  bool isLost_ = false;
  std::optional<ProcessEnd> end_;
};

}  // namespace quazor
