#include "backends/simulated/capture/property_checks.h"

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

bool checkKnown(CaptureObjectKind kind, std::string_view object, std::string_view key, DiagnosticErrorPtr* error) {
  if (findProperty(kind, key) != nullptr) return true;
  return refuse(error, CaptureErrorCode::kUnknownProperty, "%@ has no property %@; it has %@.", object, key,
                namesOf(kind));
}

bool checkWritable(CaptureObjectKind kind, std::string_view object, std::string_view key, DiagnosticErrorPtr* error) {
  if (!checkKnown(kind, object, key, error)) return false;
  if (!findProperty(kind, key)->readOnly) return true;
  return refuse(error, CaptureErrorCode::kReadOnlyProperty, "%@: %@ can only be read.", object, key);
}

bool checkBoolean(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error) {
  if (value.boolean() != nullptr) return true;
  return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a boolean, not %@.", object, key,
                described(value));
}

bool checkIndex(std::string_view object, std::string_view key, const Value& value, std::uint64_t highest,
                DiagnosticErrorPtr* error) {
  if (isInteger(value) && !isNegative(value) && toUnsigned(&value) <= highest) return true;
  const CaptureErrorCode code = isInteger(value) ? CaptureErrorCode::kOutOfRange : CaptureErrorCode::kWrongType;
  return refuse(error, code, "%@: %@ must be an integer from 0 to %@, not %@.", object, key, highest, described(value));
}

bool checkRate(std::string_view object, std::string_view key, const Value& value, double highest,
               DiagnosticErrorPtr* error) {
  const bool isNumber = value.isNumber() && value.boolean() == nullptr;
  const double rate = toDouble(&value);
  if (isNumber && rate > 0 && rate <= highest) return true;
  const CaptureErrorCode code = isNumber ? CaptureErrorCode::kOutOfRange : CaptureErrorCode::kWrongType;
  return refuse(error, code, "%@: %@ must be a number above 0 and at most %@, not %@.", object, key, highest,
                described(value));
}

bool checkSlaveConfiguration(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  const Dictionary* entries = value.dictionary();
  if (entries == nullptr) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: a slave configuration must be a dictionary, not %@.",
                  object, described(value));
  }
  for (const std::string_view key : kSlaveSwitches) {
    const Value* entry = entries->find(key);
    if (entry == nullptr) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: a slave configuration must have %@.", object, key);
    }
    if (!checkBoolean(object, key, *entry, error)) return false;
  }
  const Value* ratio = entries->find(capture_key::MasterToSlaveFrameRateRatio);
  if (ratio == nullptr || !isInteger(*ratio) || isNegative(*ratio) || toUnsigned(ratio) == 0) {
    const bool wrongType = ratio != nullptr && !isInteger(*ratio);
    return refuse(error, wrongType ? CaptureErrorCode::kWrongType : CaptureErrorCode::kOutOfRange,
                  "%@: a slave configuration must have %@, an integer above 0.", object,
                  capture_key::MasterToSlaveFrameRateRatio);
  }
  for (const auto& [key, entry] : *entries) {
    if (key == capture_key::MasterToSlaveFrameRateRatio) continue;
    if (std::ranges::find(kSlaveSwitches, key) != kSlaveSwitches.end()) continue;
    return refuse(error, CaptureErrorCode::kOutOfRange, "%@: a slave configuration has no entry %@.", object, key);
  }
  return true;
}

}  // namespace quazor
