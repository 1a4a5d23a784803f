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

// The texts of errors of a sensor: what it sends in place of a report, and what it says to a mode that it refuses.
inline constexpr const char* kSensorFailed = "SensorErrorDomain code -536870174: The sensor does not answer.";
inline constexpr const char* kPowerRefused =
    "SimulatedHidErrorDomain code 6: Feature report 0xAB of display-sensor does not take the value 1.";
inline constexpr const char* kStreamingRefused =
    "SimulatedHidErrorDomain code 5: display-sensor has no feature report 0xAC.";

// The phone as the simulation takes it: with its sensors and its display, and nothing else. The sensors' errors must be
// those above.
Scenario scenarioOf(const sensor_oracle::Phone& phone);

struct SensorRequest {
  Dictionary parameters;                                 // of the experiment
  std::optional<sensor_oracle::Receiver> receiver = {};  // as in sensor_oracle::Request
  std::chrono::seconds watched{1};                       // of a stream alone
  sensor_oracle::Others others = {};
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
