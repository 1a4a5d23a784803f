// MediaGraph: the entities of a media controller, their pads and the links between them.
#pragma once

#include "backends/linux/binding/binding.h"

#include <linux/media.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

struct MediaPad {
  std::uint32_t id = 0;
  std::uint32_t index = 0;
  bool isSource = false;
};

struct MediaEntity {
  std::uint32_t id = 0;
  std::string name;
  std::uint32_t function = 0;  // MEDIA_ENT_F_...
  std::filesystem::path node;  // its device file; empty if it has none
  bool isSubdevice = false;    // and that file is one of a sub-device, not a video node
  std::vector<MediaPad> pads;
};

struct PadPlace {
  std::uint32_t entity = 0;
  std::uint32_t pad = 0;

  friend bool operator==(const PadPlace&, const PadPlace&) = default;
};

struct MediaLink {
  PadPlace source;
  PadPlace sink;
  std::uint32_t flags = 0;  // MEDIA_LNK_FL_...

  bool isEnabled() const { return (flags & MEDIA_LNK_FL_ENABLED) != 0; }
  bool isImmutable() const { return (flags & MEDIA_LNK_FL_IMMUTABLE) != 0; }
};

// What the kernel tells (MEDIA_IOC_G_TOPOLOGY).
struct MediaTopology {
  std::vector<media_v2_entity> entities;
  std::vector<media_v2_interface> interfaces;
  std::vector<media_v2_pad> pads;
  std::vector<media_v2_link> links;
};

// The device file with these numbers; empty if there is none.
using DeviceFileFinder = std::function<std::filesystem::path(std::uint32_t major, std::uint32_t minor)>;

// Thread: one at a time; any for the const members.
class MediaGraph {
 public:
  MediaGraph() = default;
  // Leaves out what refers to something that is not there.
  MediaGraph(const MediaTopology& topology, const DeviceFileFinder& find);

  const std::vector<MediaEntity>& entities() const { return entities_; }
  const std::vector<MediaLink>& links() const { return links_; }

  // Null if there is none.
  const MediaEntity* entity(std::uint32_t id) const;
  const MediaEntity* entityOfNode(const std::filesystem::path& node) const;
  const MediaLink* link(PadPlace source, PadPlace sink) const;
  std::vector<const MediaEntity*> named(std::string_view name) const;
  // The name of a pad; the entity's number if it has no entity.
  PadName nameOf(PadPlace place) const;

  // The entities from which frames come to `entity` over enabled links, the nearest first, and then those that belong
  // to them without a link for frames, such as the flash and the lens of a sensor.
  std::vector<const MediaEntity*> upstreamOf(const MediaEntity& entity) const;

 private:
  std::vector<MediaEntity> entities_;
  std::vector<MediaLink> links_;
  std::vector<std::pair<std::uint32_t, std::uint32_t>> attached_;  // an entity, and one that belongs to it
};

}  // namespace quazor
