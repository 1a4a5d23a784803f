#include "backends/linux/binding/binding_media.h"

#include "backends/linux/binding/media_bus_codes.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <system_error>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint64_t kMaxSide = 65536;
constexpr std::size_t kMaxControlNameLength = 31;  // without the null; v4l2_query_ext_ctrl has 32 bytes
constexpr std::size_t kMaxMediaDriverLength = 15;  // without the null, in media_device_info
constexpr std::size_t kMaxModelLength = 31;
constexpr std::size_t kMaxMediaBusInfoLength = 31;

MediaDeviceMatch readDevice(const JsonCursor& cursor) {
  cursor.allowKeys({"driver", "model", "busInfo"});
  MediaDeviceMatch match{findDeviceText(cursor, "driver", kMaxMediaDriverLength),
                         findDeviceText(cursor, "model", kMaxModelLength),
                         findDeviceText(cursor, "busInfo", kMaxMediaBusInfoLength)};
  if (!match.driver && !match.model && !match.busInfo) {
    cursor.fail(
        "give at least one of \"driver\", \"model\" and \"busInfo\"; 'quazor phone probe' shows them. The number of a "
        "media device changes from boot to boot.");
  }
  return match;
}

std::string readEntity(const JsonCursor& cursor) {
  std::string entity = cursor.text();
  if (entity.size() <= kMaxEntityLength) return entity;
  cursor.fail("the name of an entity has at most " + std::to_string(kMaxEntityLength) + " characters.");
}

// The name of an entity may contain colons.
PadName readPadName(const JsonCursor& cursor) {
  const std::string text = cursor.text();
  const std::size_t colon = text.rfind(':');
  std::uint16_t pad = 0;
  const char* const end = text.data() + text.size();
  const auto [parsed, problem] = std::from_chars(text.data() + std::min(colon + 1, text.size()), end, pad);
  const bool isPad =
      colon != std::string::npos && colon > 0 && colon <= kMaxEntityLength && problem == std::errc() && parsed == end;
  if (!isPad) cursor.fail("must be an entity and the number of its pad, such as \"imx219 4-0010:0\".");
  return {text.substr(0, colon), pad};
}

LinkBinding readLink(const JsonCursor& cursor) {
  cursor.allowKeys({"source", "sink", "enabled"});
  LinkBinding link{readPadName(cursor.at("source")), readPadName(cursor.at("sink"))};
  if (const auto enabled = cursor.find("enabled")) link.enabled = enabled->boolean();
  return link;
}

PadFormat readPadFormat(const JsonCursor& cursor) {
  const JsonCursor code = cursor.at("format");
  const std::optional<std::uint32_t> number = mediaBusCodeOf(code.text());
  if (!number) {
    code.fail(
        "must be the name of a media bus format of Linux, such as \"SRGGB10_1X10\", or its number, such as "
        "\"0x300F\".");
  }
  PadFormat format;
  format.code = *number;
  readSize(cursor.at("size"), &format.width, &format.height);
  return format;
}

FrameArea readArea(const JsonCursor& cursor) {
  cursor.allowKeys({"left", "top", "width", "height"});
  const auto side = [&cursor](std::string_view key, std::uint64_t minimum) {
    return static_cast<std::uint32_t>(cursor.at(key).integer(minimum, kMaxSide));
  };
  return {side("left", 0), side("top", 0), side("width", 1), side("height", 1)};
}

PadBinding readPad(const JsonCursor& cursor) {
  cursor.allowKeys({"pad", "format", "size", "crop", "interval"});
  PadBinding pad;
  pad.pad = readPadName(cursor.at("pad"));
  if (cursor.find("format") || cursor.find("size")) pad.format = readPadFormat(cursor);
  if (const auto crop = cursor.find("crop")) pad.crop = readArea(*crop);
  if (const auto interval = cursor.find("interval")) pad.interval = readInterval(*interval);
  if (!pad.format && !pad.crop && !pad.interval) {
    cursor.fail("give \"format\" and \"size\", \"crop\" or \"interval\" of the pad, or remove it.");
  }
  return pad;
}

}  // namespace

