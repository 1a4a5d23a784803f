// The report facility of an intercepted platform.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "platform/report_facility.h"

#include <memory>

namespace quazor {

// Wraps the facility as interceptedPlatform() describes. Neither pointer may be null.
std::shared_ptr<ReportFacility> interceptedReports(std::shared_ptr<ReportFacility> reports,
                                                   std::shared_ptr<CallInterceptor> calls);

}  // namespace quazor
