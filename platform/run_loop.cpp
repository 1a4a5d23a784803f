#include "platform/run_loop.h"

namespace QUAZOR_CONTRACT {

RunLoopSource::~RunLoopSource() = default;
RunLoopObserver::~RunLoopObserver() = default;
RunLoop::~RunLoop() = default;
RunLoops::~RunLoops() = default;

}  // namespace QUAZOR_CONTRACT