MediaBinding readMedia(const JsonCursor& cursor) {
  cursor.allowKeys({"device", "links", "pads", "subdevices"});
  MediaBinding media;
  media.device = readDevice(cursor.at("device"));
  if (const auto links = cursor.find("links")) {
    for (const JsonCursor& element : links->elements()) {
      LinkBinding link = readLink(element);
      const auto isSame = [&link](const LinkBinding& one) {
        return one.source == link.source && one.sink == link.sink;
      };
      if (std::ranges::any_of(media.links, isSame)) element.fail("the link is listed twice; remove one.");
      media.links.push_back(std::move(link));
    }
  }
  if (const auto pads = cursor.find("pads")) {
    for (const JsonCursor& element : pads->elements()) media.pads.push_back(readPad(element));
  }
  if (const auto subdevices = cursor.find("subdevices")) {
    for (const JsonCursor& element : subdevices->elements()) {
      std::string entity = readEntity(element);
      if (std::ranges::find(media.subdevices, entity) != media.subdevices.end()) {
        element.fail("the sub-device is listed twice; remove one.");
      }
      media.subdevices.push_back(std::move(entity));
    }
  }
  return media;
}

void requireSameLinks(const JsonCursor& media, const CameraBinding& camera, const std::vector<CameraBinding>& others) {
  for (std::size_t i = 0; i < camera.media->links.size(); ++i) {
    const LinkBinding& link = camera.media->links[i];
    for (const CameraBinding& other : others) {
      if (!other.media || other.media->device != camera.media->device) continue;
      const LinkBinding opposite{link.source, link.sink, !link.enabled};
      if (std::ranges::find(other.media->links, opposite) == other.media->links.end()) continue;
      media.at("links").elements().at(i).fail(
          inQuotes(other.port) + (link.enabled ? " disables" : " enables") +
          " this link; both cameras could not be used together. Set it alike, or use two bindings.");
    }
  }
}

void readSize(const JsonCursor& size, std::uint32_t* width, std::uint32_t* height) {
  size.allowKeys({"width", "height"});
  *width = static_cast<std::uint32_t>(size.at("width").integer(1, kMaxSide));
  *height = static_cast<std::uint32_t>(size.at("height").integer(1, kMaxSide));
}

FrameInterval readInterval(const JsonCursor& cursor) {
  cursor.allowKeys({"numerator", "denominator"});
  constexpr std::uint64_t kMax = std::numeric_limits<std::uint32_t>::max();
  return {static_cast<std::uint32_t>(cursor.at("numerator").integer(1, kMax)),
          static_cast<std::uint32_t>(cursor.at("denominator").integer(1, kMax))};
}

std::optional<std::string> findDeviceText(const JsonCursor& cursor, std::string_view key, std::size_t longest) {
  const std::optional<JsonCursor> found = cursor.find(key);
  if (!found) return std::nullopt;
  std::string text = found->text();
  if (text.size() > longest) {
    found->fail("a driver reports at most " + std::to_string(longest) + " characters here, and this has " +
                std::to_string(text.size()) + "; 'quazor phone probe' shows the reported text.");
  }
  return text;
}

std::string readControlName(const std::string& name, const JsonCursor& cursor) {
  const std::size_t colon = name.rfind(':');
  const std::string_view entity = std::string_view(name).substr(0, colon == std::string::npos ? 0 : colon);
  if (name.size() <= kMaxControlNameLength) return name;
  const bool isQualified = !entity.empty() && entity.size() <= kMaxEntityLength;
  if (isQualified && name.size() - entity.size() - 1 <= kMaxControlNameLength) return name;
  cursor.fail(inQuotes(name) + " is not a valid control name; names have at most " +
              std::to_string(kMaxControlNameLength) + " characters.");
}

}  // namespace quazor
