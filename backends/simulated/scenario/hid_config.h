// What a scenario says of a HID device.
#pragma once

#include "backends/faults/fault.h"

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace quazor {

// A setting of the device: a feature report of two bytes, its ID and a value. It is 0 when the phone is made.
struct HidFeatureReport {
  std::uint8_t id = 0;
  std::set<std::uint8_t> accepts;         // the values it takes; none: any
  std::optional<std::uint8_t> streamsAt;  // the device sends input reports only while it has this value
};

// How an input report differs from a whole image report.
struct HidReportShape {
  std::optional<std::uint8_t> reportID;
  std::optional<std::uint64_t> length;  // in bytes, the ID included; the end is cut off, or zeros follow it
  std::optional<FaultError> error;      // comes in the report's place
};

// What the image reports hold. Sample s of image n, both from 0, is a point on a circle, at the angle
// s * phaseStep + n * phaseStepPerImage, in degrees; I is its cosine and Q its sine, rounded.
struct HidImages {
  std::uint32_t firstFrameID = 1;  // counts up from there, and wraps
  std::int32_t amplitude = 1000;
  std::int32_t offsetI = 0;
  std::int32_t offsetQ = 0;
  double phaseStep = 7.5;
  double phaseStepPerImage = 0;
  float temperature = 25;  // degrees Celsius
};

// Input reports are counted from 0 over the life of the phone.
struct HidDeviceConfig {
  std::string name;  // names the device in the scenario and in faults
  std::uint16_t usagePage = 0;
  std::uint16_t usage = 0;
  std::vector<HidFeatureReport> featureReports;
  double rate = 60;                                // input reports per second
  std::optional<std::uint64_t> reportCount;        // how many it sends; nothing: without end
  std::optional<std::uint64_t> removedAfter;       // the device is removed when the report of this number is due
  HidReportShape every;                            // of all reports; without an error
  std::map<std::uint64_t, HidReportShape> single;  // of single ones, by number, on top of `every`
  HidImages images;
};

}  // namespace quazor
