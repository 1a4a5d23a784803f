// A simulated phone to capture the display sensor's images on, and all that can be seen of such a run.
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

// What others do with the loop of the run.
struct OthersOnLoop {
  std::optional<std::chrono::nanoseconds> source = {};  // another source, signalled before the run, is handled so long
  std::optional<std::chrono::nanoseconds> stop = {};    // when the loop is stopped
};

struct SensorRequest {
  Dictionary parameters;  // of the experiment
  sensor_oracle::Receiver receiver = sensor_oracle::Receiver::kExperiment;
  std::chrono::seconds watched{1};  // a stream alone
  OthersOnLoop others = {};
  std::chrono::nanoseconds period{50'000'000};  // of the sensor's reports
};

struct SensorRun {
  // Every call on the platform as it returned, "at" the phone's time in nanoseconds, and every log line; what is done
  // with the loop, and what the loop's run ended in; then
  //   set up | not set up, and after a setup: returned a result | returned nothing
  //   opened | not opened, and after all of a stream: closed
  //   raised MESSAGE | never returned: MESSAGE
  // each with the place for an error,
  //   error untouched | error emptied | error (as errorChain()) | no place for an error
  // and behind a result all that it holds. At the end
  //   ended at TIME
  // and, when each of the faults has happened just once,
  //   left on the loop: N sources, N observers
  //   probe: ...
  // before and after the experiment or stream is let go: the next report that the sensor sends when the bench opens it.
  std::string told;
  std::size_t calls = 0;  // that returned
  std::chrono::nanoseconds ended{0};
  std::vector<std::uint64_t> fired;  // how often each of the faults happened
};

// Runs a new experiment, or a stream alone, on a new phone in virtual time.
SensorRun runSensor(const Scenario& scenario, const SensorRequest& request, const std::vector<Fault>& faults,
                    ErrorPlace place, std::uint64_t seed);

}  // namespace quazor
