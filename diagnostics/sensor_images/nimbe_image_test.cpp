#include "diagnostics/sensor_images/nimbe_image.h"

#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <cstddef>
#include <limits>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// The names of the properties that differ between two images.
std::string differences(const QZNimbeCorvaneImage& a, const QZNimbeCorvaneImage& b) {
  std::string names;
  if (!(a.frameID() == b.frameID())) names += "frameID ";
  if (!(a.timestampInMilliseconds() == b.timestampInMilliseconds())) names += "timestampInMilliseconds ";
  if (a.dScanI() != b.dScanI()) names += "dScanI ";
  if (a.dScanQ() != b.dScanQ()) names += "dScanQ ";
  if (!(a.tmonDataInC() == b.tmonDataInC())) names += "tmonDataInC ";
  return names;
}

// Four bytes at an offset.
struct Patch {
  std::size_t offset;
  std::array<std::uint8_t, 4> bytes;
};

NimbeImageRecord recordWith(const std::vector<Patch>& patches) {
  NimbeImageRecord record{};
  record[0] = 0x76;
  for (const Patch& patch : patches) {
    for (std::size_t i = 0; i < patch.bytes.size(); ++i) record[patch.offset + i] = patch.bytes[i];
  }
  return record;
}

TEST(NimbeCorvaneImage, OfAnEmptyRecordIsAllZeros) {
  const QZNimbeCorvaneImage image;
  EXPECT_EQ(image.frameID(), Value(0U));
  EXPECT_EQ(image.dScanI(), Array(48, Value(0)));
  EXPECT_EQ(image.dScanQ(), Array(48, Value(0)));
  EXPECT_EQ(image.tmonDataInC(), Value(0.0F));
  EXPECT_EQ(image.timestampInMilliseconds(), Value(0U));
}

TEST(NimbeCorvaneImage, ReadsUnsignedNumbersWithTheLowestByteFirst) {
  const struct {
    const char* name;
    std::array<std::uint8_t, 4> bytes;
    std::uint32_t number;
  } rows[] = {
      {"one", {0x01, 0, 0, 0}, 1},
      {"a byte each", {0x78, 0x56, 0x34, 0x12}, 0x12345678},
      {"the highest bit", {0, 0, 0, 0x80}, 0x80000000},
      {"the highest number", {0xFF, 0xFF, 0xFF, 0xFF}, 4294967295},
  };
  for (const auto& row : rows) {
    const QZNimbeCorvaneImage image(recordWith({{4, row.bytes}}));
    EXPECT_EQ(image.frameID(), Value(row.number)) << row.name;
    EXPECT_EQ(image.timestampInMilliseconds(), Value(0U)) << row.name;
    const QZNimbeCorvaneImage later(recordWith({{12, row.bytes}}));
    EXPECT_EQ(later.timestampInMilliseconds(), Value(row.number)) << row.name;
    EXPECT_EQ(later.frameID(), Value(0U)) << row.name;
  }
}

TEST(NimbeCorvaneImage, ReadsSignedSamplesInTheirOrder) {
  const QZNimbeCorvaneImage image(recordWith({{16, {0x78, 0x56, 0x34, 0x12}},
                                              {20, {0xFF, 0xFF, 0xFF, 0xFF}},
                                              {204, {0, 0, 0, 0x80}},
                                              {208, {0xFE, 0xFF, 0xFF, 0xFF}},
                                              {212, {0xFF, 0xFF, 0xFF, 0x7F}},
                                              {396, {0x07, 0, 0, 0}}}));
  Array inPhase(48, Value(0));
  inPhase[0] = 0x12345678;
  inPhase[1] = -1;
  inPhase[47] = std::numeric_limits<std::int32_t>::min();
  EXPECT_EQ(image.dScanI(), inPhase);
  Array quadrature(48, Value(0));
  quadrature[0] = -2;
  quadrature[1] = std::numeric_limits<std::int32_t>::max();
  quadrature[47] = 7;
  EXPECT_EQ(image.dScanQ(), quadrature);
}

