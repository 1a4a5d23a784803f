// SimulationStall: reports a wait that would never end.
#pragma once

#include <stdexcept>

namespace quazor {

// Thrown by a blocking call of the simulated phone that can never return: no further events are possible, or a fault
// requested a hang. On a real phone the caller would wait forever; in virtual time that would only hang the test. The
// text contains the event that was waited for and the virtual time.
class SimulationStall : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace quazor
