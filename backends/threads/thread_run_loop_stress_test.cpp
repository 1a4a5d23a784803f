#include "backends/threads/run_loop_stress_conformance.h"
#include "backends/threads/thread_run_loop.h"

namespace quazor {
namespace {

class ThreadLoops {
 public:
  RunLoop& loop() { return *ThreadRunLoops().currentRunLoop(); }
};

INSTANTIATE_TYPED_TEST_SUITE_P(Threads, RunLoopStress, ThreadLoops);

}  // namespace
}  // namespace quazor
