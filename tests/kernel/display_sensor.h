// DisplaySensor: what a display sensor does, whichever way it is connected.
#pragma once

#include "backends/simulated/scenario/hid_config.h"
#include "contract/value.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <vector>

namespace quazor {

struct DisplaySensorConfig {
  std::string name = "Display Sensor";
  double rate = 60;          // input reports per second
  std::size_t length = 792;  // of each, in bytes; an image of 792 bytes is followed by zeros
  HidImages images;
  std::set<std::uint8_t> refuses;             // feature reports that are rejected with an error
  std::set<std::uint8_t> ignores;             // feature reports that get no response
  bool alwaysStreams = false;                 // regardless of its feature reports
  std::optional<std::uint64_t> stopsAfter;    // stops sending after this many reports
  std::optional<std::uint64_t> removedAfter;  // is removed after this many reports, one period after the last
};

// Its report descriptor: usage 0x24 of the vendor page 0xFF00, with input report 0x76 of 791 bytes after its ID and
// feature reports 0xAB and 0xAC of one byte.
std::span<const std::uint8_t> displaySensorDescriptor();

// The identity that the sensor has on a bus.
inline constexpr std::uint16_t kDisplaySensorVendor = 0x1209;
inline constexpr std::uint16_t kDisplaySensorProduct = 0x0001;

// A feature report that arrived, in order of arrival.
struct SensorFeatureReport {
  std::uint8_t id = 0;
  Bytes data;  // as received from the kernel, including the ID
};

enum class FeatureAnswer { kAccepted, kRefused, kNone };
enum class SensorAction { kReport, kRemoval };

// Has an image report to send while it is open and the feature reports 0xAB and 0xAC both have the value 1: the first
// one a period after both conditions are met. Settings persist while it is closed. All times are from the same clock.
//
// Thread: one.
class DisplaySensor {
 public:
  using Time = std::chrono::nanoseconds;

  explicit DisplaySensor(DisplaySensorConfig config);

  const DisplaySensorConfig& config() const { return config_; }
  void setOpen(bool open, Time now);
  // Takes a report with its ID as the first byte; only feature reports are accepted.
  FeatureAnswer takeReport(std::uint8_t id, bool isFeature, std::span<const std::uint8_t> data, Time now);
  // When the next action is due; nothing: never.
  std::optional<Time> due() const;
  // The next action that is due, which is then over; nothing: none. For a report send report(), then call countSent().
  std::optional<SensorAction> takeAction(Time now);
  Bytes report(Time now) const;
  void countSent() { ++sent_; }
  // It has been removed: nothing is due any more.
  void remove();

  bool isGone() const { return gone_; }
  std::uint64_t sent() const { return sent_; }
  const std::vector<SensorFeatureReport>& features() const { return features_; }
  // What it did, as an object of JSON: {"sent": 181, "features": [{"id": 171, "data": "ab01"}, ...], "removed": false}
  std::string activity() const;

 private:
  void startOrStop(Time now);

  const DisplaySensorConfig config_;
  const Time period_;
  bool gone_ = false;
  bool open_ = false;
  std::map<std::uint8_t, std::uint8_t> values_;  // by feature report
  bool streaming_ = false;
  Time next_{0};
  std::uint64_t sent_ = 0;
  std::vector<SensorFeatureReport> features_;
};

}  // namespace quazor
