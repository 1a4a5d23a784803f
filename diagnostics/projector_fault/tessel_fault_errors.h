// The errors of a projector fault run and its teardown: kReportFailure in QZTelemonErrorDomain, all others in
// QZCapturePlugInErrorDomain.
#pragma once

#include <cstdint>

namespace quazor::tessel_fault_error {

inline constexpr std::int64_t kReportFailure = 100;
inline constexpr std::int64_t kDeviceFailure = 200;
inline constexpr std::int64_t kNoStream = 202;
inline constexpr std::int64_t kControlRefused = 203;
inline constexpr std::int64_t kStartRefused = 204;
inline constexpr std::int64_t kStopRefused = 205;
inline constexpr std::int64_t kBadFrame = 206;
inline constexpr std::int64_t kFrameRateRefused = 207;
inline constexpr std::int64_t kOutputRefused = 208;
inline constexpr std::int64_t kFormatRefused = 209;
inline constexpr std::int64_t kNoErrorCounters = 210;
inline constexpr std::int64_t kExposureRefused = 211;
inline constexpr std::int64_t kLightRefused = 212;
inline constexpr std::int64_t kUnlitForSafety = 213;

}  // namespace quazor::tessel_fault_error
