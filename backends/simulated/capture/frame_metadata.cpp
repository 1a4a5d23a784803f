#include "backends/simulated/capture/frame_metadata.h"

#include "platform/capture_keys.h"

#include <string>

namespace quazor {

Dictionary healthyMetadata(bool lit) {
  const int firing = lit ? 1 : 0;
  return Dictionary{{"MetaDataProjectorMode", 2 * firing},
                    {std::string(capture_key::InfraredLightSource), firing},
                    {"MetaDataProjectorIndex", 0},
                    {"MetaDataProjectorPowerLow", 210 * firing},
                    {"MetaDataProjectorPowerHigh", 640 * firing},
                    {"MetaDataProjectorPowerFlood", 0},
                    {"MetaDataProjectorProbeMode", 1},
                    {"MetaDataProjectorPowerProbeA", 205 * firing},
                    {"MetaDataProjectorPowerProbeB", 207 * firing},
                    {"MetaDataProjectorPulseWidth", 1.5 * firing},
                    {std::string(capture_key::FloodActiveTemperature), 33.5},
                    {"NTCTemperatureIdle", 31.25},
                    {"NTCTemperatureStandby", 32.0},
                    {"NTCTemperatureActive", 36.5},
                    {"DIETemperatureIdle", 32.5},
                    {"DIETemperatureStandby", 33.25},
                    {"DIETemperatureActive", 41.0},
                    {"HardwareEvents", 0}};
}

std::optional<Value> attachmentOf(Dictionary base, const FrameMetadata& special) {
  switch (special.attachment) {
    case FrameAttachment::kMissing: return std::nullopt;
    case FrameAttachment::kText: return Value("metadata");
    case FrameAttachment::kNumber: return Value(17);
    case FrameAttachment::kDictionary: break;
  }
  for (const auto& [key, value] : special.overrides) base.set(key, value);
  for (const std::string& key : special.without) base.erase(key);
  return Value(std::move(base));
}

}  // namespace quazor
