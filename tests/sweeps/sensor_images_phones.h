// The phones for tests of image capture, and the requests for each of them.
#pragma once

#include "backends/simulated/scenario/scenario.h"
#include "tests/sweeps/sensor_images_bench.h"
#include "tests/sweeps/sensor_images_oracle.h"

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

inline constexpr std::uint64_t kEndlessSeconds = 9223372037;  // beyond the range of the clock
inline constexpr const char* kNoPowerState = "Could not find the display power state.";
inline constexpr const char* kNotPowered = "The display is not powered.";

struct Request {
  std::uint64_t images = 2;
  std::uint64_t timeout = 1;  // seconds
  sensor_oracle::Receiver receiver = sensor_oracle::Receiver::kExperiment;
  OthersOnLoop others = {};
};

// A run on one phone.
struct Sweep {
  const char* name;
  bool succeeds;
  Scenario phone;
  Request request = {};
  std::string displayProblem = {};  // as in sensor_oracle::Known
  bool dependsOnSeed = false;       // a report is due at the timeout
};
inline void PrintTo(const Sweep& sweep, std::ostream* out) { *out << sweep.name; }

// All phones with their requests.
const std::vector<Sweep>& sensorSweeps();

// A phone whose sensor sends that many reports.
Scenario withReports(std::uint64_t count);
// A phone whose display has these properties in its registry entry.
Scenario withDisplay(const Dictionary& properties);
// The properties of a display's registry entry for a panel with that power state.
Dictionary published(const Value& power);

}  // namespace quazor
