// Repeatability and reproducibility of a gauge: how much of the variation is the measurement's own.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// One value of the study.
struct GaugeReading {
  std::string part;   // the serial number of the phone
  std::string place;  // the station that measured it
  double value = 0;
};

// Variances, none of them negative.
struct GaugeStudy {
  std::size_t parts = 0;
  std::size_t places = 0;
  std::size_t repetitions = 0;
  double repeatability = 0;    // of the same part at the same place
  double reproducibility = 0;  // between places, with the interaction of place and part
  double gauge = 0;            // both together
  double partToPart = 0;
  double total = 0;
  double interactionF = 0;  // the F ratio of the interaction
  double share = 0;         // of the gauge's deviation in the total one, 0 to 1
};

struct GaugeResult {
  std::optional<GaugeStudy> study{};
  std::string refusal{};  // why there is none, as a sentence without its full stop
};

// The crossed study by analysis of variance with interaction. Refused unless the table is full: every part was measured
// at every place the same number of times, with at least two of each.
GaugeResult gaugeStudy(const std::vector<GaugeReading>& readings);

}  // namespace quazor
