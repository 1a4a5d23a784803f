#include "backends/linux/probe/probe_media.h"

#include "backends/linux/binding/media_bus_codes.h"
#include "backends/linux/media/subdevice.h"
#include "backends/linux/video/v4l2_device.h"
#include "base/text/utf8.h"
#include "contract/message_format.h"

#include <algorithm>
#include <map>
#include <optional>
#include <tuple>
#include <utility>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// Links from the sensor to the video node.
using Path = std::vector<const MediaLink*>;

constexpr std::size_t kMaxPaths = 1000;
// The links at which the search looks: it could try each order of many entities.
constexpr std::size_t kMaxSteps = 10'000'000;
constexpr std::size_t kMaxPathLength = 100;  // in links

// All paths to an entity over links between sub-devices, set or not.
class PathFinder {
 public:
  explicit PathFinder(const MediaGraph& graph) : graph_(graph) {}

  std::vector<Path> pathsTo(const MediaEntity& camera) {
    extend(camera);
    for (Path& path : found_) std::ranges::reverse(path);
    return std::move(found_);
  }

 private:
  void extend(const MediaEntity& entity) {
    const auto isSink = [](const MediaPad& pad) { return !pad.isSource; };
    if (entity.function == MEDIA_ENT_F_CAM_SENSOR || std::ranges::none_of(entity.pads, isSink)) {
      if (!path_.empty()) found_.push_back(path_);
      return;
    }
    for (const MediaLink& link : graph_.links()) {
      if (++steps_ > kMaxSteps) return;
      const MediaEntity* const source = link.sink.entity == entity.id ? graph_.entity(link.source.entity) : nullptr;
      if (source == nullptr || !source->isSubdevice || isVisited(*source)) continue;
      if (found_.size() >= kMaxPaths || path_.size() >= kMaxPathLength) return;
      path_.push_back(&link);
      extend(*source);
      path_.pop_back();
    }
  }

  bool isVisited(const MediaEntity& entity) const {
    return std::ranges::any_of(path_, [&](const MediaLink* link) { return link->sink.entity == entity.id; });
  }

  const MediaGraph& graph_;
  Path path_;
  std::vector<Path> found_;
  std::size_t steps_ = 0;
};

// Prepares one path: which links have to be set, and which formats.
class PathPlan {
 public:
  PathPlan(const std::shared_ptr<V4l2Api>& kernel, const MediaGraph& graph, const Path& path)
      : kernel_(kernel), graph_(graph), path_(path) {}

  // Returns false and the reason if the path does not work out.
  bool make(const V4l2Device& node, ProbedPath* found, std::string* reason) {
    setLinks();
    const std::shared_ptr<Subdevice> sensor = opened(path_.front()->source.entity, reason);
    if (sensor == nullptr) return false;
    const std::uint32_t pad = path_.front()->source.pad;
    const std::optional<PadFormat> present = sensor->format(pad, nullptr);
    if (!present) return fail(reason, "the format of " + nameOf(path_.front()->source) + " cannot be read");
    std::vector<std::uint32_t> codes = sensor->codes(pad);
    codes.insert(codes.begin(), present->code);
    for (const std::uint32_t code : codes) {
      if (!tryFormat(*sensor, {code, present->width, present->height}, reason)) continue;
      const std::vector<VideoFormat> formats = node.formats(end_.code);
      if (formats.empty()) {
        fail(reason, "its node has no format for " + mediaBusCodeText(end_.code));
        continue;
      }
      if (!canBeBound(reason)) return false;
      found->format = formats.front();
      found->width = end_.width;
      found->height = end_.height;
      found->media.links = links_;
      found->media.pads = pads();
      found->hasRate = node.interval(nullptr).has_value() || setsRate(*sensor);
      found->text = text();
      return true;
    }
    return false;
  }

