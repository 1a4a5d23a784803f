// The self-test: checks that the diagnostics find the faults of a phone and raise no false alarms.
#pragma once

#include "host/command/detection.h"
#include "host/device/phone.h"
#include "host/model/diagnostic_record.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// The outcome of the runs of one diagnostic or experiment on one phone.
struct SelftestRow {
  std::string scenario;
  ExpectedOutcome expected;
  std::uint64_t runs = 0;
  std::uint64_t asExpected = 0;
  std::uint64_t passes = 0;                // runs with the verdict pass
  std::string difference;                  // of the first run that did not end as expected
  std::vector<std::uint64_t> faultsFired;  // per fault of the phone, in all runs together
  bool isInherited = false;                // the phone's own file does not say what is expected
  bool concernsFault = false;  // the run must not pass, or finds a fault of the phone, or is said to pass despite it
  std::uint64_t foundByDefault = 0;              // runs that do not pass, with the limits of the profile
  std::optional<std::uint64_t> foundByStrict{};  // nothing if the profile is not installed
  nlohmann::ordered_json outcome{};              // of the first run that did not end as expected, as in "expect"
};

enum class SelftestVerdict {
  kPassed,      // the phone has no fault for this diagnostic, and every run passed
  kDetected,    // the fault was found
  kMissed,      // the phone has a fault, and a run passed
  kFalseAlarm,  // the phone has no fault, and a run did not pass
  kNotSaid,     // the phone's own file says nothing, its base says that it passes, and a run did not pass
  kDifferent,   // found, but not with the expected outcome
  kInvalid,     // a fault of the phone never fired, so the runs show nothing
};

std::string_view nameOf(SelftestVerdict verdict);

// A user-readable difference between the outcome and the expected one; empty if there is none.
std::string differenceOf(const ExpectedOutcome& expected, const DiagnosticRecord& record);

// The outcome as an entry of "expect" that expects it.
nlohmann::ordered_json expectationOf(const ExpectedOutcome& expected, const DiagnosticRecord& record);

// The faults of a phone are counted over all of its rows.
std::vector<SelftestVerdict> verdictsOf(const std::vector<SelftestRow>& rows);

// True if every row is kPassed or kDetected.
bool allPassed(const std::vector<SelftestVerdict>& verdicts);

// A phone that was not run: refused, because its file has a mistake, or not judged, because it only expects something
// of what is not loaded.
struct RefusedPhone {
  std::string name;
  std::string reason;
};

// A limit of a profile that no result of any phone was compared with.
struct UnusedLimit {
  std::string profile;  // "default" or "strict"
  std::string problem;  // a clause with the limit, its source and the reason
};

struct SelftestOutcome {
  std::vector<SelftestRow> rows;
  std::vector<PhoneDetection> phones;
  std::uint64_t seeds = 0;
  std::size_t wanted = 0;  // the number of phones to run, which is greater than that of `phones` after an interrupt
  std::vector<RefusedPhone> refused;  // not counted in `wanted`
  std::vector<UnusedLimit> unusedLimits{};
  std::vector<RefusedPhone> notJudged{};  // nor counted in `wanted`

  bool isComplete() const { return phones.size() == wanted; }
};

// Prints the matrix of detection, the rows that did not end as expected, per diagnostic the number of detected faults
// and of false alarms, and the totals.
void printSelftest(std::ostream& out, const SelftestOutcome& outcome);
nlohmann::ordered_json selftestDocument(const SelftestOutcome& outcome);

}  // namespace quazor
