#include "tests/kernel/display_sensor.h"

#include "backends/simulated/hid/hid_image_report.h"
#include "contract/message_format.h"

#include <array>
#include <cmath>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint8_t kPowerMode = 0xAB;
constexpr std::uint8_t kStreamingMode = 0xAC;
constexpr std::uint8_t kOn = 1;

constexpr std::array<std::uint8_t, 40> kDescriptor{
    0x06, 0x00, 0xFF,                                      // usage page 0xFF00
    0x09, 0x24, 0xA1, 0x01,                                // usage 0x24, application collection
    0x15, 0x00, 0x26, 0xFF, 0x00, 0x75, 0x08,              // fields of 8 bits, from 0 to 255
    0x85, 0x76, 0x09, 0x76, 0x96, 0x17, 0x03, 0x81, 0x02,  // report 0x76: 791 input fields
    0x85, 0xAB, 0x09, 0xAB, 0x95, 0x01, 0xB1, 0x02,        // report 0xAB: a feature
    0x85, 0xAC, 0x09, 0xAC, 0x95, 0x01, 0xB1, 0x02,        // report 0xAC: another
    0xC0};

}  // namespace

std::span<const std::uint8_t> displaySensorDescriptor() { return kDescriptor; }

DisplaySensor::DisplaySensor(DisplaySensorConfig config)
    : config_(std::move(config)), period_(static_cast<Time::rep>(std::llround(1e9 / config_.rate))) {}

void DisplaySensor::setOpen(bool open, Time now) {
  open_ = open;
  startOrStop(now);
}

FeatureAnswer DisplaySensor::takeReport(std::uint8_t id, bool isFeature, std::span<const std::uint8_t> data, Time now) {
  features_.push_back({id, Bytes(data.begin(), data.end())});
  if (config_.ignores.contains(id)) return FeatureAnswer::kNone;
  if (config_.refuses.contains(id) || !isFeature || data.size() < 2) return FeatureAnswer::kRefused;
  values_[id] = data[1];
  startOrStop(now);
  return FeatureAnswer::kAccepted;
}

void DisplaySensor::startOrStop(Time now) {
  const auto isOn = [this](std::uint8_t id) {
    const auto found = values_.find(id);
    return found != values_.end() && found->second == kOn;
  };
  const bool wanted = open_ && !gone_ && (config_.alwaysStreams || (isOn(kPowerMode) && isOn(kStreamingMode)));
  if (wanted == streaming_) return;
  streaming_ = wanted;
  next_ = now + period_;
}

std::optional<DisplaySensor::Time> DisplaySensor::due() const {
  const bool hasEnded = config_.stopsAfter && sent_ >= *config_.stopsAfter && !config_.removedAfter;
  return streaming_ && !hasEnded ? std::optional(next_) : std::nullopt;
}

std::optional<SensorAction> DisplaySensor::takeAction(Time now) {
  const std::optional<Time> next = due();
  if (!next || *next > now) return std::nullopt;
  next_ += period_;
  if (!config_.removedAfter || sent_ < *config_.removedAfter) return SensorAction::kReport;
  remove();
  return SensorAction::kRemoval;
}

void DisplaySensor::remove() {
  gone_ = true;
  streaming_ = false;
}

Bytes DisplaySensor::report(Time now) const {
  HidReportShape shape;
  shape.length = config_.length;
  return hidInputReport(config_.images, shape, sent_, now);
}

std::string DisplaySensor::activity() const {
  std::string text = "{\"sent\": " + std::to_string(sent_) + ", \"features\": [";
  for (const SensorFeatureReport& feature : features_) {
    if (&feature != &features_.front()) text += ", ";
    text += "{\"id\": " + std::to_string(feature.id) + ", \"data\": \"" + defaultText(Value(feature.data)) + "\"}";
  }
  return text + "], \"removed\": " + (gone_ ? "true" : "false") + "}";
}

}  // namespace quazor
