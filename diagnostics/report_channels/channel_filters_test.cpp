#include "diagnostics/report_channels/channel_filters.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

struct FilterCase {
  const char* name;
  std::string group;
  std::string subGroup;
  bool inPresenceReport;
  bool inFaultReport;
};

class ChannelFilters : public testing::TestWithParam<FilterCase> {};

TEST_P(ChannelFilters, KeepTheirOwnChannels) {
  const FilterCase& row = GetParam();
  const ReportChannelDescription channel{row.group, row.subGroup, "Number Fenk NTC"};
  EXPECT_EQ(isInPresenceReport(channel), row.inPresenceReport);
  EXPECT_EQ(isInFaultReport(channel), row.inFaultReport);
}

INSTANTIATE_TEST_SUITE_P(
    Channels, ChannelFilters,
    testing::Values(
        FilterCase{"TheDriversOwnEvents", "K42ISP", "K42ISP Events", true, true},
        FilterCase{"ASubgroupThatGoesOnIsForPresenceOnly", "K42ISP", "K42ISP Events (front)", true, false},
        FilterCase{"ASubgroupThatStartsEarlierIsForPresenceOnly", "K42ISP", "All K42ISP Events", true, false},
        FilterCase{"ASubgroupWithASpaceBehindIsForPresenceOnly", "K42ISP", "K42ISP Events ", true, false},
        FilterCase{"AGroupOfAnotherNameIsForFaultsOnly", "Camera", "K42ISP Events", false, true},
        FilterCase{"AGroupWithoutANameIsForFaultsOnly", "", "K42ISP Events", false, true},
        FilterCase{"AGroupOfAnotherCaseIsForFaultsOnly", "k42isp", "K42ISP Events", false, true},
        FilterCase{"AGroupNameCutShortIsForFaultsOnly", "K42IS", "K42ISP Events", false, true},
        FilterCase{"AGroupThatGoesOnIsForBoth", "K42ISP0", "K42ISP Events", true, true},
        FilterCase{"AGroupThatStartsEarlierIsForBoth", "Driver of K42ISP", "K42ISP Events", true, true},
        FilterCase{"BothNamesContainedIsForPresenceOnly", "xK42ISPx", "xK42ISP Eventsx", true, false},
        FilterCase{"ASubgroupOfAnotherNameIsForNone", "K42ISP", "K42ISP Power", false, false},
        FilterCase{"ASubgroupOfAnotherCaseIsForNone", "K42ISP", "K42ISP events", false, false},
        FilterCase{"ASubgroupCutShortIsForNone", "K42ISP", "K42ISP Event", false, false},
        FilterCase{"ASubgroupWithoutASpaceIsForNone", "K42ISP", "K42ISPEvents", false, false},
        FilterCase{"ASubgroupWithoutANameIsForNone", "K42ISP", "", false, false},
        FilterCase{"GroupAndSubgroupExchangedIsForNone", "K42ISP Events", "K42ISP", false, false},
        FilterCase{"ASubgroupThatGoesOnInAnotherGroupIsForNone", "Camera", "K42ISP Events (front)", false, false},
        FilterCase{"NoNamesAtAllIsForNone", "", "", false, false}),
    [](const testing::TestParamInfo<FilterCase>& row) { return std::string(row.param.name); });

TEST(ChannelFiltersOfNames, DoNotLookAtTheChannelsOwnName) {
  const ReportChannelDescription channel{"Camera", "Power", "K42ISP K42ISP Events"};
  EXPECT_FALSE(isInPresenceReport(channel));
  EXPECT_FALSE(isInFaultReport(channel));
}

}  // namespace
}  // namespace quazor
