// Codes of QZNimbeImageExperimentErrorDomain.
#pragma once

#include <cstdint>

namespace quazor::nimbe_image_error {

inline constexpr std::int64_t kNoRunLoop = 1;          // the thread has no run loop
inline constexpr std::int64_t kDisplayNotPowered = 2;  // or its power state is not known
inline constexpr std::int64_t kNoDevice = 3;           // no device, several devices, or one that cannot be opened
inline constexpr std::int64_t kPowerModeRefused = 4;
inline constexpr std::int64_t kStreamingModeRefused = 5;
inline constexpr std::int64_t kTimedOut = 6;

}  // namespace quazor::nimbe_image_error
