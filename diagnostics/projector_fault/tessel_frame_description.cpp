#include "diagnostics/projector_fault/tessel_frame_description.h"

#include "contract/message_format.h"
#include "platform/capture_keys.h"

#include <charconv>
#include <string_view>

namespace quazor {

namespace {

constexpr std::uint16_t kSafetyDisabledProjection = 0x2000;  // bit 13 of the hardware events

// The default description of an object: its class and address.
std::string defaultDescription(const QZTesselFrameDescription* record) {
  char digits[2 * sizeof(std::uintptr_t)];
  const auto end = std::to_chars(digits, digits + sizeof digits, reinterpret_cast<std::uintptr_t>(record), 16).ptr;
  return formatMessage("<QZTesselFrameDescription: 0x%@>", std::string_view(digits, end));
}

}  // namespace

constinit const std::array<std::string_view, QZTesselFrameDescription::kNumberCount>
    QZTesselFrameDescription::kMetadataKeys{"MetaDataProjectorMode",
                                            capture_key::InfraredLightSource,
                                            "MetaDataProjectorIndex",
                                            "MetaDataProjectorPowerLow",
                                            "MetaDataProjectorPowerHigh",
                                            "MetaDataProjectorPowerFlood",
                                            "MetaDataProjectorProbeMode",
                                            "MetaDataProjectorPowerProbeA",
                                            "MetaDataProjectorPowerProbeB",
                                            "MetaDataProjectorPulseWidth",
                                            capture_key::FloodActiveTemperature,
                                            "NTCTemperatureIdle",
                                            "NTCTemperatureStandby",
                                            "NTCTemperatureActive",
                                            "DIETemperatureIdle",
                                            "DIETemperatureStandby",
                                            "DIETemperatureActive",
                                            "HardwareEvents"};

QZTesselFrameDescription::QZTesselFrameDescription(const Clock& clock, Unfilled) : _creationDate(clock.date()) {}

QZTesselFrameDescription::QZTesselFrameDescription(const Clock& clock) : QZTesselFrameDescription(clock, Unfilled()) {
  for (MetadataNumber& number : _numbers) number.assign(Value(0));
  _numbers[kFloodActiveTemperature].reset();
}

std::shared_ptr<const QZTesselFrameDescription> QZTesselFrameDescription::descriptionWithMonotonicCount(
    std::uint64_t monotonicCount, MediaTime presenationTime, const Dictionary& metadata, const Clock& clock) {
  auto record = std::make_shared<QZTesselFrameDescription>(clock, Unfilled());
  return record->fill(monotonicCount, presenationTime, metadata) ? record : nullptr;
}

std::shared_ptr<const QZTesselFrameDescription> QZTesselFrameDescription::descriptionWithMonotonicCount(
    std::uint64_t monotonicCount, MediaTime presenationTime, const Dictionary& metadata, const Clock& clock,
    RecordPool& pool) {
  auto record =
      std::allocate_shared<QZTesselFrameDescription>(PoolAllocator<QZTesselFrameDescription>(pool), clock, Unfilled());
  return record->fill(monotonicCount, presenationTime, metadata) ? record : nullptr;
}

bool QZTesselFrameDescription::fill(std::uint64_t monotonicCount, MediaTime presentationTime,
                                    const Dictionary& metadata) {
  _monotonicCount = monotonicCount;
  _presentationTime = presentationTime;
  auto next = metadata.begin();  // where the number is if the service lists them in this order, which it usually does
  for (std::size_t i = 0; i < kNumberCount; ++i) {
    const bool isNext = next != metadata.end() && next->first == kMetadataKeys[i];
    const Value* number = isNext ? &next++->second : metadata.find(kMetadataKeys[i]);
    if (number != nullptr && number->isNumber()) {
      _numbers[i].assign(*number);
    } else if (i != kFloodActiveTemperature) {
      return false;
    }
  }
  return true;
}

std::string QZTesselFrameDescription::description() const {
  return formatMessage("%@ monotonic count: %@ illuminated: %@", defaultDescription(this), _monotonicCount,
                       infraredLightSource());
}

std::string QZTesselFrameDescription::csvRepresentationHeader() {
  const auto& keys = kMetadataKeys;
  return formatMessage("Frame,Date,MediaTime(s),%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@\n",
                       keys[kProjectorMode], keys[kInfraredLightSource], keys[kProjectorIndex],
                       keys[kProjectorPowerLow], keys[kProjectorPowerHigh], keys[kProjectorPowerFlood],
                       keys[kProjectorProbeMode], keys[kProjectorPowerProbeA], keys[kProjectorPowerProbeB],
                       keys[kProjectorPulseWidth], keys[kFloodActiveTemperature], keys[kNTCTemperatureIdle],
                       keys[kNTCTemperatureStandby], keys[kNTCTemperatureActive], keys[kDIETemperatureIdle],
                       keys[kDIETemperatureStandby], keys[kDIETemperatureActive]);
}

std::string QZTesselFrameDescription::csvRepresentation() const {
  return formatMessage("%@,%@,%lf,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@,%@\n", _monotonicCount,
                       _creationDate, _presentationTime.seconds(), projectorMode(), infraredLightSource(),
                       projectorIndex(), projectorPowerLow(), projectorPowerHigh(), projectorPowerFlood(),
                       projectorProbeMode(), projectorPowerProbeA(), projectorPowerProbeB(), projectorPulseWidth(),
                       floodActiveTemperature(), NTCTemperatureIdle(), NTCTemperatureStandby(), NTCTemperatureActive(),
                       DIETemperatureIdle(), DIETemperatureStandby(), DIETemperatureActive(), hardwareEvents());
}

bool QZTesselFrameDescription::safetyDisabledProjection() const {
  return (toUInt16(pointerTo(hardwareEvents())) & kSafetyDisabledProjection) != 0;
}

}  // namespace quazor
