#include "tests/boards/recorded_topology.h"

#include "backends/linux/binding/media_bus_codes.h"

#include <algorithm>
#include <fstream>
#include <optional>
#include <regex>
#include <stdexcept>
#include <utility>
#include <vector>

namespace quazor {
namespace {

struct RecordedLink {
  std::uint32_t source = 0;
  std::uint32_t sourcePad = 0;
  std::string sink;
  std::uint32_t sinkPad = 0;
  std::uint32_t flags = 0;
};

struct RecordedEntity {
  FakeEntity entity;
  std::string device;
  bool isNode = false;
  bool isSensor = false;
  std::string pixelFormat;  // of a node, and its size
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::vector<FakeControl> controls;
};

std::uint32_t numberIn(const std::ssub_match& text) { return static_cast<std::uint32_t>(std::stoul(text)); }

// Reads a file line by line.
class Reader {
 public:
  explicit Reader(const std::filesystem::path& file) : lines_(file) {
    if (!lines_) throw std::runtime_error(file.string() + " cannot be read");
    for (std::string line; std::getline(lines_, line);) take(line);
    if (entities.empty() || media.driver.empty()) throw std::runtime_error(file.string() + " is no topology");
  }

  FakeMedia media{{}, {}, {}, {}, {}};
  std::vector<RecordedEntity> entities;
  std::vector<RecordedLink> links;

 private:
  void take(const std::string& line) {
    static const std::regex kText(R"((driver|model|bus info) +(.+))");
    static const std::regex kEntity(R"(- entity \d+: (.+) \(\d+ pads\))");
    static const std::regex kType(R"( +type (Node|V4L2 subdev)( subtype (\w+))?)");
    static const std::regex kDevice(R"( +device node name /dev/(\S+))");
    static const std::regex kPixels(R"( +pixel formats (\w{4}) (\d+)x(\d+))");
    static const std::regex kControl(R"re( +control (0x\w+) "(.+)" (\d+) to (\d+), (\d+))re");
    static const std::regex kPad(R"( +pad\d+: (Sink|Source))");
    static const std::regex kFormat(R"( +\[fmt:(\w+)/(\d+)x(\d+)\])");
    static const std::regex kLink(R"re( +-> "(.+)":(\d+) \[([A-Z,]*)\])re");
    std::smatch found;
    if (std::regex_match(line, found, kText)) {
      (found[1] == "driver" ? media.driver : found[1] == "model" ? media.model : media.bus) = found[2];
    } else if (std::regex_match(line, found, kEntity)) {
      entities.emplace_back().entity.name = found[1];
    } else if (std::regex_match(line, found, kType)) {
      last().isNode = found[1] == "Node";
      last().isSensor = found[3] == "Sensor";
    } else if (std::regex_match(line, found, kDevice)) {
      last().device = found[1];
    } else if (std::regex_match(line, found, kPixels)) {
      last().pixelFormat = found[1];
      last().width = numberIn(found[2]);
      last().height = numberIn(found[3]);
    } else if (std::regex_match(line, found, kControl)) {
      const auto id = static_cast<std::uint32_t>(std::stoul(found[1], nullptr, 16));
      const std::uint32_t type = id == V4L2_CID_PIXEL_RATE ? V4L2_CTRL_TYPE_INTEGER64 : V4L2_CTRL_TYPE_INTEGER;
      last().controls.push_back({id, found[2], std::stoll(found[3]), std::stoll(found[4]), std::stoll(found[5]), type});
    } else if (std::regex_match(line, found, kPad)) {
      last().entity.pads.push_back(FakePad{found[1] == "Source", {}});
    } else if (std::regex_match(line, found, kFormat)) {
      FakePad& pad = last().entity.pads.back();
      const std::optional<std::uint32_t> code = mediaBusCodeOf(found.str(1));
      if (!code) throw std::runtime_error("no media bus format " + found.str(1));
      pad.format = {*code, numberIn(found[2]), numberIn(found[3])};
      pad.codes = {*code};
    } else if (std::regex_match(line, found, kLink)) {
      const std::string flags = found[3];
      const auto flag = [&flags](const char* name, std::uint32_t value) {
        return flags.find(name) == std::string::npos ? 0 : value;
      };
      links.push_back({static_cast<std::uint32_t>(entities.size() - 1),
                       static_cast<std::uint32_t>(last().entity.pads.size() - 1), found[1], numberIn(found[2]),
                       flag("ENABLED", MEDIA_LNK_FL_ENABLED) | flag("IMMUTABLE", MEDIA_LNK_FL_IMMUTABLE)});
    }
  }

