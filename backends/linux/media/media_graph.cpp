#include "backends/linux/media/media_graph.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <utility>

namespace quazor {
namespace {

// The same as fixedText(), for a field of a packed structure.
std::string nameIn(const media_v2_entity& entity) {
  const char* const end = std::find(std::begin(entity.name), std::prev(std::end(entity.name)), '\0');
  return {std::begin(entity.name), end};
}

}  // namespace

MediaGraph::MediaGraph(const MediaTopology& topology, const DeviceFileFinder& find) {
  for (const media_v2_entity& one : topology.entities) {
    if (entity(one.id) == nullptr) entities_.push_back({one.id, nameIn(one), one.function, {}, false, {}});
  }
  const auto found = [this](std::uint32_t id) { return std::ranges::find(entities_, id, &MediaEntity::id); };
  std::map<std::uint32_t, PadPlace> places;
  for (const media_v2_pad& pad : topology.pads) {
    const auto owner = found(pad.entity_id);
    if (owner == entities_.end() || !places.try_emplace(pad.id, PadPlace{pad.entity_id, pad.index}).second) continue;
    owner->pads.push_back({pad.id, pad.index, (pad.flags & MEDIA_PAD_FL_SOURCE) != 0});
  }
  struct DeviceFile {
    std::filesystem::path path;
    bool isSubdevice = false;
  };
  std::map<std::uint32_t, DeviceFile> files;
  for (const media_v2_interface& one : topology.interfaces) {
    if (std::filesystem::path file = find(one.devnode.major, one.devnode.minor); !file.empty()) {
      files[one.id] = {std::move(file), one.intf_type == MEDIA_INTF_T_V4L_SUBDEV};
    }
  }
  constexpr std::uint32_t kTypeMask = 0xfU << 28;
  constexpr std::uint32_t kInterfaceLink = 1U << 28;
  constexpr std::uint32_t kAncillaryLink = 2U << 28;
  for (const media_v2_link& link : topology.links) {
    const std::uint32_t type = link.flags & kTypeMask;
    const auto source = places.find(link.source_id);
    const auto sink = places.find(link.sink_id);
    if (type == 0 && source != places.end() && sink != places.end()) {
      links_.push_back({source->second, sink->second, link.flags});
    } else if (type == kInterfaceLink && files.contains(link.source_id)) {
      const auto owner = found(link.sink_id);
      if (owner == entities_.end()) continue;
      owner->node = files.at(link.source_id).path;
      owner->isSubdevice = files.at(link.source_id).isSubdevice;
    } else if (type == kAncillaryLink) {
      attached_.emplace_back(link.source_id, link.sink_id);
    }
  }
}

const MediaEntity* MediaGraph::entity(std::uint32_t id) const {
  const auto found = std::ranges::find(entities_, id, &MediaEntity::id);
  return found == entities_.end() ? nullptr : &*found;
}

const MediaEntity* MediaGraph::entityOfNode(const std::filesystem::path& node) const {
  const auto found = std::ranges::find(entities_, node, &MediaEntity::node);
  return found == entities_.end() || node.empty() ? nullptr : &*found;
}

const MediaLink* MediaGraph::link(PadPlace source, PadPlace sink) const {
  const auto found =
      std::ranges::find_if(links_, [&](const MediaLink& link) { return link.source == source && link.sink == sink; });
  return found == links_.end() ? nullptr : &*found;
}

std::vector<const MediaEntity*> MediaGraph::named(std::string_view name) const {
  std::vector<const MediaEntity*> found;
  for (const MediaEntity& one : entities_) {
    if (one.name == name) found.push_back(&one);
  }
  return found;
}

PadName MediaGraph::nameOf(PadPlace place) const {
  const MediaEntity* const owner = entity(place.entity);
  return {owner == nullptr ? std::to_string(place.entity) : owner->name, place.pad};
}

std::vector<const MediaEntity*> MediaGraph::upstreamOf(const MediaEntity& entity) const {
  std::vector<const MediaEntity*> found;
  const auto add = [&](std::uint32_t id) {
    const MediaEntity* const one = this->entity(id);
    if (one != nullptr && one != &entity && std::ranges::find(found, one) == found.end()) found.push_back(one);
  };
  const auto addSourcesOf = [&](std::uint32_t id) {
    for (const MediaLink& link : links_) {
      if (link.sink.entity == id && link.isEnabled()) add(link.source.entity);
    }
  };
  addSourcesOf(entity.id);
  for (std::size_t i = 0; i < found.size(); ++i) addSourcesOf(found[i]->id);
  const std::size_t onPath = found.size();
  for (std::size_t i = 0; i < onPath; ++i) {
    for (const auto& [owner, attached] : attached_) {
      if (owner == found[i]->id) add(attached);
    }
  }
  return found;
}

}  // namespace quazor
