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
  // Why a fault is not detected, or what else differs from the healthy phone; of a false alarm, why the runs that raise
  // it do not pass.
  std::vector<std::string> reasons{};

  bool isComplete() const { return found == seeds; }
};

enum class PhoneKind {
  kHealthy,  // the phone that the others are compared with
  kFaulty,   // any other one that declares faults or differs from the healthy phone, whatever its scenario expects
  kChanged,  // it declares no faults, and its own file says that it must pass
};

struct PhoneDetection {
  std::string phone;
  std::string title;  // of its scenario
  PhoneKind kind = PhoneKind::kFaulty;
  bool isExpected = false;              // its scenario expects that a run does not pass
  Detection byDefault{};                // with the default profile
  std::optional<Detection> byStrict{};  // with the profile strict; nothing if it is not installed
  bool saysNothing = false;             // its own file expects nothing; what it expects is inherited
};

// What the limits of one profile find on all phones.
struct ProfileTotals {
  std::size_t detected = 0;       // faulty phones, with every seed
  std::size_t blindSpots = 0;     // the other faulty phones
  std::size_t falseAlarms = 0;    // on changed and healthy phones
  std::size_t changesPassed = 0;  // changed phones on which every run passed
};

// The totals of the matrix.
struct DetectionTotals {
  std::size_t faulty = 0;
  std::size_t changed = 0;
  std::size_t healthy = 0;
  ProfileTotals byDefault;
  std::optional<ProfileTotals> byStrict;
};

DetectionTotals totalsOf(const std::vector<PhoneDetection>& phones);

// The differences between a run that passed on another phone and the same run on the healthy phone, each with the
// reason why it does not make the run fail; empty if nothing differs.
std::vector<std::string> undetectedChanges(const DiagnosticRecord& healthy, const DiagnosticRecord& record);

// Why the run did not pass.
std::string alarmText(const DiagnosticRecord& record);

// Prints a line for each phone, then those with a fault that a profile does not detect, those with a false alarm, and
// those with a change that passes, with the reasons by each profile.
void printDetections(std::ostream& out, const std::vector<PhoneDetection>& phones);

// Prints the numbers of detected faults, blind spots, false alarms and changes that passed.
void printTotals(std::ostream& out, const DetectionTotals& totals);

nlohmann::ordered_json detectionsJson(const std::vector<PhoneDetection>& phones);
nlohmann::ordered_json totalsJson(const DetectionTotals& totals);

}  // namespace quazor
