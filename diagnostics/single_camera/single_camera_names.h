// The names of the measurements, which the results share, and the codes of the errors that all plug-ins share.
#pragma once

#include "contract/unit.h"

#include <cstdint>
#include <string_view>

namespace quazor::single_camera {

inline constexpr std::string_view kFrames = "Frames";
inline constexpr std::string_view kRequestedFrameRate = "RequestedFrameRate";
inline constexpr std::string_view kFrameRate = "FrameRate";
inline constexpr std::string_view kMissingFrames = "MissingFrames";
inline constexpr std::string_view kUntimedFrames = "UntimedFrames";
inline constexpr std::string_view kBackwardTimeStamps = "BackwardTimeStamps";
inline constexpr std::string_view kJitter = "Jitter";
inline constexpr std::string_view kSilenceAtStart = "SilenceAtStart";
inline constexpr std::string_view kSilenceAtEnd = "SilenceAtEnd";
// Of the auxiliary data: which camera was streamed.
inline constexpr std::string_view kCamera = "Camera";
// Followed by the name of one of the stream's error counters.
inline constexpr std::string_view kErrorsPrefix = "Errors.";

// Of QZErrorDomain.
inline constexpr std::int64_t kBadParameterValue = 5;
inline constexpr std::int64_t kMissingMeasurement = 6;

inline const QZUnit& framesPerSecond() { return QZUnit::unitWithSymbol("frames/s"); }
inline const QZUnit& milliseconds() { return QZUnit::unitWithSymbol("ms"); }

}  // namespace quazor::single_camera
