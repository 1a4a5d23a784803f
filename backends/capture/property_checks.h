// Checks that the capture objects share. Each returns true, or stores the refusal and returns false. `object` is the
// name of the property's owner.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/capture/property_table.h"
#include "contract/value.h"

#include <cstdint>
#include <string>
#include <string_view>

namespace quazor {

// A value as described in messages: "the number 20", "the string abc", "a dictionary".
std::string described(const Value& value);

// True if the object has the property.
bool checkKnown(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse);
// True if the object has the property and it can be set.
bool checkWritable(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse);
// True if the value is a boolean.
bool checkBoolean(std::string_view object, std::string_view key, const Value& value, const Refuser& refuse);
// True if the value is a signed or unsigned integer from 0 to `highest`.
bool checkIndex(std::string_view object, std::string_view key, const Value& value, std::uint64_t highest,
                const Refuser& refuse);
// True if the value is a number above 0 and at most `highest`.
bool checkRate(std::string_view object, std::string_view key, const Value& value, double highest,
               const Refuser& refuse);
// True if the value is a configuration of a slave that the camera supports: a dictionary of exactly
// StreamingOutputsEnabled, FrameSkippingEnabled, TimeMachineEnabled (booleans) and MasterToSlaveFrameRateRatio (an
// integer above 0).
bool checkSlaveConfiguration(std::string_view object, const CameraInfo& camera, const Value& value,
                             const Refuser& refuse);

}  // namespace quazor
