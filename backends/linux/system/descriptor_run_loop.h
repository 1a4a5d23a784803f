// Run loops whose threads also wait for file descriptors.
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "platform/run_loop.h"

#include <memory>

namespace quazor {

// Every thread has one loop, shared by all services that are created here. It is created on first use and destroyed
// when the thread ends. A thread gets none if the process has no file descriptor left for it.
//
// Signals and stops take no lock, and make a system call only if the loop's thread sleeps. The thread sleeps in
// ppoll(2), on the watched descriptors and on one that wakes it; a thread that is woken frequently spins briefly before
// it sleeps. Every round of a run, even with a limit of zero, polls the watched descriptors without blocking, so that
// other sources cannot starve them.
std::shared_ptr<RunLoops> makeLinuxRunLoops();

// Watches a descriptor on a loop during the lifetime of this object. Several watches of one descriptor, or in several
// modes, are independent.
//
// Thread: the loop's, except the destructor: any. If the destructor runs on another thread and releases the last
// reference to the descriptor, the descriptor is closed when the loop's thread next wakes.
class DescriptorWatch {
 public:
  DescriptorWatch() = default;
  DescriptorWatch(const DescriptorWatch&) = delete;
  DescriptorWatch& operator=(const DescriptorWatch&) = delete;
  virtual ~DescriptorWatch() = default;

  // Signals the source once, as soon as the descriptor is readable, has an error or is hung up. There are no further
  // signals until the next call, so a descriptor that stays ready does not keep the loop awake: the handler of the
  // source calls this again, unless the descriptor is unusable.
  virtual void arm() = 0;
};

// Watches `descriptor`, which must be open, for `source`, which must be a source of `loop`. The watch is not yet armed.
// It owns the descriptor but not the source.
//
// Returns null if `loop` is not the loop that makeLinuxRunLoops() returns on the calling thread, because other loops
// cannot wait for descriptors. (A loop accepts sources only on its own thread, so this comparison identifies all of
// them.)
std::shared_ptr<DescriptorWatch> watchDescriptor(RunLoop& loop, std::shared_ptr<const FileDescriptor> descriptor,
                                                 const std::shared_ptr<RunLoopSource>& source);

}  // namespace quazor
