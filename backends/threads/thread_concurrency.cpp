#include "backends/threads/thread_concurrency.h"

#include "backends/threads/thread_semaphore.h"
#include "backends/threads/thread_serial_queue.h"

namespace quazor {

std::shared_ptr<SerialQueue> ThreadConcurrency::makeSerialQueue(std::string_view label,
                                                                QualityOfService quality) noexcept {
  return std::make_shared<ThreadSerialQueue>(label, quality);
}

std::shared_ptr<Semaphore> ThreadConcurrency::makeSemaphore(long count) {
  return std::make_shared<ThreadSemaphore>(count);
}

}  // namespace quazor
