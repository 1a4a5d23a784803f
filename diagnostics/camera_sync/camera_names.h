// The names of cameras in results.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The camera name of a port type (platform/capture_keys.h); nothing if it has none. Any thread.
std::optional<std::string_view> cameraNameForPortType(std::string_view portType);

// The key of a camera's quantity in measurements and results, for example BackWide.FrameOffset.
std::string cameraKey(std::string_view cameraName, std::string_view quantity);

// The quantities of a camera.
inline constexpr std::string_view kFrameOffsetQuantity = "FrameOffset";
inline constexpr std::string_view kFramesQuantity = "Frames";
inline constexpr std::string_view kTotalQuantity = "Total";

}  // namespace quazor
