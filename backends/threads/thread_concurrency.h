// ThreadConcurrency: serial queues and semaphores on real threads.
#pragma once

#include "platform/concurrency.h"

#include <memory>
#include <string_view>

namespace quazor {

// Stateless.
// Thread: any.
class ThreadConcurrency final : public Concurrency {
 public:
  // A ThreadSerialQueue. Ends the process if the system cannot create a thread, as for lack of memory.
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) noexcept override;
  // A ThreadSemaphore.
  std::shared_ptr<Semaphore> makeSemaphore(long count) override;
};

}  // namespace quazor
