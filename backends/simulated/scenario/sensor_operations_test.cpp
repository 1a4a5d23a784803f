#include "backends/simulated/scenario/sensor_operations.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(SensorOperationsTest, ReportsAreNamedByTheirIDInHexadecimal) {
  EXPECT_EQ(hidReportName(0x00), "0x00");
  EXPECT_EQ(hidReportName(0x0F), "0x0F");
  EXPECT_EQ(hidReportName(0x76), "0x76");
  EXPECT_EQ(hidReportName(0xAB), "0xAB");
  EXPECT_EQ(hidReportName(0xFF), "0xFF");
}

}  // namespace
}  // namespace quazor
