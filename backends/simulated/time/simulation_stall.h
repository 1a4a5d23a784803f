// SimulationStall: what a wait without end is turned into.
#pragma once

#include <stdexcept>

namespace quazor {

// Thrown out of a blocking call of the simulated phone that can never return: nothing is left that could happen, or a
// fault asked for a hang. On a real phone the caller would wait for ever; in virtual time that would only hang the
// bench, so the wait ends with this instead. The text says what was waited for and at what virtual time.
class SimulationStall : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace quazor
