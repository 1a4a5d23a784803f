#include "platform/report_facility.h"

namespace QUAZOR_CONTRACT {

ReportSnapshot::~ReportSnapshot() = default;
ReportChannelSet::~ReportChannelSet() = default;
ReportFacility::~ReportFacility() = default;

}  // namespace QUAZOR_CONTRACT