 private:
  static bool fail(std::string* reason, std::string text) {
    *reason = std::move(text);
    return false;
  }
  // False, and the reason, if a binding cannot name an entity or give a size of the path.
  bool canBeBound(std::string* reason) const {
    std::vector<std::string> names;
    for (const LinkBinding& link : links_) names.insert(names.end(), {link.source.entity, link.sink.entity});
    for (const auto& [place, format] : pads_) {
      names.push_back(graph_.nameOf(place).entity);
      if (std::min(format.width, format.height) == 0 || std::max(format.width, format.height) > kMaxSide) {
        return fail(reason, nameOf(place) + " has the format " + textOf(format) + ", which a binding cannot set");
      }
    }
    for (const std::string& name : names) {
      if (!bindableText(name)) return fail(reason, "a binding cannot name the entity \"" + name + "\"");
      const std::size_t count = graph_.named(name).size();
      if (count == 1) continue;
      return fail(reason,
                  formatMessage("%@ entities have the name \"%@\", so a binding cannot distinguish them", count, name));
    }
    return true;
  }
  std::vector<PadBinding> pads() const {
    std::vector<PadBinding> bindings;
    for (const auto& [place, format] : pads_) bindings.push_back({graph_.nameOf(place), format, {}, {}});
    return bindings;
  }
  std::string nameOf(PadPlace place) const { return "\"" + textOf(graph_.nameOf(place)) + "\""; }

  std::string text() const {
    std::string text = "\"" + graph_.nameOf(path_.front()->source).entity + "\"";
    for (const MediaLink* link : path_) {
      if (link != path_.back()) text += ", \"" + graph_.nameOf(link->sink).entity + "\"";
    }
    return text;
  }

  bool isOfPath(const MediaLink& link) const { return std::ranges::find(path_, &link) != path_.end(); }

  void setLink(const MediaLink& link, bool enabled) {
    LinkBinding wanted{graph_.nameOf(link.source), graph_.nameOf(link.sink), enabled};
    if (!link.isImmutable() && std::ranges::find(links_, wanted) == links_.end()) links_.push_back(std::move(wanted));
  }

  // Frames go nowhere else, and come from nowhere else: drivers check all that is linked.
  void setLinks() {
    for (const MediaLink* link : path_) {
      for (const MediaLink& other : graph_.links()) {
        const bool shares = other.sink == link->sink || other.source == link->source;
        if (shares && other.isEnabled() && !isOfPath(other)) setLink(other, false);
      }
      setLink(*link, true);
    }
  }

  std::shared_ptr<Subdevice> opened(std::uint32_t entity, std::string* reason) {
    std::shared_ptr<Subdevice>& known = opened_[entity];
    if (known != nullptr) return known;
    DiagnosticErrorPtr error;
    known = Subdevice::open(kernel_, *graph_.entity(entity), "its path", &error);
    if (known == nullptr) fail(reason, error->localizedDescription());
    return known;
  }

  // Tries a format of the sensor along the path, and on what the path cannot be separated from.
  bool tryFormat(const Subdevice& sensor, PadFormat format, std::string* reason) {
    pads_.clear();
    if (!trySetting(sensor, path_.front()->source, format, reason)) return false;
    for (std::size_t i = 0; i < path_.size(); ++i) {
      const MediaLink& link = *path_[i];
      for (const MediaLink& other : graph_.links()) {
        const bool isAlwaysLinked = other.source == link.source && other.isImmutable() && other.isEnabled();
        if (isAlwaysLinked && !isOfPath(other) && !tryBeside(other, format, reason)) return false;
      }
      if (i + 1 == path_.size()) break;
      const std::shared_ptr<Subdevice> next = opened(link.sink.entity, reason);
      if (next == nullptr || !trySetting(*next, link.sink, format, reason)) return false;
      const PadPlace source = path_[i + 1]->source;
      const std::optional<PadFormat> given = next->triedFormat(source.pad);
      if (!given) return fail(reason, "the format of " + nameOf(source) + " cannot be tried");
      format = *given;
      pads_.emplace_back(source, format);
    }
    end_ = format;
    return true;
  }

  bool tryBeside(const MediaLink& link, const PadFormat& format, std::string* reason) {
    if (!graph_.entity(link.sink.entity)->isSubdevice) {
      return fail(reason, "frames of " + nameOf(link.source) + " always go to " + nameOf(link.sink) +
                              ", too, and the format of that node is not part of a binding");
    }
    for (const MediaLink& other : graph_.links()) {
      if (other.source.entity == link.sink.entity && other.isEnabled()) setLink(other, false);
    }
    const std::shared_ptr<Subdevice> beside = opened(link.sink.entity, reason);
    return beside != nullptr && trySetting(*beside, link.sink, format, reason);
  }

  bool trySetting(const Subdevice& subdevice, PadPlace place, const PadFormat& format, std::string* reason) {
    if (subdevice.tryFormat(place.pad, format) != format) {
      return fail(reason, nameOf(place) + " does not take " + textOf(format));
    }
    pads_.emplace_back(place, format);
    return true;
  }

