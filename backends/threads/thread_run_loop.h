// ThreadRunLoops: run loops of real threads in real time.
#pragma once

#include "platform/run_loop.h"

namespace quazor {

// Every thread has one loop, shared by all objects of this class. It is created on first use and destroyed when the
// thread ends.
//
// Signals and stops take no lock, and make a system call only if the loop's thread sleeps. An idle thread sleeps until
// it is woken or its time limit is reached; one that is woken frequently spins briefly before it sleeps.
// Thread: any.
class ThreadRunLoops final : public RunLoops {
 public:
  // Never null.
  // Thread: any.
  RunLoop* currentRunLoop() override;
};

}  // namespace quazor
