// Run loops whose threads also wait for file descriptors.
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "platform/run_loop.h"

#include <memory>

namespace quazor {

// Every thread has a loop, the same for all services that are made here. It is made when it is first asked for and
// destroyed when the thread ends. A thread gets none when the process has no file descriptor left for it.
//
// A signal and a stop take no lock, and make a system call only when the loop's thread sleeps. The thread sleeps in
// ppoll(2), on the watched descriptors and on the one that signals wake it by; one that is woken often looks out for
// a moment before it sleeps. In every round of a run, also of one whose limit is zero, it asks for the watched
// descriptors without sleeping, so that no other source keeps it from them.
std::shared_ptr<RunLoops> makeLinuxRunLoops();

// Has a descriptor looked at by a loop, until this object goes. Where several modes or several watches are concerned,
// each watch tells for itself.
//
// Thread: the loop's, but for the destructor, which any thread may run. A descriptor that goes with its watch on
// another thread is closed when the loop's thread is awake the next time.
class DescriptorWatch {
 public:
  DescriptorWatch() = default;
  DescriptorWatch(const DescriptorWatch&) = delete;
  DescriptorWatch& operator=(const DescriptorWatch&) = delete;
  virtual ~DescriptorWatch() = default;

  // Signals the source once, as soon as the descriptor can be read, has an error or is hung up. Nothing is told after
  // that until this is called again, so a descriptor that stays ready does not keep the loop awake: the source's
  // handler calls this unless it found the descriptor dead.
  virtual void arm() = 0;
};

// Watches `descriptor`, which must be open, for `source`, which is a source of `loop`. It is not armed yet. The watch
// keeps the descriptor and not the source.
//
// Null when `loop` is not the loop that makeLinuxRunLoops() gives the calling thread: other loops cannot wait for
// descriptors. (A loop takes sources on its own thread only, so this one comparison tells them all apart.)
std::shared_ptr<DescriptorWatch> watchDescriptor(RunLoop& loop, std::shared_ptr<const FileDescriptor> descriptor,
                                                 const std::shared_ptr<RunLoopSource>& source);

}  // namespace quazor
