#include "backends/linux/hid/hid_report_descriptor.h"

#include "base/text/input_error.h"

#include "contract/value.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

// An image sensor: input report 0x76 of 791 bytes after its ID, feature reports 0xAB and 0xAC of one byte.
const Bytes kSensor = {0x06, 0x00, 0xFF, 0x09, 0x24, 0xA1, 0x01, 0x15, 0x00, 0x26, 0xFF, 0x00, 0x75, 0x08,
                       0x85, 0x76, 0x09, 0x76, 0x96, 0x17, 0x03, 0x81, 0x02, 0x85, 0xAB, 0x09, 0xAB, 0x95,
                       0x01, 0xB1, 0x02, 0x85, 0xAC, 0x09, 0xAC, 0x95, 0x01, 0xB1, 0x02, 0xC0};

// A mouse without report IDs: three buttons, five bits of padding and two axes.
const Bytes kMouse = {0x05, 0x01, 0x09, 0x02, 0xA1, 0x01, 0x09, 0x01, 0xA1, 0x00, 0x05, 0x09, 0x19,
                      0x01, 0x29, 0x03, 0x15, 0x00, 0x25, 0x01, 0x95, 0x03, 0x75, 0x01, 0x81, 0x02,
                      0x95, 0x01, 0x75, 0x05, 0x81, 0x01, 0x05, 0x01, 0x09, 0x30, 0x09, 0x31, 0x15,
                      0x81, 0x25, 0x7F, 0x75, 0x08, 0x95, 0x02, 0x81, 0x06, 0xC0, 0xC0};

HidReportDescriptor parsed(const Bytes& bytes) { return parseHidReportDescriptor(bytes); }

// Empty if the descriptor is valid.
std::string problemOf(const Bytes& bytes) {
  return thrownText<InputError>([&] { parseHidReportDescriptor(bytes); }, "");
}

Bytes repeated(const Bytes& item, std::size_t times) {
  Bytes bytes;
  for (std::size_t i = 0; i < times; ++i) bytes.insert(bytes.end(), item.begin(), item.end());
  return bytes;
}

Bytes joined(const std::vector<Bytes>& parts) {
  Bytes bytes;
  for (const Bytes& part : parts) bytes.insert(bytes.end(), part.begin(), part.end());
  return bytes;
}

TEST(HidReportDescriptorTest, ASensorWithReportIDs) {
  const HidReportDescriptor sensor = parsed(kSensor);
  EXPECT_THAT(sensor.topLevel, ElementsAre(HidUsage{0xFF00, 0x24}));
  EXPECT_TRUE(sensor.numbered);
  EXPECT_THAT(sensor.inputReports, ElementsAre(Pair(0x76, 792U)));
  EXPECT_THAT(sensor.featureReports, ElementsAre(Pair(0xAB, 2U), Pair(0xAC, 2U)));
}

TEST(HidReportDescriptorTest, ADeviceWithoutReportIDsHasOneReport) {
  const HidReportDescriptor mouse = parsed(kMouse);
  EXPECT_THAT(mouse.topLevel, ElementsAre(HidUsage{1, 2}));
  EXPECT_FALSE(mouse.numbered);
  EXPECT_THAT(mouse.inputReports, ElementsAre(Pair(0, 3U)));
  EXPECT_THAT(mouse.featureReports, testing::IsEmpty());
}

TEST(HidReportDescriptorTest, TopLevelCollectionsAreListedInTheirOrder) {
  const Bytes both = joined({kMouse, kSensor});
  EXPECT_THAT(parsed(both).topLevel, ElementsAre(HidUsage{1, 2}, HidUsage{0xFF00, 0x24}));
  EXPECT_THAT(parsed({}).topLevel, testing::IsEmpty());
}

TEST(HidReportDescriptorTest, UsagesOfCollections) {
  const struct {
    const char* name;
    Bytes bytes;
    HidUsage usage;
  } kRows[] = {
      {"none", {0x05, 0x01, 0xA1, 0x01, 0xC0}, {0, 0}},
      {"the first of several", {0x05, 0x01, 0x09, 0x02, 0x09, 0x06, 0xA1, 0x01, 0xC0}, {1, 2}},
      {"a range", {0x05, 0x01, 0x19, 0x04, 0x29, 0x07, 0xA1, 0x01, 0xC0}, {1, 4}},
      {"two bytes", {0x06, 0x34, 0x12, 0x0A, 0x78, 0x56, 0xA1, 0x01, 0xC0}, {0x1234, 0x5678}},
      {"with its own page", {0x05, 0x01, 0x0B, 0x24, 0x00, 0x00, 0xFF, 0xA1, 0x01, 0xC0}, {0xFF00, 0x24}},
      {"a page that follows the usage", {0x05, 0x01, 0x09, 0x02, 0x05, 0x0C, 0xA1, 0x01, 0xC0}, {0x0C, 2}},
      {"a usage of the main item before", {0x05, 0x01, 0x09, 0x02, 0x91, 0x02, 0xA1, 0x01, 0xC0}, {0, 0}},
      {"a page that is pushed and popped", {0x05, 0x01, 0xA4, 0x05, 0x0C, 0xB4, 0x09, 0x02, 0xA1, 0x01, 0xC0}, {1, 2}},
      {"a long item before", {0xFE, 0x02, 0x10, 0xA1, 0xA1, 0x05, 0x01, 0x09, 0x02, 0xA1, 0x01, 0xC0}, {1, 2}},
      {"items without data", {0x05, 0x01, 0x09, 0x02, 0xA0, 0xC0}, {1, 2}},
  };
  for (const auto& row : kRows) EXPECT_THAT(parsed(row.bytes).topLevel, ElementsAre(row.usage)) << row.name;
}

