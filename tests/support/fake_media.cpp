// The media controllers and sub-devices of the fake kernel.
#include "tests/support/fake_media.h"

#include "tests/support/fake_v4l2_api.h"

#include <linux/v4l2-subdev.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>

namespace quazor {
namespace {

// The ids of a graph's objects.
constexpr std::uint32_t kFirstEntity = 1;
constexpr std::uint32_t kFirstInterface = 0x1000;
constexpr std::uint32_t kPadsOfEntity = 0x10000;

constexpr std::uint32_t entityId(std::uint32_t entity) { return kFirstEntity + entity; }
constexpr std::uint32_t padId(std::uint32_t entity, std::uint32_t pad) { return kPadsOfEntity * (entity + 1) + pad; }

// The error number of what has no room.
template <class Item>
int copyTo(std::uint64_t address, std::uint32_t room, const std::vector<Item>& items) {
  if (address == 0) return 0;
  if (room < items.size()) return ENOSPC;
  std::ranges::copy(items, reinterpret_cast<Item*>(address));
  return 0;
}

media_v2_entity entityOf(const FakeEntity& entity, std::uint32_t id) {
  media_v2_entity described{};
  described.id = id;
  described.function = entity.function;
  std::memcpy(described.name, entity.name.data(), std::min(entity.name.size(), sizeof described.name));
  return described;
}

media_v2_link linkOf(std::uint32_t source, std::uint32_t sink, std::uint32_t flags) {
  media_v2_link link{};
  link.source_id = source;
  link.sink_id = sink;
  link.flags = flags;
  return link;
}

FakePad* padOf(FakeEntity& entity, std::uint32_t pad) { return pad < entity.pads.size() ? &entity.pads[pad] : nullptr; }

bool hasSink(const FakeEntity& entity) {
  return std::ranges::any_of(entity.pads, [](const FakePad& pad) { return !pad.isSource; });
}

// What the driver makes of a wanted format, and of the source pads of the entity.
void setFormat(FakeEntity& entity, std::uint32_t pad, PadFormat wanted) {
  FakePad& set = entity.pads[pad];
  if (!set.codes.empty() && std::ranges::find(set.codes, wanted.code) == set.codes.end()) wanted.code = set.codes[0];
  if (set.isSource && hasSink(entity)) {
    wanted.code = set.format.code;
    if (!entity.scales) wanted = set.format;
    if (entity.cropsSources) wanted = {set.format.code, set.crop.width, set.crop.height};
  }
  set.format = wanted;
  if (set.isSource) return;
  set.crop = {0, 0, wanted.width, wanted.height};
  for (FakePad& source : entity.pads) {
    if (!source.isSource) continue;
    if (entity.cropsSources) {
      source.format.code = entity.outputCode != 0 ? entity.outputCode : wanted.code;
      continue;
    }
    source.format = wanted;
    if (entity.outputCode != 0) source.format.code = entity.outputCode;
  }
}

}  // namespace

void FakeV4l2Api::makeDeviceFile(const std::string& name, std::uint32_t minor) {
  const std::filesystem::path folder = roots_.sysfs / "dev" / "char" / ("81:" + std::to_string(minor));
  std::filesystem::create_directories(folder);
  std::ofstream(folder / "uevent") << "MAJOR=81\nMINOR=" << minor << "\nDEVNAME=" << name << "\n";
  const std::lock_guard lock(mutex_);
  minors_[(roots_.dev / name).string()] = minor;
}

std::string FakeV4l2Api::addSubdevice(int number, FakeNode node) {
  const std::string name = "v4l-subdev" + std::to_string(number);
  makeDeviceFile(name, static_cast<std::uint32_t>(1000 + number));
  node.path = (roots_.dev / name).string();
  node.isSubdevice = true;
  const std::lock_guard lock(mutex_);
  return nodes_.insert_or_assign(node.path, node).first->first;
}

std::string FakeV4l2Api::addMedia(int number, FakeMedia media) {
  const std::string name = "media" + std::to_string(number);
  std::filesystem::create_directories(roots_.sysfs / "bus" / "media" / "devices" / name);
  FakeNode node;
  node.path = (roots_.dev / name).string();
  node.media = std::move(media);
  const std::lock_guard lock(mutex_);
  return nodes_.insert_or_assign(node.path, std::move(node)).first->first;
}

FakeV4l2Api::FakePlace FakeV4l2Api::placeOf(const std::string& path) {
  for (auto& [ignored, node] : nodes_) {
    if (!node.media) continue;
    const auto found = std::ranges::find(node.media->entities, path, &FakeEntity::node);
    if (found != node.media->entities.end()) return {&*node.media, &*found};
  }
  return {};
}

int FakeV4l2Api::mediaCall(FakeNode& node, unsigned long request, void* argument) {
  if (request == MEDIA_IOC_G_TOPOLOGY) return topology(*node.media, *static_cast<media_v2_topology*>(argument));
  if (request == MEDIA_IOC_SETUP_LINK) return setUpLink(node, *static_cast<const media_link_desc*>(argument));
  if (request != MEDIA_IOC_DEVICE_INFO) return ENOTTY;
  auto& info = *static_cast<media_device_info*>(argument);
  const auto copy = [](auto& field, const std::string& text) {
    std::memcpy(field, text.data(), std::min(text.size(), sizeof field));
  };
  copy(info.driver, node.media->driver);
  copy(info.model, node.media->model);
  copy(info.bus_info, node.media->bus);
  return 0;
}

int FakeV4l2Api::topology(const FakeMedia& media, media_v2_topology& asked) const {
  MediaTopology told;
  for (std::uint32_t i = 0; i < media.entities.size(); ++i) {
    const FakeEntity& entity = media.entities[i];
    told.entities.push_back(entityOf(entity, entityId(i)));
    for (std::uint32_t pad = 0; pad < entity.pads.size(); ++pad) {
      media_v2_pad described{};
      described.id = padId(i, pad);
      described.entity_id = entityId(i);
      described.index = pad;
      described.flags = entity.pads[pad].isSource ? MEDIA_PAD_FL_SOURCE : MEDIA_PAD_FL_SINK;
      told.pads.push_back(described);
    }
    if (entity.node.empty()) continue;
    media_v2_interface interface {};
    interface.id = kFirstInterface + i;
    interface.intf_type = nodes_.at(entity.node).isSubdevice ? MEDIA_INTF_T_V4L_SUBDEV : MEDIA_INTF_T_V4L_VIDEO;
    interface.devnode.major = 81;
    interface.devnode.minor = minors_.at(entity.node);
    told.interfaces.push_back(interface);
    told.links.push_back(linkOf(interface.id, entityId(i), MEDIA_LNK_FL_INTERFACE_LINK | MEDIA_LNK_FL_ENABLED));
  }
  for (const FakeLink& link : media.links) {
    told.links.push_back(linkOf(padId(link.source, link.sourcePad), padId(link.sink, link.sinkPad), link.flags));
  }
  for (const auto& [owner, attached] : media.ancillary) {
    told.links.push_back(linkOf(entityId(owner), entityId(attached), MEDIA_LNK_FL_ANCILLARY_LINK));
  }
  asked.topology_version = media.version;
  const int problems[] = {copyTo(asked.ptr_entities, asked.num_entities, told.entities),
                          copyTo(asked.ptr_interfaces, asked.num_interfaces, told.interfaces),
                          copyTo(asked.ptr_pads, asked.num_pads, told.pads),
                          copyTo(asked.ptr_links, asked.num_links, told.links)};
  asked.num_entities = static_cast<std::uint32_t>(told.entities.size());
  asked.num_interfaces = static_cast<std::uint32_t>(told.interfaces.size());
  asked.num_pads = static_cast<std::uint32_t>(told.pads.size());
  asked.num_links = static_cast<std::uint32_t>(told.links.size());
  return *std::ranges::max_element(problems);
}

int FakeV4l2Api::setUpLink(FakeNode& node, const media_link_desc& wanted) {
  FakeMedia& media = *node.media;
  const auto isMeant = [&wanted](const FakeLink& link) {
    return entityId(link.source) == wanted.source.entity && link.sourcePad == wanted.source.index &&
           entityId(link.sink) == wanted.sink.entity && link.sinkPad == wanted.sink.index;
  };
  const auto link = std::ranges::find_if(media.links, isMeant);
  if (link == media.links.end()) return EINVAL;
  const std::uint32_t changed = link->flags ^ wanted.flags;
  const std::uint32_t enabled = MEDIA_LNK_FL_ENABLED;
  if (changed == 0) return 0;
  if (changed != enabled || (link->flags & MEDIA_LNK_FL_IMMUTABLE) != 0) return EINVAL;
  const bool isStreaming = std::ranges::any_of(
      media.entities, [&](const FakeEntity& one) { return !one.node.empty() && nodes_.at(one.node).streaming; });
  if (isStreaming) return EBUSY;
  link->flags = wanted.flags;
  ++media.version;
  node.history.push_back(media.entities[link->source].name + " -> " + media.entities[link->sink].name +
                         ((wanted.flags & enabled) != 0 ? " on" : " off"));
  return 0;
}

int FakeV4l2Api::subdeviceCall(FakeNode& node, int descriptor, unsigned long request, void* argument) {
  FakeEntity* const entity = placeOf(node.path).entity;
  if (entity == nullptr) return ENOTTY;
  switch (request) {
    case VIDIOC_SUBDEV_G_FMT:
    case VIDIOC_SUBDEV_S_FMT:
      return padFormat(node, *entity, descriptor, request == VIDIOC_SUBDEV_S_FMT,
                       *static_cast<v4l2_subdev_format*>(argument));
    case VIDIOC_SUBDEV_G_SELECTION:
    case VIDIOC_SUBDEV_S_SELECTION: {
      auto& selection = *static_cast<v4l2_subdev_selection*>(argument);
      FakePad* const pad = padOf(*entity, selection.pad);
      if (pad == nullptr || (pad->isSource && !entity->cropsSources) || selection.target != V4L2_SEL_TGT_CROP)
        return EINVAL;
      if (request == VIDIOC_SUBDEV_S_SELECTION) {
        const FrameArea sinkCrop = entity->pads[0].crop;
        const std::uint32_t width = pad->isSource ? sinkCrop.width : pad->format.width;
        const std::uint32_t height = pad->isSource ? sinkCrop.height : pad->format.height;
        pad->crop = {static_cast<std::uint32_t>(selection.r.left), static_cast<std::uint32_t>(selection.r.top),
                     std::min(selection.r.width, width), std::min(selection.r.height, height)};
        if (pad->isSource) pad->format = {pad->format.code, pad->crop.width, pad->crop.height};
        node.history.emplace_back("crop");
      }
      selection.r = {static_cast<std::int32_t>(pad->crop.left), static_cast<std::int32_t>(pad->crop.top),
                     pad->crop.width, pad->crop.height};
      return 0;
    }
    case VIDIOC_SUBDEV_S_FRAME_INTERVAL: {
      auto& wanted = *static_cast<v4l2_subdev_frame_interval*>(argument);
      FakePad* const pad = padOf(*entity, wanted.pad);
      if (!entity->hasIntervals) return ENOTTY;
      if (pad == nullptr) return EINVAL;
      if (wanted.interval.denominator <= 60) pad->interval = {wanted.interval.numerator, wanted.interval.denominator};
      wanted.interval = {pad->interval.numerator, pad->interval.denominator};
      return 0;
    }
    case VIDIOC_SUBDEV_ENUM_MBUS_CODE: {
      auto& entry = *static_cast<v4l2_subdev_mbus_code_enum*>(argument);
      const FakePad* const pad = padOf(*entity, entry.pad);
      if (pad == nullptr || entry.index >= pad->codes.size()) return EINVAL;
      entry.code = pad->codes[entry.index];
      return 0;
    }
    default: return ENOTTY;
  }
}

int FakeV4l2Api::padFormat(FakeNode& node, FakeEntity& entity, int descriptor, bool sets, v4l2_subdev_format& format) {
  if (padOf(entity, format.pad) == nullptr) return EINVAL;
  FakeEntity* subject = &entity;
  if (format.which == V4L2_SUBDEV_FORMAT_TRY) subject = &tried_.try_emplace(descriptor, entity).first->second;
  if (sets) {
    setFormat(*subject, format.pad, {format.format.code, format.format.width, format.format.height});
    if (subject == &entity) node.history.push_back("format of pad " + std::to_string(format.pad));
  }
  const PadFormat& present = subject->pads[format.pad].format;
  format.format.code = present.code;
  format.format.width = present.width;
  format.format.height = present.height;
  return 0;
}

// As the kernel checks it: the pads at both ends of each enabled link have one format, up to the sensor.
int FakeV4l2Api::streamProblem(const FakeNode& camera) {
  const auto [media, entity] = placeOf(camera.path);
  if (media == nullptr || entity->pads.empty()) return 0;
  std::vector<const FakeEntity*> path{entity};
  for (std::size_t i = 0; i < path.size(); ++i) {
    if (!hasSink(*path[i])) continue;
    bool hasSource = false;
    for (const FakeLink& link : media->links) {
      if (&media->entities[link.sink] != path[i] || (link.flags & MEDIA_LNK_FL_ENABLED) == 0) continue;
      const FakeEntity& source = media->entities[link.source];
      const PadFormat& given = source.pads[link.sourcePad].format;
      const bool isNode = i == 0;
      if (isNode && (given.width != camera.format.width || given.height != camera.format.height)) return EPIPE;
      if (!isNode && given != path[i]->pads[link.sinkPad].format) return EPIPE;
      hasSource = true;
      path.push_back(&source);
    }
    if (!hasSource) return ENOLINK;
  }
  return 0;
}

}  // namespace quazor
