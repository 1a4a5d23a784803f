// Media controllers whose topology is arbitrary: entities without names or with equal ids, pads of nothing, links that
// dangle or run in circles. Graphs keep their rules, and a search for a camera's path ends.
#include "backends/linux/media/media_for_tests.h"
#include "backends/linux/media/media_pipeline.h"
#include "backends/linux/probe/probe_media.h"
#include "tests/fuzz/byte_input.h"
#include "tests/fuzz/fuzzing.h"
#include "tests/fuzz/hostile_kernel.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace quazor {
namespace {

constexpr std::uint32_t kFirstPad = 1000;
constexpr std::uint32_t kFirstInterface = 2000;

// An id that fits in most cases: one of `count` that begin with `first`.
std::uint32_t idFrom(ByteInput& input, std::uint32_t first, std::size_t count) {
  const std::uint8_t choice = input.byte();
  if (choice == 0xFF) return input.word();
  return first + static_cast<std::uint32_t>(choice % (count + 1));
}

constexpr const char* kNames[] = {"Sensor A", "Sensor B", "Converter", "Scaler", "Camera", "Flash", ""};

void name(media_v2_entity& entity, ByteInput& input) {
  const std::uint8_t choice = input.byte();
  if (choice < 0xF0) {
    std::strcpy(entity.name, kNames[choice % 7]);
  } else if (choice < 0xF8) {
    std::ranges::fill(entity.name, 'x');  // without an end
  } else {
    for (char& one : entity.name) one = static_cast<char>(input.byte());
  }
}

void addEntities(MediaTopology& topology, ByteInput& input) {
  constexpr std::uint32_t kFunctions[] = {MEDIA_ENT_F_CAM_SENSOR, MEDIA_ENT_F_PROC_VIDEO_SCALER, MEDIA_ENT_F_IO_V4L,
                                          MEDIA_ENT_F_FLASH, 0};
  const std::size_t count = input.byte() % 48;
  for (std::size_t i = 0; i < count; ++i) {
    media_v2_entity entity{};
    entity.id = input.byte() < 0xF0 ? static_cast<std::uint32_t>(i) : idFrom(input, 0, count);
    entity.function = kFunctions[input.byte() % 5];
    name(entity, input);
    topology.entities.push_back(entity);
  }
}

// The device files of the board and others.
void addInterfaces(MediaTopology& topology, ByteInput& input) {
  constexpr std::uint32_t kMinors[] = {0, 1000, 1001, 1002, 1003, 1004, 77};
  const std::size_t count = input.byte() % 48;
  for (std::size_t i = 0; i < count; ++i) {
    media_v2_interface interface {};
    interface.id = kFirstInterface + static_cast<std::uint32_t>(i);
    const std::uint32_t minor = kMinors[input.byte() % 7];
    interface.intf_type = minor == 0 ? MEDIA_INTF_T_V4L_VIDEO : MEDIA_INTF_T_V4L_SUBDEV;
    interface.devnode.major = 81;
    interface.devnode.minor = minor;
    topology.interfaces.push_back(interface);
    media_v2_link link{};
    link.source_id = interface.id;
    link.sink_id = idFrom(input, 0, topology.entities.size());
    link.flags = MEDIA_LNK_FL_INTERFACE_LINK | MEDIA_LNK_FL_ENABLED;
    topology.links.push_back(link);
  }
}

void addPads(MediaTopology& topology, ByteInput& input) {
  const std::size_t count = input.byte();
  for (std::size_t i = 0; i < count; ++i) {
    media_v2_pad pad{};
    const std::uint8_t choice = input.byte();
    pad.id = choice < 0xF0 ? kFirstPad + static_cast<std::uint32_t>(i) : idFrom(input, kFirstPad, count);
    pad.entity_id = idFrom(input, 0, topology.entities.size());
    pad.flags = (choice & 1) != 0 ? MEDIA_PAD_FL_SOURCE : MEDIA_PAD_FL_SINK;
    pad.index = choice / 2 % 4U;
    topology.pads.push_back(pad);
  }
}

void addLinks(MediaTopology& topology, ByteInput& input) {
  constexpr std::uint32_t kFlags[] = {0, MEDIA_LNK_FL_ENABLED, MEDIA_LNK_FL_ENABLED | MEDIA_LNK_FL_IMMUTABLE,
                                      MEDIA_LNK_FL_ANCILLARY_LINK | MEDIA_LNK_FL_ENABLED};
  const auto add = [&](std::uint32_t source, std::uint32_t sink, std::uint32_t flags) {
    media_v2_link link{};
    link.source_id = source;
    link.sink_id = sink;
    link.flags = flags;
    topology.links.push_back(link);
  };
  if (input.byte() % 8 == 7) {  // from each source to each sink
    for (const media_v2_pad& source : topology.pads) {
      for (const media_v2_pad& sink : topology.pads) {
        if (source.flags == MEDIA_PAD_FL_SOURCE && sink.flags == MEDIA_PAD_FL_SINK) add(source.id, sink.id, 0);
      }
    }
  }
  const std::size_t count = input.byte();
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint8_t choice = input.byte();
    const std::uint32_t flags = choice == 0xFF ? input.word() : kFlags[choice % 4];
    const std::uint32_t source = idFrom(input, kFirstPad, topology.pads.size());
    add(source, idFrom(input, kFirstPad, topology.pads.size()), flags);
  }
}

