// What can be called on the simulated report facility, and its errors.
#pragma once

#include <array>
#include <cstdint>
#include <string_view>

namespace quazor {

inline constexpr std::string_view SimulatedReportErrorDomain = "SimulatedReportErrorDomain";

// The codes of the domain.
enum class ReportErrorCode : std::int64_t {
  kInjected = 1,        // a fault of the scenario asked for a failure and gave no error of its own
  kForeignBaseline = 2  // the baseline is a snapshot of other channels
};

namespace report_operation {
inline constexpr std::string_view kSimpleChannels = "ReportFacility.reportWithOnlySimpleChannels";
// Cannot fail, so faults do not reach it; observers do.
inline constexpr std::string_view kFilter = "ReportChannelSet.reportByFilteringChannels";
inline constexpr std::string_view kSnapshot = "ReportChannelSet.snapshot";
inline constexpr std::string_view kDelta = "ReportSnapshot.snapshotWithBaseline";
}  // namespace report_operation

// The operations that can fail. A phone has one facility, so faults tell its objects apart by nothing.
inline constexpr std::array kReportOperations{report_operation::kSimpleChannels, report_operation::kSnapshot,
                                              report_operation::kDelta};

}  // namespace quazor
