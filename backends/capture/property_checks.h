// Checks that the capture objects share. Each is true, or false with the refusal told. `object` names the object whose
// property it is.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/capture/property_table.h"
#include "contract/value.h"

#include <cstdint>
#include <string>
#include <string_view>

namespace quazor {

// A value as a message tells it: "the number 20", "the string abc", "a dictionary".
std::string described(const Value& value);

// The object has the property.
bool checkKnown(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse);
// The object has the property, and it can be set.
bool checkWritable(CaptureObjectKind kind, std::string_view object, std::string_view key, const Refuser& refuse);
// The value is a boolean.
bool checkBoolean(std::string_view object, std::string_view key, const Value& value, const Refuser& refuse);
// The value is an integer, signed or not, of 0 to `highest`.
bool checkIndex(std::string_view object, std::string_view key, const Value& value, std::uint64_t highest,
                const Refuser& refuse);
// The value is a number above 0 and at most `highest`.
bool checkRate(std::string_view object, std::string_view key, const Value& value, double highest,
               const Refuser& refuse);
// The value is a configuration of a slave: a dictionary of StreamingOutputsEnabled, FrameSkippingEnabled,
// TimeMachineEnabled (booleans) and MasterToSlaveFrameRateRatio (an integer above 0), all four and no others, and the
// camera supports it.
bool checkSlaveConfiguration(std::string_view object, const CameraInfo& camera, const Value& value,
                             const Refuser& refuse);

}  // namespace quazor
