#include "platform/concurrency.h"

namespace QUAZOR_CONTRACT {

SerialQueue::~SerialQueue() = default;
Semaphore::~Semaphore() = default;
Concurrency::~Concurrency() = default;

}  // namespace QUAZOR_CONTRACT
