// The self-test: do the diagnostics find what is wrong with a phone, and nothing that is not?
#pragma once

#include "host/device/phone.h"
#include "host/model/diagnostic_record.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// What the runs of one diagnostic or experiment on one phone came to.
struct SelftestRow {
  std::string scenario;
  ExpectedOutcome expected;
  std::uint64_t runs = 0;
  std::uint64_t asExpected = 0;
  std::uint64_t passes = 0;                // runs with the verdict pass
  std::string difference;                  // what the first run that was not as expected had instead
  std::vector<std::uint64_t> faultsFired;  // for each fault of the phone, in all runs together
};

enum class SelftestVerdict {
  kPassed,      // a phone without a fault for it passed, as it should
  kDetected,    // what is wrong was found, as it should be
  kMissed,      // something is wrong with the phone, and a run passed
  kFalseAlarm,  // nothing is wrong for it, and a run did not pass
  kDifferent,   // found, but not as expected
  kInvalid,     // a fault of the phone never fired: the runs show nothing
};

std::string_view nameOf(SelftestVerdict verdict);

// How the outcome differs from what was expected, for people; the empty text when it does not.
std::string differenceOf(const ExpectedOutcome& expected, const DiagnosticRecord& record);

// A phone's faults count for all of its rows together.
std::vector<SelftestVerdict> verdictsOf(const std::vector<SelftestRow>& rows);

// True when every row is kPassed or kDetected.
bool allPassed(const std::vector<SelftestVerdict>& verdicts);

// A line for every row, then, for each diagnostic, how many faults were detected and how many alarms were false.
void printSelftest(std::ostream& out, const std::vector<SelftestRow>& rows, std::uint64_t seeds);
nlohmann::ordered_json selftestDocument(const std::vector<SelftestRow>& rows, std::uint64_t seeds);

}  // namespace quazor
