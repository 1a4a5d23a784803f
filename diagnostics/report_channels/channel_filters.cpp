#include "diagnostics/report_channels/channel_filters.h"

#include <string>
#include <string_view>

namespace quazor {

namespace {

constexpr std::string_view kGroup = "K42ISP";
constexpr std::string_view kSubGroup = "K42ISP Events";

bool contains(const std::string& text, std::string_view part) { return text.find(part) != std::string::npos; }

}  // namespace

bool isInPresenceReport(const ReportChannelDescription& channel) {
  return contains(channel.groupName, kGroup) && contains(channel.subGroupName, kSubGroup);
}

bool isInFaultReport(const ReportChannelDescription& channel) { return channel.subGroupName == kSubGroup; }

}  // namespace quazor
