#include "backends/linux/binding/binding_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

TEST_F(BindingTest, RefusesFormatsThatCannotBe) {
  const std::string formats = "F:3: cameras.BackFacingCamera.formats";
  const std::string code =
      ": must be the code of a format, such as \"YUYV\"; 'quazor phone probe' shows the camera's codes.";
  const auto withFormat = [](const std::string& entries) {
    return withCamera("\"formats\": {\"16\": {" + entries + "}}");
  };
  const auto withIndex = [](const std::string& index) {
    return withCamera("\"formats\": {\"" + index + R"(": {"format": "YUYV"}})");
  };
  const auto noIndex = [&formats](const std::string& index) {
    return formats + "." + index + ": \"" + index +
           "\" is not a format index; expected a whole number, such as \"16\".";
  };
  const Refused kRows[] = {
      {"an empty map", withCamera("\"formats\": {}"), formats + ": map at least one format index, or remove the key."},
      {"a list", withCamera("\"formats\": []"), formats + ": must be an object, not an array."},
      {"an index that is a name", withIndex("YUYV"), noIndex("YUYV")},
      {"a negative index", withIndex("-1"), noIndex("-1")},
      {"an index in another spelling", withIndex("016"), noIndex("016")},
      {"an index that is too large", withIndex("4294967296"), noIndex("4294967296")},
      {"no format", withFormat(""), formats + ".16: the key \"format\" is missing."},
      {"a format that is an index", withFormat("\"format\": 3"),
       formats + ".16.format: must be a non-empty string, not 3."},
      {"a format's description", withFormat("\"format\": \"YUYV 4:2:2\""), formats + ".16.format" + code},
      {"a format that is no text", withFormat("\"format\": \"Y\\u0001\""), formats + ".16.format" + code},
      {"half a size", withFormat(R"("format": "YUYV", "size": {"width": 4})"),
       formats + ".16.size: the key \"height\" is missing."},
      {"an interval of no time", withFormat(R"("format": "YUYV", "interval": {"numerator": 0, "denominator": 30})"),
       formats + ".16.interval.numerator: must be an integer from 1 to 4294967295, not 0."},
      {"an interval that is a rate", withFormat(R"("format": "YUYV", "interval": 30)"),
       formats + ".16.interval: must be an object, not 30."},
      {"an unknown key", withFormat(R"("format": "YUYV", "rate": 30)"), formats + ".16: unknown key \"rate\""},
  };
  for (const Refused& row : kRows) EXPECT_THAT(problemOf(row.text), ::testing::StartsWith(row.problem)) << row.what;
}

TEST_F(BindingTest, MetadataMayHaveAFormat) {
  const auto withMetadata = [](const std::string& entries) { return withCamera("\"metadata\": {" + entries + "}"); };
  const std::string node = R"("node": {"card": "m"}, "fields": {"K": {"offset": 0}}, )";
  EXPECT_EQ(read(withMetadata(node + R"("format": "UVC")")).cameras.at(0).metadata.format, "UVC ");
  EXPECT_EQ(
      problemOf(withMetadata(node + "\"format\": \"UVC header\"")),
      "F:3: cameras.BackFacingCamera.metadata.format: must be the code of a format, such as \"YUYV\"; 'quazor phone "
      "probe' shows the camera's codes.");
  EXPECT_EQ(read(withMetadata(node + R"("pairing": "sequence")")).cameras.at(0).metadata.pairing,
            MetadataPairing::kSequence);
  EXPECT_EQ(read(withMetadata(node + R"("pairing": "timestamp")")).cameras.at(0).metadata.pairing,
            MetadataPairing::kTimestamp);
  EXPECT_EQ(
      problemOf(withMetadata(node + R"("pairing": "order")")),
      "F:3: cameras.BackFacingCamera.metadata.pairing: \"order\" is not a way to pair frames and metadata; expected "
      "one of \"timestamp\", \"sequence\".");
  EXPECT_EQ(problemOf(withMetadata("\"pairing\": \"sequence\"")),
            "F:3: cameras.BackFacingCamera.metadata.pairing: \"pairing\" requires a metadata \"node\".");
  EXPECT_EQ(problemOf(withMetadata("\"format\": \"UVCH\"")),
            "F:3: cameras.BackFacingCamera.metadata.format: \"format\" requires a metadata \"node\".");
}

TEST_F(BindingTest, ANodeMayBeSelectedByItsPlace) {
  const auto withNode = [](const std::string& node) {
    return with(R"("cameras": {"BackFacingCamera": {"node": {)" + node + R"(}, "size": {"width": 4, "height": 2}}})");
  };
  const std::string node = "F:2: cameras.BackFacingCamera.node";
  const VideoNodeMatch match =
      read(withNode(R"("driver": "d", "usbInterface": 2, "path": "/sys/devices/a")")).cameras.at(0).node;
  EXPECT_EQ(match, (VideoNodeMatch{"d", {}, {}, 2, "/sys/devices/a"}));
  EXPECT_EQ(read(withNode("\"path\": \"/sys/devices/a\"")).cameras.at(0).node.path, "/sys/devices/a");
  EXPECT_EQ(problemOf(withNode("\"usbInterface\": 2")), node +
                                                            ": give at least one of \"driver\", \"card\", \"busInfo\", "
                                                            "\"path\" and \"name\"; 'quazor phone probe' shows them.");
  EXPECT_EQ(problemOf(withNode(R"("driver": "d", "usbInterface": 256)")),
            node + ".usbInterface: must be an integer from 0 to 255, not 256.");
  EXPECT_EQ(problemOf(withNode("\"path\": \"/dev/video0\"")),
            node + ".path: must be the device's path in sysfs, such as \"/sys/devices/...\".");
}

}  // namespace
}  // namespace quazor