TEST(NimbeCorvaneImage, ReadsSamplesOfAllOnesAsMinusOne) {
  NimbeImageRecord record{};
  for (std::size_t i = 16; i < 208; ++i) record[i] = 0xFF;
  const QZNimbeCorvaneImage image(record);
  EXPECT_EQ(image.dScanI(), Array(48, Value(-1)));
  EXPECT_EQ(image.dScanQ(), Array(48, Value(0)));
}

TEST(NimbeCorvaneImage, KeepsTheTemperatureAsA32BitFloat) {
  const float rows[] = {
      36.6F, 0.0F, -40.25F, std::numeric_limits<float>::infinity(), 1e-45F, std::numeric_limits<float>::lowest()};
  for (const float temperature : rows) {
    const auto bits = std::bit_cast<std::uint32_t>(temperature);
    const QZNimbeCorvaneImage image(
        recordWith({{788,
                     {static_cast<std::uint8_t>(bits), static_cast<std::uint8_t>(bits >> 8),
                      static_cast<std::uint8_t>(bits >> 16), static_cast<std::uint8_t>(bits >> 24)}}}));
    EXPECT_EQ(image.tmonDataInC(), Value(temperature)) << temperature;
  }
  const QZNimbeCorvaneImage unreadable(recordWith({{788, {0x01, 0, 0xC0, 0x7F}}}));
  ASSERT_NE(unreadable.tmonDataInC().floatNumber(), nullptr);
  EXPECT_TRUE(std::isnan(*unreadable.tmonDataInC().floatNumber()));
}

// No byte of the record belongs to two properties.
TEST(NimbeCorvaneImage, ReadsEachPropertyFromItsOwnBytes) {
  const auto meaning = [](std::size_t offset) -> std::string {
    if (offset >= 4 && offset < 8) return "frameID ";
    if (offset >= 12 && offset < 16) return "timestampInMilliseconds ";
    if (offset >= 16 && offset < 208) return "dScanI ";
    if (offset >= 208 && offset < 400) return "dScanQ ";
    return offset >= 788 ? "tmonDataInC " : "";
  };
  const QZNimbeCorvaneImage empty;
  for (std::size_t offset = 0; offset < kNimbeImageRecordSize; ++offset) {
    NimbeImageRecord record{};
    record[offset] = 0x5A;
    EXPECT_EQ(differences(QZNimbeCorvaneImage(record), empty), meaning(offset)) << "offset " << offset;
  }
}

TEST(NimbeCorvaneImage, KeepsNothingOfTheRecord) {
  NimbeImageRecord record = recordWith({{4, {1, 0, 0, 0}}, {16, {2, 0, 0, 0}}, {208, {3, 0, 0, 0}}});
  const QZNimbeCorvaneImage image(record);
  record.fill(0xFF);
  EXPECT_EQ(image.frameID(), Value(1U));
  EXPECT_EQ(image.dScanI().front(), Value(2));
  EXPECT_EQ(image.dScanQ().front(), Value(3));
}

TEST(NimbeCorvaneImage, TakesReplacementsOfItsProperties) {
  const struct {
    const char* name;
    void (*replace)(QZNimbeCorvaneImage& image);
  } rows[] = {
      {"frameID ", [](QZNimbeCorvaneImage& image) { image.setFrameID(7U); }},
      {"timestampInMilliseconds ", [](QZNimbeCorvaneImage& image) { image.setTimestampInMilliseconds(7U); }},
      {"dScanI ", [](QZNimbeCorvaneImage& image) { image.setDScanI({7}); }},
      {"dScanQ ", [](QZNimbeCorvaneImage& image) { image.setDScanQ({7}); }},
      {"tmonDataInC ", [](QZNimbeCorvaneImage& image) { image.setTmonDataInC(7.5F); }},
  };
  QZNimbeCorvaneImage all;
  for (const auto& row : rows) {
    QZNimbeCorvaneImage image;
    row.replace(image);
    row.replace(all);
    EXPECT_EQ(differences(image, QZNimbeCorvaneImage()), row.name);
  }
  EXPECT_EQ(all.frameID(), Value(7U));
  EXPECT_EQ(all.timestampInMilliseconds(), Value(7U));
  EXPECT_EQ(all.dScanI(), Array{7});
  EXPECT_EQ(all.dScanQ(), Array{7});
  EXPECT_EQ(all.tmonDataInC(), Value(7.5F));
}

}  // namespace
}  // namespace quazor
