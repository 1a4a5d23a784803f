#include "backends/capture/property_checks.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>

namespace quazor {
namespace {

std::string namesOf(CaptureObjectKind kind) {
  std::string names;
  for (const CaptureProperty& property : propertiesOf(kind)) {
    if (!names.empty()) names += ", ";
    names += property.key;
  }
  return names;
}

bool isInteger(const Value& value) {
  return value.kind() == Value::Kind::kSigned || value.kind() == Value::Kind::kUnsigned;
}

bool isNegative(const Value& value) { return value.signedInteger() != nullptr && *value.signedInteger() < 0; }

constexpr std::array kSlaveSwitches{capture_key::StreamingOutputsEnabled, capture_key::FrameSkippingEnabled,
                                    capture_key::TimeMachineEnabled};

// Such a camera supports only slave configurations with the master's rate and without skipping.
bool checkStreamsAlong(std::string_view object, const Dictionary& configuration, const Refuser& refuse) {
  for (const auto& [key, entry] : configuration) {
    const bool isOn = key == capture_key::StreamingOutputsEnabled || key == capture_key::MasterToSlaveFrameRateRatio;
    if (toUnsigned(&entry) == (isOn ? 1 : 0)) continue;
    return refuse(CaptureRefusal::kUnsupported, "%@: %@ can only be %@ here, not %@.", object, key, isOn ? 1 : 0,
                  described(entry));
  }
  return true;
}

}  // namespace

std::string described(const Value& value) {
  switch (value.kind()) {
    case Value::Kind::kBoolean: return "the boolean " + defaultText(value);
    case Value::Kind::kSigned:
    case Value::Kind::kUnsigned:
    case Value::Kind::kDouble:
    case Value::Kind::kFloat: return "the number " + defaultText(value);
    case Value::Kind::kString: return "the string " + defaultText(value);
    case Value::Kind::kArray: return "an array";
    case Value::Kind::kDictionary: return "a dictionary";
    case Value::Kind::kDate: return "a date";
    case Value::Kind::kBytes: return "bytes";
    case Value::Kind::kObject: return value.object() == nullptr ? "no object" : value.object()->description();
    case Value::Kind::kError: return "an error";
  }
  return "";
}

bool checkKnown(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse) {
  if (findProperty(kind, key) != nullptr) return true;
  return refuse(CaptureRefusal::kUnknownProperty, "%@ has no property %@; it has %@.", object, key, namesOf(kind));
}

bool checkWritable(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse) {
  if (!checkKnown(kind, object, key, refuse)) return false;
  if (!findProperty(kind, key)->readOnly) return true;
  return refuse(CaptureRefusal::kReadOnlyProperty, "%@: %@ can only be read.", object, key);
}

bool checkBoolean(std::string_view object, std::string_view key, const Value& value, const Refuser& refuse) {
  if (value.boolean() != nullptr) return true;
  return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a boolean, not %@.", object, key, described(value));
}

bool checkIndex(std::string_view object, std::string_view key, const Value& value, std::uint64_t highest,
                const Refuser& refuse) {
  if (isInteger(value) && !isNegative(value) && toUnsigned(&value) <= highest) return true;
  const CaptureRefusal code = isInteger(value) ? CaptureRefusal::kOutOfRange : CaptureRefusal::kWrongType;
  return refuse(code, "%@: %@ must be an integer from 0 to %@, not %@.", object, key, highest, described(value));
}

bool checkRate(std::string_view object, std::string_view key, const Value& value, double highest,
               const Refuser& refuse) {
  const bool isNumber = value.isNumber() && value.boolean() == nullptr;
  const double rate = toDouble(&value);
  if (isNumber && rate > 0 && rate <= highest) return true;
  const CaptureRefusal code = isNumber ? CaptureRefusal::kOutOfRange : CaptureRefusal::kWrongType;
  return refuse(code, "%@: %@ must be a number above 0 and at most %@, not %@.", object, key, highest,
                described(value));
}

bool checkSlaveConfiguration(std::string_view object, const CameraInfo& camera, const Value& value,
                             const Refuser& refuse) {
  const Dictionary* entries = value.dictionary();
  if (entries == nullptr) {
    return refuse(CaptureRefusal::kWrongType, "%@: a slave configuration must be a dictionary, not %@.", object,
                  described(value));
  }
  for (const std::string_view key : kSlaveSwitches) {
    const Value* entry = entries->find(key);
    if (entry == nullptr) {
      return refuse(CaptureRefusal::kOutOfRange, "%@: a slave configuration must have %@.", object, key);
    }
    if (!checkBoolean(object, key, *entry, refuse)) return false;
  }
  const Value* ratio = entries->find(capture_key::MasterToSlaveFrameRateRatio);
  if (ratio == nullptr || !isInteger(*ratio) || isNegative(*ratio) || toUnsigned(ratio) == 0) {
    const bool wrongType = ratio != nullptr && !isInteger(*ratio);
    return refuse(wrongType ? CaptureRefusal::kWrongType : CaptureRefusal::kOutOfRange,
                  "%@: a slave configuration must have %@, an integer above 0.", object,
                  capture_key::MasterToSlaveFrameRateRatio);
  }
  for (const auto& [key, entry] : *entries) {
    if (key == capture_key::MasterToSlaveFrameRateRatio) continue;
    if (std::ranges::find(kSlaveSwitches, key) != kSlaveSwitches.end()) continue;
    return refuse(CaptureRefusal::kOutOfRange, "%@: a slave configuration has no entry %@.", object, key);
  }
  return camera.isSlaveOfAnyConfiguration || checkStreamsAlong(object, *entries, refuse);
}

}  // namespace quazor