  RecordedEntity& last() {
    if (entities.empty()) throw std::runtime_error("a line of an entity comes before the first entity");
    return entities.back();
  }

  std::ifstream lines_;
};

int numberOf(const std::string& device, const std::string& prefix) { return std::stoi(device.substr(prefix.size())); }

void addNode(FakeV4l2Api& kernel, const FakeMedia& media, RecordedEntity& recorded) {
  FakeNode node = fakeMultiplanarCamera("platform:" + media.driver);
  node.driver = media.driver;
  node.card = recorded.entity.name;
  node.hasIntervals = false;
  node.formats.clear();
  const auto code = [&recorded](std::size_t i) { return recorded.pixelFormat.empty() ? 'X' : recorded.pixelFormat[i]; };
  node.formats.push_back({fakeCode(code(0), code(1), code(2), code(3)),
                          recorded.pixelFormat,
                          {{recorded.width, recorded.height, {{1, 30}}}}});
  const int number = numberOf(recorded.device, "video");
  recorded.entity.node = kernel.add(number, std::move(node));
  std::ofstream(kernel.roots().sysfs / "class" / "video4linux" / recorded.device / "name")
      << recorded.entity.name << "\n";
}

}  // namespace

void addRecordedTopology(FakeV4l2Api& kernel, const std::filesystem::path& file) {
  Reader read(file);
  for (RecordedEntity& one : read.entities) {
    FakeEntity& entity = one.entity;
    const auto differs = [&](auto member) {
      return std::ranges::any_of(entity.pads, [&](const FakePad& pad) {
        return pad.format.width > 0 && entity.pads[0].format.*member != pad.format.*member;
      });
    };
    if (differs(&PadFormat::code)) {
      for (const FakePad& pad : entity.pads) {
        if (pad.isSource && pad.format.code != 0) entity.outputCode = pad.format.code;
      }
    }
    entity.cropsSources = entity.outputCode != 0;  // as the pixel-processing ISPs do that are recorded here
    entity.scales = differs(&PadFormat::width) || entity.outputCode != 0;
    for (FakePad& pad : entity.pads) {
      if (pad.format.width > 0) pad.format.width = pad.format.height = 16;  // until the binding sets it
    }
    entity.function = one.isSensor ? MEDIA_ENT_F_CAM_SENSOR : one.isNode ? MEDIA_ENT_F_IO_V4L : 0;
    entity.hasIntervals = one.isSensor;
    if (one.isNode) {
      addNode(kernel, read.media, one);
    } else {
      FakeNode node;
      node.controls = one.controls;
      entity.node = kernel.addSubdevice(numberOf(one.device, "v4l-subdev"), std::move(node));
    }
    read.media.entities.push_back(entity);
  }
  for (const RecordedLink& link : read.links) {
    const auto sink = std::ranges::find(read.media.entities, link.sink, &FakeEntity::name);
    if (sink == read.media.entities.end()) throw std::runtime_error("a link leads to no entity: " + link.sink);
    if (link.sinkPad >= sink->pads.size()) throw std::runtime_error("a link leads to no pad of " + link.sink);
    read.media.links.push_back({link.source, link.sourcePad,
                                static_cast<std::uint32_t>(sink - read.media.entities.begin()), link.sinkPad,
                                link.flags});
  }
  kernel.addMedia(0, std::move(read.media));
}

}  // namespace quazor