MediaTopology topologyFrom(ByteInput& input) {
  MediaTopology topology;
  addEntities(topology, input);
  addInterfaces(topology, input);
  addPads(topology, input);
  addLinks(topology, input);
  return topology;
}

// Links and pads that a binding may name, whether the topology has them or not.
MediaBinding bindingFrom(ByteInput& input, const MediaTopology& topology) {
  MediaBinding binding;
  binding.device.model = "Fake ISP";
  const auto padFrom = [&] { return PadName{kNames[input.byte() % 6], input.byte() % 5U}; };
  // The place of a pad of the topology, or another one.
  const auto placeFrom = [&](std::uint32_t id) {
    const auto pad = std::ranges::find_if(topology.pads, [id](const media_v2_pad& one) { return one.id == id; });
    if (pad == topology.pads.end()) return padFrom();
    const auto isOwner = [&](const media_v2_entity& one) { return one.id == pad->entity_id; };
    const auto owner = std::ranges::find_if(topology.entities, isOwner);
    if (owner == topology.entities.end()) return padFrom();
    return PadName{{owner->name, strnlen(owner->name, sizeof owner->name - 1)}, pad->index};
  };
  for (std::size_t i = input.byte() % 6; i > 0; --i) {
    const std::uint8_t choice = input.byte();
    LinkBinding link{{}, {}, choice % 2 == 0};
    if (topology.links.empty() || choice >= 0xC0) {
      link.source = padFrom();
      link.sink = padFrom();
    } else {
      const media_v2_link& known = topology.links.at(input.byte() % topology.links.size());
      link.source = placeFrom(known.source_id);
      link.sink = placeFrom(known.sink_id);
    }
    binding.links.push_back(std::move(link));
  }
  for (std::size_t i = input.byte() % 4; i > 0; --i) {
    const std::uint8_t choice = input.byte();
    PadBinding pad{padFrom(), {}, {}, {}};
    if ((choice & 1) != 0) pad.format = PadFormat{MEDIA_BUS_FMT_SBGGR8_1X8, 640, 480};
    if ((choice & 2) != 0) pad.crop = FrameArea{0, 0, 320, 240};
    if ((choice & 4) != 0) pad.interval = FrameInterval{1, 30};
    binding.pads.push_back(std::move(pad));
  }
  for (std::size_t i = input.byte() % 3; i > 0; --i) binding.subdevices.emplace_back(kNames[input.byte() % 7]);
  return binding;
}

