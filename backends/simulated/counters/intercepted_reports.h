// A report facility whose calls pass the phone's interceptor.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "platform/report_facility.h"

#include <memory>

namespace quazor {

// `reports`, whose calls the faults of `calls` reach and its observer is told of (report_operations.h). Neither may be
// null. Thread: any.
std::shared_ptr<ReportFacility> interceptReports(std::shared_ptr<ReportFacility> reports,
                                                 std::shared_ptr<CallInterceptor> calls);

}  // namespace quazor
