// What the self-test finds out about each phone: whether the limits detect its fault and, if not, why not.
#pragma once

#include "host/model/diagnostic_record.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// The seeds that were tried on a phone, and those with which a run did not pass.
struct Detection {
  std::uint64_t seeds = 0;
  std::uint64_t found = 0;

  bool isComplete() const { return found == seeds; }
};

struct PhoneDetection {
  std::string phone;
  std::string title;                  // of its scenario
  bool healthy = false;               // it is the phone that the others are compared with
  bool isExpected = false;            // its scenario expects that a run does not pass
  Detection byDefault;                // with the default profile
  std::optional<Detection> byStrict;  // with the profile strict; nothing if it is not installed
  std::vector<std::string> reasons;   // why its fault is not detected by default
};

// The totals of the matrix.
struct DetectionTotals {
  std::size_t faulty = 0;
  std::size_t healthy = 0;
  std::size_t detected = 0;  // with every seed
  std::size_t falseAlarms = 0;
  std::size_t detectedByStrict = 0;
  std::size_t falseAlarmsOfStrict = 0;
  bool hasStrict = false;

  std::size_t blindSpots() const { return faulty - detected; }
  std::size_t blindSpotsOfStrict() const { return faulty - detectedByStrict; }
};

DetectionTotals totalsOf(const std::vector<PhoneDetection>& phones);

// The differences between a run that passed on a phone with a fault and the same run on the healthy phone, each with
// the reason why it does not make the run fail; empty if the fault changes nothing.
std::vector<std::string> undetectedChanges(const DiagnosticRecord& healthy, const DiagnosticRecord& record);

// Prints a line for each phone, then those whose fault is not detected, with the reasons.
void printDetections(std::ostream& out, const std::vector<PhoneDetection>& phones);

// Prints the numbers of detected faults, blind spots and false alarms.
void printTotals(std::ostream& out, const DetectionTotals& totals);

nlohmann::ordered_json detectionsJson(const std::vector<PhoneDetection>& phones);
nlohmann::ordered_json totalsJson(const DetectionTotals& totals);

}  // namespace quazor
