#include "backends/simulated/scenario/scenario.h"

namespace quazor {

Dictionary Camera::defaultErrorCounters() {
  constexpr const char* kCounters[] = {"I2CErrorCount",  "MIPIErrorCount", "LPDPErrorCount",
                                       "UARTErrorCount", "SIFErrorCount",  "ProjectorErrorCount"};
  Dictionary counters;
  for (const char* counter : kCounters) counters.set(counter, std::uint64_t{0});
  return counters;
}

}  // namespace quazor
