// QZTesselFrameDescription: the record of one counted frame of the depth module's infrared stream.
#pragma once

#include "frame/value.h"
#include "platform/clock.h"
#include "platform/media_time.h"
#include "platform/platform.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace quazor {

// Holds the frame's running number, its presentation time, the moment the record was made, and the projector and
// illuminator metadata that the capture service attached to the frame, as the service delivered it.
//
// Not synchronised: made on one thread, then read by others, changed by none.
class QZTesselFrameDescription final : public Object {
 public:
  // A number of the metadata; absent where it was set to nothing, floodActiveTemperature also where it was never set.
  using Number = std::optional<Value>;

  // A record of defaults: number 0, time 0, made now, floodActiveTemperature absent and all other numbers the integer
  // 0.
  explicit QZTesselFrameDescription(const Clock& clock = *installedPlatform().clock);

  // The record of a frame, or null when a number of the metadata is missing or is no number; floodActiveTemperature
  // alone may be missing.
  static std::shared_ptr<const QZTesselFrameDescription> descriptionWithMonotonicCount(
      std::uint64_t monotonicCount, MediaTime presenationTime, const Dictionary& metadata,
      const Clock& clock = *installedPlatform().clock);

  // The frame's number, from 1.
  std::uint64_t monotonicCount() const { return _monotonicCount; }
  void setMonotonicCount(std::uint64_t count) { _monotonicCount = count; }
  MediaTime presentationTime() const { return _presentationTime; }
  void setPresentationTime(MediaTime time) { _presentationTime = time; }
  Date creationDate() const { return _creationDate; }
  void setCreationDate(Date date) { _creationDate = date; }

  const Number& projectorMode() const { return _numbers[kProjectorMode]; }
  void setProjectorMode(Number number) { _numbers[kProjectorMode] = std::move(number); }
  // The light source that lit the frame: 1 or 2 when one did.
  const Number& infraredLightSource() const { return _numbers[kInfraredLightSource]; }
  void setInfraredLightSource(Number number) { _numbers[kInfraredLightSource] = std::move(number); }
  const Number& projectorIndex() const { return _numbers[kProjectorIndex]; }
  void setProjectorIndex(Number number) { _numbers[kProjectorIndex] = std::move(number); }
  const Number& projectorPowerLow() const { return _numbers[kProjectorPowerLow]; }
  void setProjectorPowerLow(Number number) { _numbers[kProjectorPowerLow] = std::move(number); }
  const Number& projectorPowerHigh() const { return _numbers[kProjectorPowerHigh]; }
  void setProjectorPowerHigh(Number number) { _numbers[kProjectorPowerHigh] = std::move(number); }
  const Number& projectorPowerFlood() const { return _numbers[kProjectorPowerFlood]; }
  void setProjectorPowerFlood(Number number) { _numbers[kProjectorPowerFlood] = std::move(number); }
  const Number& projectorProbeMode() const { return _numbers[kProjectorProbeMode]; }
  void setProjectorProbeMode(Number number) { _numbers[kProjectorProbeMode] = std::move(number); }
  const Number& projectorPowerProbeA() const { return _numbers[kProjectorPowerProbeA]; }
  void setProjectorPowerProbeA(Number number) { _numbers[kProjectorPowerProbeA] = std::move(number); }
  const Number& projectorPowerProbeB() const { return _numbers[kProjectorPowerProbeB]; }
  void setProjectorPowerProbeB(Number number) { _numbers[kProjectorPowerProbeB] = std::move(number); }
  const Number& projectorPulseWidth() const { return _numbers[kProjectorPulseWidth]; }
  void setProjectorPulseWidth(Number number) { _numbers[kProjectorPulseWidth] = std::move(number); }
  const Number& floodActiveTemperature() const { return _numbers[kFloodActiveTemperature]; }
  void setFloodActiveTemperature(Number number) { _numbers[kFloodActiveTemperature] = std::move(number); }
  const Number& NTCTemperatureIdle() const { return _numbers[kNTCTemperatureIdle]; }
  void setNTCTemperatureIdle(Number number) { _numbers[kNTCTemperatureIdle] = std::move(number); }
  const Number& NTCTemperatureStandby() const { return _numbers[kNTCTemperatureStandby]; }
  void setNTCTemperatureStandby(Number number) { _numbers[kNTCTemperatureStandby] = std::move(number); }
  const Number& NTCTemperatureActive() const { return _numbers[kNTCTemperatureActive]; }
  void setNTCTemperatureActive(Number number) { _numbers[kNTCTemperatureActive] = std::move(number); }
  const Number& DIETemperatureIdle() const { return _numbers[kDIETemperatureIdle]; }
  void setDIETemperatureIdle(Number number) { _numbers[kDIETemperatureIdle] = std::move(number); }
  const Number& DIETemperatureStandby() const { return _numbers[kDIETemperatureStandby]; }
  void setDIETemperatureStandby(Number number) { _numbers[kDIETemperatureStandby] = std::move(number); }
  const Number& DIETemperatureActive() const { return _numbers[kDIETemperatureActive]; }
  void setDIETemperatureActive(Number number) { _numbers[kDIETemperatureActive] = std::move(number); }
  // A set of 16 event flags.
  const Number& hardwareEvents() const { return _numbers[kHardwareEvents]; }
  void setHardwareEvents(Number number) { _numbers[kHardwareEvents] = std::move(number); }

  std::string description() const override;
  // The CSV header, 20 titles and a newline. The line's last field, the hardware events, has no title.
  static std::string csvRepresentationHeader();
  // The CSV line, 21 fields and a newline.
  std::string csvRepresentation() const;
  // True when the module kept its projector dark for safety.
  bool safetyDisabledProjection() const;

 private:
  // In the order in which they are read from the metadata and stand in the CSV line.
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

  std::uint64_t _monotonicCount = 0;
  MediaTime _presentationTime;
  Date _creationDate;
  std::array<Number, kNumberCount> _numbers;
};

}  // namespace quazor
