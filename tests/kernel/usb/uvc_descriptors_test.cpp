#include "tests/kernel/usb/uvc_descriptors.h"

#include "tests/kernel/usb/usb_host_for_tests.h"
#include "tests/kernel/usb/uvc_constants.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::SizeIs;

// The class descriptors of a subtype below the interfaces of a subclass.
std::vector<std::span<const std::uint8_t>> classParts(const Bytes& configuration, std::uint8_t subclass,
                                                      std::uint8_t subtype) {
  std::vector<std::span<const std::uint8_t>> found;
  std::uint8_t current = 0;
  for (const PartOfDescriptors& part : partsOf(configuration)) {
    if (part.type == usb::kInterface) current = part.bytes[6];
    if (part.type == uvc::kInterfaceDescriptor && current == subclass && part.subtype == subtype) {
      found.push_back(part.bytes);
    }
  }
  return found;
}

TEST(UvcDescriptorsTest, TheDeviceGroupsItsInterfaces) {
  UvcCameraConfig config;
  config.name = "Eye";
  config.serial = "17";
  const UsbDescriptors descriptors = uvcDescriptors(config);
  ASSERT_THAT(descriptors.device, SizeIs(18));
  EXPECT_EQ(descriptors.device[0], 18);
  EXPECT_EQ(descriptors.device[4], 0xEF);
  EXPECT_THAT(descriptors.strings, ElementsAre("Rig", "Eye", "17"));
}

TEST(UvcDescriptorsTest, AllLengthsAddUp) {
  for (const bool isBulk : {false, true}) {
    UvcCameraConfig config;
    config.isBulk = isBulk;
    config.functions = 2;
    const Bytes configuration = uvcDescriptors(config).configuration;
    EXPECT_EQ(littleAt(configuration, 2, 2), configuration.size());
    EXPECT_EQ(configuration[4], 4) << "interfaces";
    ASSERT_FALSE(partsOf(configuration).empty()) << "the lengths of the parts";
  }
}

// The total of a header counts from the header to the next descriptor of another type.
TEST(UvcDescriptorsTest, TheHeadersKnowTheLengthOfTheirInterfaces) {
  const Bytes configuration = uvcDescriptors(UvcCameraConfig()).configuration;
  std::vector<std::size_t> totals;
  std::vector<std::size_t> sums;
  bool isInClass = false;
  for (const PartOfDescriptors& part : partsOf(configuration)) {
    if (part.type != uvc::kInterfaceDescriptor) {
      isInClass = false;
      continue;
    }
    if (!isInClass) {
      totals.push_back(littleAt(part.bytes, part.bytes.size() == 13 ? 5 : 4, 2));
      sums.push_back(0);
      isInClass = true;
    }
    sums.back() += part.bytes.size();
  }
  EXPECT_THAT(totals, SizeIs(2));
  EXPECT_EQ(totals, sums);
}

TEST(UvcDescriptorsTest, HasTerminalsAndUnitsWithTheirControls) {
  const Bytes configuration = uvcDescriptors(UvcCameraConfig()).configuration;
  const auto camera = classParts(configuration, uvc::kVideoControl, uvc::kInputTerminal);
  ASSERT_THAT(camera, SizeIs(1));
  ASSERT_THAT(camera[0], SizeIs(18));
  EXPECT_EQ(littleAt(camera[0], 15, 3), 0x0EU) << "exposure mode, priority and time";
  const auto processing = classParts(configuration, uvc::kVideoControl, uvc::kProcessingUnit);
  ASSERT_THAT(processing, SizeIs(1));
  ASSERT_THAT(processing[0], SizeIs(12));
  EXPECT_EQ(processing[0][4], uvc::kCameraTerminal);
  EXPECT_EQ(littleAt(processing[0], 8, 2), 0x061BU);
  const auto stream = classParts(configuration, uvc::kVideoControl, uvc::kOutputTerminal);
  ASSERT_THAT(stream, SizeIs(1));
  ASSERT_THAT(stream[0], SizeIs(9));
  EXPECT_EQ(stream[0][7], uvc::kProcessing);
}

