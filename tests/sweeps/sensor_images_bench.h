// A simulated phone for capturing the display sensor's images, and everything that can be observed of a run.
#pragma once

#include "backends/faults/fault.h"
#include "backends/simulated/scenario/scenario.h"
#include "contract/value.h"
#include "tests/support/run_transcript.h"
#include "tests/sweeps/sensor_images_oracle.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// Other uses of the run's loop.
struct OthersOnLoop {
  // The time that the handler of another source takes; it is signalled before the run.
  std::optional<std::chrono::nanoseconds> source = {};
  std::optional<std::chrono::nanoseconds> stop = {};  // the time at which the loop is stopped
};

struct SensorRequest {
  Dictionary parameters;  // of the experiment
  sensor_oracle::Receiver receiver = sensor_oracle::Receiver::kExperiment;
  std::chrono::seconds watched{1};  // for a stream without an experiment
  OthersOnLoop others = {};
  std::chrono::nanoseconds period{50'000'000};  // of the sensor's reports
};

struct SensorRun {
  // Every call on the platform when it returns, with "at" and the phone's time in nanoseconds, and every log line; the
  // uses of
  //   the loop, and the result of the loop's run; then
  //   set up | not set up, and after a setup: returned a result | returned nothing
  //   opened | not opened, and after the end of a stream: closed
  //   raised MESSAGE | never returned: MESSAGE
  // each with the error variable,
  //   error untouched | error emptied | error (as errorChain()) | no place for an error
  // and the content of a result. At the end
  //   ended at TIME
  // and, if each of the faults has fired exactly once,
  //   left on the loop: N sources, N observers
  //   probe: ...
  // before and after the experiment or stream is released: the next report of the sensor after the bench opens it.
  std::string told;
  std::size_t calls = 0;  // the number of calls that returned
  std::chrono::nanoseconds ended{0};
  std::vector<std::uint64_t> fired;  // how often each of the faults fired
};

// Runs a new experiment, or a stream without one, on a new phone in virtual time.
SensorRun runSensor(const Scenario& scenario, const SensorRequest& request, const std::vector<Fault>& faults,
                    ErrorPlace place, std::uint64_t seed);

}  // namespace quazor
