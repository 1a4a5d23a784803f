// The phones on which the capture of the display sensor's images is tried, and what is asked of each.
#pragma once

#include "backends/simulated/scenario/scenario.h"
#include "tests/sweeps/sensor_images_bench.h"
#include "tests/sweeps/sensor_images_oracle.h"

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

inline constexpr std::uint64_t kEndlessSeconds = 9223372037;  // more than the clock counts
inline constexpr const char* kNoPowerState = "Could not find the display power state.";
inline constexpr const char* kNotPowered = "The display is not powered.";

struct Request {
  std::uint64_t images = 2;
  std::uint64_t timeout = 1;  // seconds
  sensor_oracle::Receiver receiver = sensor_oracle::Receiver::kExperiment;
  OthersOnLoop others = {};
};

// One run on one phone.
struct Sweep {
  const char* name;
  bool succeeds;
  Scenario phone;
  Request request = {};
  std::string displayProblem = {};  // as in sensor_oracle::Known
  bool dependsOnSeed = false;       // a report is due with the end of the time
};
inline void PrintTo(const Sweep& sweep, std::ostream* out) { *out << sweep.name; }

// Every phone with what is asked of it.
const std::vector<Sweep>& sensorSweeps();

// A phone whose sensor sends so many reports.
Scenario withReports(std::uint64_t count);
// A phone whose display's entry in the registry has these properties.
Scenario withDisplay(const Dictionary& properties);
// The properties of a display's entry in the registry, with that state of its panel's power.
Dictionary published(const Value& power);

}  // namespace quazor
