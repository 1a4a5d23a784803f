#include "backends/faults/hid_report_name.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(HidReportName, IsTheIDInHexadecimal) {
  EXPECT_EQ(hidReportName(0x00), "0x00");
  EXPECT_EQ(hidReportName(0x0F), "0x0F");
  EXPECT_EQ(hidReportName(0x76), "0x76");
  EXPECT_EQ(hidReportName(0xAB), "0xAB");
  EXPECT_EQ(hidReportName(0xFF), "0xFF");
}

TEST(HidReportName, IsReadOnlyAsItIsWritten) {
  EXPECT_EQ(hidReportNamed("0xAB"), 0xAB);
  EXPECT_EQ(hidReportNamed("0x00"), 0);
  for (const char* text : {"", "0x", "0xA", "0xab", "0xABC", "AB", "0XAB"}) {
    EXPECT_EQ(hidReportNamed(text), std::nullopt) << text;
  }
}

}  // namespace
}  // namespace quazor
