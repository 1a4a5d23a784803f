// The errors of the simulated report facility.
#pragma once

#include <cstdint>
#include <string_view>

namespace quazor {

inline constexpr std::string_view SimulatedReportErrorDomain = "SimulatedReportErrorDomain";

// The codes of the domain.
enum class ReportErrorCode : std::int64_t {
  kInjected = 1,        // a fault of the scenario requested a failure and gave no error of its own
  kForeignBaseline = 2  // the baseline is a snapshot of other channels
};

}  // namespace quazor
