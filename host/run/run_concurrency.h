// The queues of one run.
#pragma once

#include "host/model/run_log.h"
#include "platform/concurrency.h"

#include <memory>

namespace quazor {

// Returns `concurrency` with one addition: the log lines of its queues' tasks go to `log` only, even if a task is late
// and another run has begun in this process.
std::shared_ptr<Concurrency> concurrencyOfRun(std::shared_ptr<Concurrency> concurrency,
                                              std::shared_ptr<const RunLog> log);

}  // namespace quazor
