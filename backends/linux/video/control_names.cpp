#include "backends/linux/video/control_names.h"

#include <linux/videodev2.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <system_error>

namespace quazor {
namespace {

struct RenamedControl {
  std::uint32_t id = 0;
  std::string_view before;  // Linux 5.14
  std::string_view since;
};

constexpr std::array kRenamed{
    RenamedControl{V4L2_CID_HUE_AUTO, "Hue, Auto", "Hue, Automatic"},
    RenamedControl{V4L2_CID_AUTO_WHITE_BALANCE, "White Balance Temperature, Auto", "White Balance, Automatic"},
    RenamedControl{V4L2_CID_EXPOSURE_AUTO, "Exposure, Auto", "Auto Exposure"},
    RenamedControl{V4L2_CID_EXPOSURE_AUTO_PRIORITY, "Exposure, Auto Priority", "Exposure, Dynamic Framerate"},
    RenamedControl{V4L2_CID_EXPOSURE_ABSOLUTE, "Exposure (Absolute)", "Exposure Time, Absolute"},
    RenamedControl{V4L2_CID_FOCUS_AUTO, "Focus, Auto", "Focus, Automatic Continuous"},
    RenamedControl{V4L2_CID_FOCUS_ABSOLUTE, "Focus (absolute)", "Focus, Absolute"},
    RenamedControl{V4L2_CID_PAN_ABSOLUTE, "Pan (Absolute)", "Pan, Absolute"},
    RenamedControl{V4L2_CID_TILT_ABSOLUTE, "Tilt (Absolute)", "Tilt, Absolute"},
    RenamedControl{V4L2_CID_PAN_SPEED, "Pan (Speed)", "Pan, Speed"},
    RenamedControl{V4L2_CID_TILT_SPEED, "Tilt (Speed)", "Tilt, Speed"}};

}  // namespace

std::optional<std::uint32_t> controlIdOf(std::string_view name) {
  constexpr std::string_view kPrefix = "0x";
  if (name.starts_with(kPrefix)) {
    const std::string_view digits = name.substr(kPrefix.size());
    std::uint32_t id = 0;
    const auto [end, problem] = std::from_chars(digits.data(), digits.data() + digits.size(), id, 16);
    if (problem == std::errc() && end == digits.data() + digits.size()) return id;
    return std::nullopt;
  }
  const auto isNamed = [name](const RenamedControl& one) { return one.before == name || one.since == name; };
  const auto* const found = std::ranges::find_if(kRenamed, isNamed);
  return found == kRenamed.end() ? std::nullopt : std::optional(found->id);
}

}  // namespace quazor
