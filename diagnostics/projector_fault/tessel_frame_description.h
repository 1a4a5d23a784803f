// QZTesselFrameDescription: the record of one counted frame of the depth module's infrared stream.
#pragma once

#include "contract/value.h"
#include "diagnostics/projector_fault/metadata_number.h"
#include "diagnostics/projector_fault/record_pool.h"
#include "platform/clock.h"
#include "platform/media_time.h"
#include "platform/platform.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace quazor {

// Holds the frame's running number, its presentation time, the moment the record was made, and the projector and
// illuminator metadata that the capture service attached to the frame, as the service delivered it.
//
// Thread: one while it is being filled; any may read it afterwards.
class QZTesselFrameDescription final : public Object {
 public:
  // A number from the metadata; absent if it was set to nothing or to a value that is not a number.
  // floodActiveTemperature is also absent if it was never set.
  using Number = std::optional<Value>;

  // A default record: number 0, time 0, created now, floodActiveTemperature absent, all other numbers the integer 0.
  explicit QZTesselFrameDescription(const Clock& clock = *installedPlatform().clock);

  // For the functions below: a record whose numbers fill() sets.
  class Unfilled {
    friend class QZTesselFrameDescription;
    Unfilled() = default;
  };
  QZTesselFrameDescription(const Clock& clock, Unfilled);

  // The record of a frame, or null if a value in the metadata is missing or not a number; only floodActiveTemperature
  // may be missing.
  static std::shared_ptr<const QZTesselFrameDescription> descriptionWithMonotonicCount(
      std::uint64_t monotonicCount, MediaTime presenationTime, const Dictionary& metadata,
      const Clock& clock = *installedPlatform().clock);
  // The same, allocated from `pool`, which must outlive it.
  static std::shared_ptr<const QZTesselFrameDescription> descriptionWithMonotonicCount(std::uint64_t monotonicCount,
                                                                                       MediaTime presenationTime,
                                                                                       const Dictionary& metadata,
                                                                                       const Clock& clock,
                                                                                       RecordPool& pool);

  // The number of the frame, starting at 1.
  std::uint64_t monotonicCount() const { return _monotonicCount; }
  void setMonotonicCount(std::uint64_t count) { _monotonicCount = count; }
  MediaTime presentationTime() const { return _presentationTime; }
  void setPresentationTime(MediaTime time) { _presentationTime = time; }
  Date creationDate() const { return _creationDate; }
  void setCreationDate(Date date) { _creationDate = date; }

  Number projectorMode() const { return _numbers[kProjectorMode].value(); }
  void setProjectorMode(const Number& number) { set(kProjectorMode, number); }
  // The light source that lit the frame: 1 or 2 if one did.
  Number infraredLightSource() const { return _numbers[kInfraredLightSource].value(); }
  void setInfraredLightSource(const Number& number) { set(kInfraredLightSource, number); }
  Number projectorIndex() const { return _numbers[kProjectorIndex].value(); }
  void setProjectorIndex(const Number& number) { set(kProjectorIndex, number); }
  Number projectorPowerLow() const { return _numbers[kProjectorPowerLow].value(); }
  void setProjectorPowerLow(const Number& number) { set(kProjectorPowerLow, number); }
  Number projectorPowerHigh() const { return _numbers[kProjectorPowerHigh].value(); }
  void setProjectorPowerHigh(const Number& number) { set(kProjectorPowerHigh, number); }
  Number projectorPowerFlood() const { return _numbers[kProjectorPowerFlood].value(); }
  void setProjectorPowerFlood(const Number& number) { set(kProjectorPowerFlood, number); }
  Number projectorProbeMode() const { return _numbers[kProjectorProbeMode].value(); }
  void setProjectorProbeMode(const Number& number) { set(kProjectorProbeMode, number); }
  Number projectorPowerProbeA() const { return _numbers[kProjectorPowerProbeA].value(); }
  void setProjectorPowerProbeA(const Number& number) { set(kProjectorPowerProbeA, number); }
  Number projectorPowerProbeB() const { return _numbers[kProjectorPowerProbeB].value(); }
  void setProjectorPowerProbeB(const Number& number) { set(kProjectorPowerProbeB, number); }
  Number projectorPulseWidth() const { return _numbers[kProjectorPulseWidth].value(); }
  void setProjectorPulseWidth(const Number& number) { set(kProjectorPulseWidth, number); }
  Number floodActiveTemperature() const { return _numbers[kFloodActiveTemperature].value(); }
  void setFloodActiveTemperature(const Number& number) { set(kFloodActiveTemperature, number); }
  Number NTCTemperatureIdle() const { return _numbers[kNTCTemperatureIdle].value(); }
  void setNTCTemperatureIdle(const Number& number) { set(kNTCTemperatureIdle, number); }
  Number NTCTemperatureStandby() const { return _numbers[kNTCTemperatureStandby].value(); }
  void setNTCTemperatureStandby(const Number& number) { set(kNTCTemperatureStandby, number); }
  Number NTCTemperatureActive() const { return _numbers[kNTCTemperatureActive].value(); }
  void setNTCTemperatureActive(const Number& number) { set(kNTCTemperatureActive, number); }
  Number DIETemperatureIdle() const { return _numbers[kDIETemperatureIdle].value(); }
  void setDIETemperatureIdle(const Number& number) { set(kDIETemperatureIdle, number); }
  Number DIETemperatureStandby() const { return _numbers[kDIETemperatureStandby].value(); }
  void setDIETemperatureStandby(const Number& number) { set(kDIETemperatureStandby, number); }
  Number DIETemperatureActive() const { return _numbers[kDIETemperatureActive].value(); }
  void setDIETemperatureActive(const Number& number) { set(kDIETemperatureActive, number); }
  // 16 event flags.
  Number hardwareEvents() const { return _numbers[kHardwareEvents].value(); }
  void setHardwareEvents(const Number& number) { set(kHardwareEvents, number); }

  std::string description() const override;
  // The CSV header, 20 titles and a newline. The line's last field, the hardware events, has no title.
  static std::string csvRepresentationHeader();
  // The CSV line, 21 fields and a newline.
  std::string csvRepresentation() const;
  // True if the module kept its projector off for safety.
  bool safetyDisabledProjection() const;

 private:
  // In the order of reading from the metadata and of the CSV line.
  enum NumberIndex : std::size_t {
    kProjectorMode,
    kInfraredLightSource,
    kProjectorIndex,
    kProjectorPowerLow,
    kProjectorPowerHigh,
    kProjectorPowerFlood,
    kProjectorProbeMode,
    kProjectorPowerProbeA,
    kProjectorPowerProbeB,
    kProjectorPulseWidth,
    kFloodActiveTemperature,
    kNTCTemperatureIdle,
    kNTCTemperatureStandby,
    kNTCTemperatureActive,
    kDIETemperatureIdle,
    kDIETemperatureStandby,
    kDIETemperatureActive,
    kHardwareEvents,
    kNumberCount
  };
  static const std::array<std::string_view, kNumberCount> kMetadataKeys;

  void set(NumberIndex index, const Number& number) {
    if (number) {
      _numbers[index].assign(*number);
    } else {
      _numbers[index].reset();
    }
  }
  // False if a number is missing.
  bool fill(std::uint64_t monotonicCount, MediaTime presentationTime, const Dictionary& metadata);

  std::uint64_t _monotonicCount = 0;
  MediaTime _presentationTime;
  Date _creationDate;
  std::array<MetadataNumber, kNumberCount> _numbers;
};

}  // namespace quazor
