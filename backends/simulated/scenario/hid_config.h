// The HID devices in a scenario.
#pragma once

#include "backends/faults/fault.h"

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace quazor {

// A setting of the device: a feature report of two bytes, its ID and a value. The initial value is 0.
struct HidFeatureReport {
  std::uint8_t id = 0;
  std::set<std::uint8_t> accepts;         // the values it accepts; empty: any
  std::optional<std::uint8_t> streamsAt;  // the device sends input reports only while it has this value
};

// Differences of an input report from a normal image report.
struct HidReportShape {
  std::optional<std::uint8_t> reportID;
  std::optional<std::uint64_t> length;  // in bytes, including the ID; the report is truncated, or padded with zeros
  std::optional<FaultError> error;      // sent instead of the report
};

// The content of the image reports. Sample s of image n, both starting at 0, is a point on a circle at the angle s *
// phaseStep + n * phaseStepPerImage, in degrees; I is its cosine and Q its sine, rounded.
struct HidImages {
  std::uint32_t firstFrameID = 1;  // incremented per image; wraps around
  std::int32_t amplitude = 1000;
  std::int32_t offsetI = 0;
  std::int32_t offsetQ = 0;
  double phaseStep = 7.5;
  double phaseStepPerImage = 0;
  float temperature = 25;  // degrees Celsius
};

// Input reports are numbered from 0 over the lifetime of the phone.
struct HidDeviceConfig {
  std::string name;  // the name of the device in the scenario and in faults
  std::uint16_t usagePage = 0;
  std::uint16_t usage = 0;
  std::vector<HidFeatureReport> featureReports;
  double rate = 60;                                // input reports per second
  std::optional<std::uint64_t> reportCount;        // the number of reports; nothing: unlimited
  std::optional<std::uint64_t> removedAfter;       // the device is removed when the report with this number is due
  HidReportShape every;                            // applies to all reports; without an error
  std::map<std::uint64_t, HidReportShape> single;  // applies to single reports, by number, after `every`
  HidImages images;
};

}  // namespace quazor