// A path is set as its binding says, and again if another program has changed it.
void usePath(HostileKernel& kernel, const FakeBoard& board, const MediaBinding& binding) {
  MediaDevices devices(board.kernel, kernel.roots());
  DiagnosticErrorPtr error;
  const auto pipeline = MediaPipeline::open(devices, binding, "camera", board.camera, &error);
  require((pipeline == nullptr) == (error != nullptr), "a path that cannot be set has an error, and only that");
  if (pipeline == nullptr) return;
  if (kernel.topology && !kernel.topology->links.empty()) kernel.topology->links.pop_back();
  const bool isPrepared = pipeline->prepare(&error);
  require(isPrepared == (error == nullptr), "a path that cannot be set again has an error, and only that");
}

void requireGraph(const MediaGraph& graph) {
  std::set<std::uint32_t> ids;
  for (const MediaEntity& entity : graph.entities()) {
    require(ids.insert(entity.id).second, "an id is that of one entity");
    require(entity.name.size() < sizeof(media_v2_entity::name), "a name ends with its field");
    const std::vector<const MediaEntity*> upstream = graph.upstreamOf(entity);
    const std::set<const MediaEntity*> once(upstream.begin(), upstream.end());
    require(once.size() == upstream.size() && !once.contains(&entity), "what is upstream is there once");
  }
  for (const MediaLink& link : graph.links()) {
    for (const PadPlace& place : {link.source, link.sink}) {
      const MediaEntity* const owner = graph.entity(place.entity);
      require(owner != nullptr, "a link is one of entities");
      require(std::ranges::find(owner->pads, place.pad, &MediaPad::index) != owner->pads.end(), "and of their pads");
    }
  }
}

// The links at the end, of which the last one may have gone, are as they were.
void requireSame(const std::vector<media_v2_link>& after, const std::vector<media_v2_link>& before) {
  for (std::size_t i = 0; i < after.size(); ++i) require(after[i].flags == before[i].flags, "each link is set back");
}

// Which nodes of the probe come to a path, with what a binding needs.
void probe(const std::shared_ptr<V4l2Api>& api, const DeviceRoots& roots) {
  const MediaProbe probe(api, roots);
  for (const V4l2DeviceInfo& node : videoNodes(api, roots)) {
    if (node.problem != nullptr || !probe.isBehindLinks(node)) continue;
    std::string reason;
    if (const std::optional<ProbedPath> path = probe.pathTo(node, &reason)) {
      require(!path->text.empty() && !path->media.pads.empty(), "a path has pads to set");
    } else {
      require(!reason.empty(), "a node without a path has a reason");
    }
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  ByteInput input(data, size);
  ByteInput none(nullptr, 0);
  const bool isHostile = input.byte() % 2 == 1;  // otherwise the topology alone is arbitrary
  const auto kernel = std::make_shared<HostileKernel>(isHostile ? input : none);
  const FakeBoard board(kernel);
  const std::uint8_t choice = input.byte();
  if (choice % 4 != 3) kernel->topology = topologyFrom(input);
  const bool hasOwnPath = choice < 0x80;
  const MediaTopology told = kernel->topology.value_or(MediaTopology());
  const MediaBinding binding = hasOwnPath ? *FakeBoard::binding().media : bindingFrom(input, told);
  if (const auto device = MediaDevice::inspect(kernel, kernel->roots(), board.media, nullptr)) {
    requireGraph(device->graph());
  }
  probe(kernel, kernel->roots());
  usePath(*kernel, board, binding);
  require(kernel->calls() < 1'000'000, "a driver cannot keep the program busy");
  require(kernel->isIdle(), "nothing stays open");
  if (!isHostile) requireSame(kernel->topology.value_or(MediaTopology()).links, told.links);
  return 0;
}