TEST(HidReportDescriptorTest, FieldsOfOneReportAddUpAndBitsFillBytes) {
  const Bytes bytes = {0xA1, 0x01, 0x85, 0x01, 0x75, 0x01, 0x95, 0x07, 0x81, 0x02, 0x85, 0x02, 0x95, 0x09,
                       0x81, 0x02, 0x85, 0x01, 0x95, 0x02, 0x81, 0x02, 0x75, 0x00, 0xB1, 0x02, 0xC0};
  const HidReportDescriptor descriptor = parsed(bytes);
  EXPECT_THAT(descriptor.inputReports, ElementsAre(Pair(1, 3U), Pair(2, 3U)));
  EXPECT_THAT(descriptor.featureReports, ElementsAre(Pair(1, 1U)));
}

TEST(HidReportDescriptorTest, TheLargestReportThatFits) {
  // 16384 fields of 8 bits.
  const Bytes largest = {0xA1, 0x01, 0x75, 0x08, 0x96, 0x00, 0x40, 0x81, 0x02, 0xC0};
  EXPECT_THAT(parsed(largest).inputReports, ElementsAre(Pair(0, HidReportDescriptor::kMaxReport)));
}

TEST(HidReportDescriptorTest, DamageIsToldWithItsPlace) {
  const struct {
    const char* name;
    Bytes bytes;
    std::string problem;
  } kRows[] = {
      {"one byte of two", {0x05, 0x01, 0x26, 0xFF}, "an item is cut off, at byte 2"},
      {"no byte of four", {0x27}, "an item is cut off, at byte 0"},
      {"a long item's size", {0xFE}, "an item is cut off, at byte 0"},
      {"a long item's tag", {0xFE, 0x00}, "an item is cut off, at byte 0"},
      {"a long item's data", {0xFE, 0x02, 0x10, 0x00}, "an item is cut off, at byte 0"},
      {"no end", {0xA1, 0x01}, "a collection does not end, at byte 2"},
      {"no beginning", {0x05, 0x01, 0xC0}, "a collection ends that did not begin, at byte 2"},
      {"an ID of 0", {0x85, 0x00}, "a report ID is not from 1 to 255, at byte 0"},
      {"an ID of 256", {0x86, 0x00, 0x01}, "a report ID is not from 1 to 255, at byte 0"},
      {"a pop too many", {0xA4, 0xB4, 0xB4}, "more is popped than was pushed, at byte 2"},
      {"a report beyond the kernel's", {0x75, 0x08, 0x96, 0x01, 0x40, 0x81, 0x02}, "a report is too long, at byte 5"},
      {"a feature report beyond all",
       {0x77, 0xFF, 0xFF, 0xFF, 0xFF, 0x97, 0xFF, 0xFF, 0xFF, 0xFF, 0xB1, 0x02},
       "a report is too long, at byte 10"},
      {"too many pushes", repeated({0xA4}, 65), "more is pushed than fits, at byte 64"},
      {"too many collections", repeated({0xA1, 0x01}, 65), "collections are nested too deeply, at byte 128"},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOf(row.bytes), row.problem) << row.name;
  EXPECT_EQ(parsed(joined({repeated({0xA4}, 64), repeated({0xA1, 0x01}, 64), repeated({0xC0}, 64)})).topLevel.size(),
            1U);
}

TEST(HidReportDescriptorTest, EveryBeginningOfADescriptorIsReadOrRefused) {
  std::vector<std::size_t> read;
  for (std::size_t length = 0; length <= kSensor.size(); ++length) {
    Bytes bytes(kSensor.begin(), kSensor.begin() + static_cast<std::ptrdiff_t>(length));
    bytes.shrink_to_fit();  // makes a read past the end detectable
    if (problemOf(bytes).empty()) read.push_back(length);
  }
  EXPECT_EQ(read, (std::vector<std::size_t>{0, 3, 5, kSensor.size()}))
      << "items that are whole, outside of collections";
}

}  // namespace
}  // namespace quazor
