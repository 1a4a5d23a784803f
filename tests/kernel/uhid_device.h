// UhidSensor: the device's side of a display sensor, for a kernel that takes HID devices from programs (/dev/uhid).
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "backends/simulated/scenario/hid_config.h"
#include "contract/value.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

struct uhid_event;

namespace quazor {

struct UhidSensorConfig {
  std::string name = "Display Sensor";
  double rate = 60;          // input reports per second
  std::size_t length = 792;  // of each, in bytes; behind an image of 792 bytes there are zeros
  HidImages images;
  std::set<std::uint8_t> refuses;             // feature reports that are answered with an error
  std::set<std::uint8_t> ignores;             // feature reports that are never answered
  bool alwaysStreams = false;                 // whatever its feature reports say
  std::optional<std::uint64_t> stopsAfter;    // this many reports it sends no more
  std::optional<std::uint64_t> removedAfter;  // this many reports it is removed, one period after the last
};

// A feature report that arrived, in the order of their arrival.
struct UhidFeatureReport {
  std::uint8_t id = 0;
  Bytes data;  // as the kernel gave it, the ID first
};

// Sends image reports while it is open and the feature reports 0xAB and 0xAC both have the value 1: the first one
// period after that has come to hold. Settings stay when it is closed. Times are of one clock, from any moment.
//
// Thread: one.
class UhidSensor {
 public:
  using Time = std::chrono::nanoseconds;

  // Takes /dev/uhid, opened for reading and writing. Call create() next.
  UhidSensor(FileDescriptor uhid, UhidSensorConfig traits);
  UhidSensor(const UhidSensor&) = delete;
  UhidSensor& operator=(const UhidSensor&) = delete;

  // Asks the kernel for the device, which makes its node some milliseconds later: isStarted() tells. False, and errno,
  // when the kernel refuses.
  bool create();
  // Takes it away; the descriptor stays. Without effect when it is gone.
  void destroy();

  int descriptor() const { return uhid_.get(); }
  // Reads an event of the kernel, of which there must be one, and answers it. False, and errno, when that fails.
  bool handleEvent(Time now);
  // When something is to be done of itself, or nothing.
  std::optional<Time> due() const;
  // Does what is due. False, and errno, when the kernel refuses a report.
  bool act(Time now);

  bool isStarted() const { return started_; }
  bool isGone() const { return gone_; }
  std::uint64_t sent() const { return sent_; }
  const std::vector<UhidFeatureReport>& features() const { return features_; }

 private:
  bool write(const uhid_event& event, std::size_t size);
  bool takeFeature(const uhid_event& event, Time now);
  bool refuseRead(std::uint32_t request);
  void startOrStop(Time now);
  bool sendReport(Time now);

  FileDescriptor uhid_;
  const UhidSensorConfig traits_;
  const Time period_;
  bool created_ = false;
  bool started_ = false;
  bool gone_ = false;
  bool open_ = false;
  std::map<std::uint8_t, std::uint8_t> values_;  // of the feature reports
  bool streaming_ = false;
  Time next_{0};
  std::uint64_t sent_ = 0;
  std::vector<UhidFeatureReport> features_;
};

}  // namespace quazor
