// UhidSensor: the device side of a display sensor, for a kernel that accepts HID devices from programs (/dev/uhid).
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
  std::size_t length = 792;  // of each, in bytes; an image of 792 bytes is followed by zeros
  HidImages images;
  std::set<std::uint8_t> refuses;             // feature reports that are rejected with an error
  std::set<std::uint8_t> ignores;             // feature reports that get no response
  bool alwaysStreams = false;                 // regardless of its feature reports
  std::optional<std::uint64_t> stopsAfter;    // stops sending after this many reports
  std::optional<std::uint64_t> removedAfter;  // is removed after this many reports, one period after the last
};

// A feature report that arrived, in order of arrival.
struct UhidFeatureReport {
  std::uint8_t id = 0;
  Bytes data;  // as received from the kernel, including the ID
};

// Sends image reports while it is open and the feature reports 0xAB and 0xAC both have the value 1: the first one a
// period after both conditions are met. Settings persist while it is closed. All times are from the same clock.
//
// Thread: one.
class UhidSensor {
 public:
  using Time = std::chrono::nanoseconds;

  // Takes an open /dev/uhid for reading and writing. Call create() next.
  UhidSensor(FileDescriptor uhid, UhidSensorConfig traits);
  UhidSensor(const UhidSensor&) = delete;
  UhidSensor& operator=(const UhidSensor&) = delete;

  // Requests the device from the kernel, which creates its node some milliseconds later: see isStarted(). Returns false
  // and sets errno if the kernel refuses.
  bool create();
  // Removes the device; the descriptor stays open. No effect if it was already removed.
  void destroy();

  int descriptor() const { return uhid_.get(); }
  // Reads a pending event of the kernel and responds to it. Returns false and sets errno on failure.
  bool handleEvent(Time now);
  // When act() must be called next; nothing: never.
  std::optional<Time> due() const;
  // Performs the due actions. Returns false and sets errno if the kernel refuses a report.
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
  std::map<std::uint8_t, std::uint8_t> values_;  // by feature report
  bool streaming_ = false;
  Time next_{0};
  std::uint64_t sent_ = 0;
  std::vector<UhidFeatureReport> features_;
};

}  // namespace quazor
