// UhidSensor: a display sensor for a kernel that accepts HID devices from programs (/dev/uhid).
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "tests/kernel/display_sensor.h"

#include <cstddef>
#include <cstdint>
#include <optional>

struct uhid_event;

namespace quazor {

// Thread: one.
class UhidSensor {
 public:
  using Time = DisplaySensor::Time;

  // Takes an open /dev/uhid for reading and writing. Call create() next.
  UhidSensor(FileDescriptor uhid, DisplaySensorConfig config);
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
  std::optional<Time> due() const { return sensor_.due(); }
  // Performs the due actions. Returns false and sets errno if the kernel refuses a report.
  bool act(Time now);

  bool isStarted() const { return started_; }
  const DisplaySensor& sensor() const { return sensor_; }

 private:
  bool write(const uhid_event& event, std::size_t size);
  bool takeReport(const uhid_event& event, Time now);
  bool refuseRead(std::uint32_t request);
  bool tellRemoval();
  bool sendReport(Time now);

  FileDescriptor uhid_;
  DisplaySensor sensor_;
  bool created_ = false;
  bool started_ = false;
};

}  // namespace quazor