TEST(UvcDescriptorsTest, OffersItsFormatsSizesAndRates) {
  UvcCameraConfig config;
  config.formats = {{"GREY", {{160, 120, {30, 5}}}}, {"MJPG", {{640, 480, {15}}}}};
  const Bytes configuration = uvcDescriptors(config).configuration;
  const auto header = classParts(configuration, uvc::kVideoStreaming, uvc::kInputHeader);
  ASSERT_THAT(header, SizeIs(1));
  EXPECT_EQ(header[0][3], 2) << "formats";
  EXPECT_EQ(header[0].size(), 15U);
  const auto grey = classParts(configuration, uvc::kVideoStreaming, uvc::kUncompressedFormat);
  ASSERT_THAT(grey, SizeIs(1));
  ASSERT_THAT(grey[0], SizeIs(27));
  EXPECT_EQ(std::string(grey[0].begin() + 5, grey[0].begin() + 9), "Y8  ");
  EXPECT_EQ(grey[0][21], 8) << "bits per pixel";
  const auto frame = classParts(configuration, uvc::kVideoStreaming, uvc::kUncompressedFrame);
  ASSERT_THAT(frame, SizeIs(1));
  ASSERT_THAT(frame[0], SizeIs(34));
  EXPECT_EQ(littleAt(frame[0], 5, 2), 160U);
  EXPECT_EQ(littleAt(frame[0], 7, 2), 120U);
  EXPECT_EQ(littleAt(frame[0], 9, 4), 160U * 120 * 8 * 5) << "the lowest bit rate";
  EXPECT_EQ(littleAt(frame[0], 17, 4), 160U * 120);
  EXPECT_EQ(littleAt(frame[0], 21, 4), 333'333U);
  EXPECT_EQ(frame[0][25], 2);
  EXPECT_EQ(littleAt(frame[0], 30, 4), 2'000'000U);
  const auto jpeg = classParts(configuration, uvc::kVideoStreaming, uvc::kMjpegFormat);
  ASSERT_THAT(jpeg, SizeIs(1));
  EXPECT_EQ(jpeg[0].size(), 11U);
  EXPECT_EQ(jpeg[0][3], 2) << "its number";
  EXPECT_THAT(classParts(configuration, uvc::kVideoStreaming, uvc::kMjpegFrame), SizeIs(1));
}

TEST(UvcDescriptorsTest, OffersIsochronousPacketsOfSeveralSizes) {
  std::vector<std::uint64_t> sizes;
  const Bytes configuration = uvcDescriptors(UvcCameraConfig()).configuration;
  for (const PartOfDescriptors& part : partsOf(configuration)) {
    if (part.type != usb::kEndpoint) continue;
    EXPECT_EQ(part.bytes[2], 0x81);
    EXPECT_EQ(part.bytes[3] & 3, 1) << "isochronous";
    const std::uint64_t field = littleAt(part.bytes, 4, 2);
    sizes.push_back((field & 0x7FF) * ((field >> 11) + 1));
  }
  EXPECT_THAT(sizes, ElementsAre(512, 1024, 2048, 3072));
}

TEST(UvcDescriptorsTest, ABulkCameraHasOneEndpointAndTwinsHaveTwo) {
  UvcCameraConfig config;
  config.isBulk = true;
  config.functions = 2;
  std::vector<std::uint8_t> endpoints;
  std::vector<std::uint8_t> interfaces;
  const Bytes configuration = uvcDescriptors(config).configuration;
  for (const PartOfDescriptors& part : partsOf(configuration)) {
    if (part.type == usb::kEndpoint) {
      EXPECT_EQ(part.bytes[3], 2) << "bulk";
      endpoints.push_back(part.bytes[2]);
    }
    if (part.type == usb::kInterfaceAssociation) interfaces.push_back(part.bytes[2]);
  }
  EXPECT_THAT(endpoints, ElementsAre(0x81, 0x82));
  EXPECT_THAT(interfaces, ElementsAre(0, 2));
}

TEST(UvcDescriptorsTest, RefusesAFormatThatItDoesNotKnow) {
  UvcCameraConfig config;
  config.formats = {{"H264", {{160, 120, {30}}}}};
  EXPECT_THROW(uvcDescriptors(config), std::invalid_argument);
}

}  // namespace
}  // namespace quazor
