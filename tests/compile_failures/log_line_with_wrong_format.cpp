// refused with: anArgumentDoesNotFitItsPlaceholder
#include "contract/log_channel.h"

void report(std::int64_t count) {
#ifdef CORRECTED
  quazor::logDebug("%@ frames", count);
#else
  quazor::logDebug("%d frames", count);
#endif
}
