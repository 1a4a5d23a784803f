// Reads the media controllers of a binding file, and values that several parts of a binding have.
#pragma once

#include "backends/linux/binding/binding.h"
#include "base/json/json_cursor.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

inline constexpr std::size_t kMaxEntityLength = 63;  // without the null, in media_v2_entity

// All of these throw InputError: "PATH: ...".
MediaBinding readMedia(const JsonCursor& cursor);
// Refuses a camera's links that one of `others` on the same media controller sets the other way round.
void requireSameLinks(const JsonCursor& media, const CameraBinding& camera, const std::vector<CameraBinding>& others);
void readSize(const JsonCursor& size, std::uint32_t* width, std::uint32_t* height);
FrameInterval readInterval(const JsonCursor& cursor);
// A text that a driver reports in `longest` bytes; nothing if there is no such key.
std::optional<std::string> findDeviceText(const JsonCursor& cursor, std::string_view key, std::size_t longest);
// Returns the name of a control, which may have the name of an entity and ":" in front.
std::string readControlName(const std::string& name, const JsonCursor& cursor);

}  // namespace quazor