  static bool setsRate(const Subdevice& sensor) {
    constexpr std::uint32_t kNeeded[] = {V4L2_CID_VBLANK, V4L2_CID_HBLANK, V4L2_CID_PIXEL_RATE};
    return std::ranges::all_of(kNeeded, [&](auto id) { return sensor.device()->controlOfId(id) != nullptr; });
  }

  const std::shared_ptr<V4l2Api>& kernel_;
  const MediaGraph& graph_;
  const Path& path_;
  std::vector<LinkBinding> links_;
  std::vector<std::pair<PadPlace, PadFormat>> pads_;
  std::map<std::uint32_t, std::shared_ptr<Subdevice>> opened_;
  PadFormat end_;
};

// The number of links to set, and the length.
std::tuple<std::ptrdiff_t, std::size_t> costOf(const Path& path) {
  return {std::ranges::count_if(path, [](const MediaLink* link) { return !link->isEnabled(); }), path.size()};
}

MediaDeviceMatch matchOf(const MediaDeviceInfo& info) {
  return {bindableText(info.driver), bindableText(info.model), bindableText(info.busInfo)};
}

}  // namespace

std::optional<std::string> bindableText(const std::string& text) {
  return text.empty() || findInvalidUtf8(text) ? std::nullopt : std::optional(text);
}

Json mediaEntry(const MediaBinding& media) {
  Json device = Json::object();
  if (media.device.driver) device["driver"] = *media.device.driver;
  if (media.device.model) device["model"] = *media.device.model;
  if (media.device.busInfo) device["busInfo"] = *media.device.busInfo;
  Json links = Json::array();
  for (const LinkBinding& link : media.links) {
    Json entry = {{"source", textOf(link.source)}, {"sink", textOf(link.sink)}};
    if (!link.enabled) entry["enabled"] = false;
    links.push_back(std::move(entry));
  }
  Json pads = Json::array();
  for (const PadBinding& pad : media.pads) {
    if (!pad.format) continue;
    pads.push_back({{"pad", textOf(pad.pad)},
                    {"format", mediaBusCodeText(pad.format->code)},
                    {"size", {{"width", pad.format->width}, {"height", pad.format->height}}}});
  }
  Json entry = {{"device", std::move(device)}};
  if (!links.empty()) entry["links"] = std::move(links);
  entry["pads"] = std::move(pads);
  return entry;
}

MediaProbe::MediaProbe(std::shared_ptr<V4l2Api> kernel, const DeviceRoots& roots) : kernel_(std::move(kernel)) {
  for (const MediaDeviceInfo& info : mediaDevices(kernel_, roots)) {
    if (info.problem != nullptr) continue;
    if (auto device = MediaDevice::inspect(kernel_, roots, info.path, nullptr)) {
      controllers_.push_back({info, std::move(device)});
    }
  }
}

const MediaProbe::Controller* MediaProbe::controllerOf(const V4l2DeviceInfo& node) const {
  const auto found = std::ranges::find_if(
      controllers_, [&node](const Controller& one) { return one.device->graph().entityOfNode(node.path) != nullptr; });
  return found == controllers_.end() ? nullptr : &*found;
}

bool MediaProbe::isBehindLinks(const V4l2DeviceInfo& node) const {
  const Controller* const controller = controllerOf(node);
  if (controller == nullptr) return false;
  const MediaGraph& graph = controller->device->graph();
  return std::ranges::any_of(graph.links(), [&](const MediaLink& link) {
    return link.sink.entity == graph.entityOfNode(node.path)->id && graph.entity(link.source.entity)->isSubdevice;
  });
}

std::optional<ProbedPath> MediaProbe::pathTo(const V4l2DeviceInfo& node, std::string* reason) const {
  const Controller& controller = *controllerOf(node);
  const MediaGraph& graph = controller.device->graph();
  std::vector<Path> paths = PathFinder(graph).pathsTo(*graph.entityOfNode(node.path));
  std::ranges::stable_sort(paths, {}, costOf);
  *reason = "no sensor is upstream of it";
  DiagnosticErrorPtr error;
  const auto opened = V4l2Device::open(kernel_, node, &error);
  if (opened == nullptr) *reason = error->localizedDescription();
  for (const Path& path : paths) {
    PathPlan plan(kernel_, graph, path);
    ProbedPath found;
    if (opened == nullptr || !plan.make(*opened, &found, reason)) continue;
    found.media.device = matchOf(controller.info);
    return found;
  }
  return std::nullopt;
}

}  // namespace quazor
