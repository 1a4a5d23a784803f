// ThreadRunLoops: run loops of real threads, in real time.
#pragma once

#include "platform/run_loop.h"

namespace quazor {

// Every thread has a loop, the same for all objects of this class. It is made when it is first asked for and destroyed
// when the thread ends.
//
// A signal and a stop take no lock, and make a system call only when the loop's thread sleeps. A thread with nothing to
// do sleeps until it is woken or its time limit comes; one that is woken often looks out for a moment before it sleeps.
// Thread: any.
class ThreadRunLoops final : public RunLoops {
 public:
  // Never null.
  // Thread: any.
  RunLoop* currentRunLoop() override;
};

}  // namespace quazor
