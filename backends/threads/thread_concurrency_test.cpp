#include "backends/threads/thread_concurrency.h"

#include "backends/threads/concurrency_conformance.h"
#include "backends/threads/real_clock.h"

#include <gtest/gtest.h>

#include <memory>

namespace quazor {
namespace {

struct ThreadsUnderTest {
  std::shared_ptr<Concurrency> concurrency() { return std::make_shared<ThreadConcurrency>(); }
  std::shared_ptr<Clock> clock() { return std::make_shared<RealClock>(); }
};

INSTANTIATE_TYPED_TEST_SUITE_P(Threads, ConcurrencyConformance, ThreadsUnderTest);

}  // namespace
}  // namespace quazor
