// The queues of one run.
#pragma once

#include "host/device/frame_rings.h"
#include "host/model/run_log.h"
#include "platform/clock.h"
#include "platform/concurrency.h"

#include <memory>

namespace quazor {

// Where the tasks of queues are told, with the phone's clock.
struct TaskTrace {
  std::shared_ptr<FrameRings> rings;
  std::shared_ptr<const Clock> clock;
  WhenTraceIsFull whenFull = WhenTraceIsFull::kLose;
};

// Returns `concurrency` with two additions: the log lines of its queues' tasks go to `log` only, even if a task is late
// and another run has begun in this process; and each task that begins is told to `trace`, if it has rings.
std::shared_ptr<Concurrency> concurrencyOfRun(std::shared_ptr<Concurrency> concurrency,
                                              std::shared_ptr<const RunLog> log, TaskTrace trace = {});

}  // namespace quazor
