// Binding: the mapping of a Linux machine's devices to the parts of a phone.
#pragma once

#include "backends/faults/fault.h"
#include "contract/ordered_map.h"
#include "contract/value.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// Which video node: what its driver says of it (VIDIOC_QUERYCAP), never its number, which changes from boot to boot.
// What is not given matches everything.
struct VideoNodeMatch {
  std::optional<std::string> driver;
  std::optional<std::string> card;
  std::optional<std::string> busInfo;

  friend bool operator==(const VideoNodeMatch&, const VideoNodeMatch&) = default;
};

// A control of a video node, by the name that the driver gives it (VIDIOC_QUERY_EXT_CTRL), and a value for it.
struct ControlSetting {
  std::string control;
  std::int64_t value = 0;
};

// Part of a buffer of a metadata node: an unsigned little-endian integer of `bytes` bytes, shifted down, then masked.
struct MetadataField {
  std::string key;
  std::uint32_t offset = 0;
  std::uint32_t bytes = 1;  // 1, 2, 4 or 8
  std::uint32_t shift = 0;
  std::optional<std::uint64_t> mask;
};

// A control that is read for every frame.
struct MetadataControl {
  std::string key;
  std::string control;
};

// What a frame's metadata dictionary is made of; where two give the same key, the later of this order holds.
struct MetadataBinding {
  Dictionary constants;
  std::optional<VideoNodeMatch> node;  // a metadata node, whose buffers are paired with frames by time stamp
  std::vector<MetadataField> fields;   // of that node's buffers; empty without a node
  std::vector<MetadataControl> controls;
};

// How the light source is driven. Everything of `off` is set before the first use, at the end of every stream, and when
// the process ends in whatever way.
struct ProjectorBinding {
  std::vector<ControlSetting> on;  // in this order, when the stream starts with a light source configured
  std::vector<ControlSetting> off;
  // Controls that take the numbers of InfraredLightSourceConfiguration as they are.
  std::optional<std::string> modeControl;
  std::optional<std::string> patternControl;
  std::optional<std::string> currentControl;
};

// An error counter of a stream: a file with one number, or a control of the camera. Counts from the start of the
// stream.
struct ErrorCounterBinding {
  std::string name;  // as "I2CErrorCount"
  std::optional<std::filesystem::path> file;
  std::optional<std::string> control;
};

struct CameraBinding {
  std::string port;  // platform/capture_keys.h, port_type
  VideoNodeMatch node;
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t buffers = 4;
  std::vector<ControlSetting> controls;  // set, in this order, when control of the stream is taken
  MetadataBinding metadata;
  std::optional<ProjectorBinding> projector;
  std::vector<ErrorCounterBinding> errorCounters;
};

// Cameras that can run in lockstep, in a fixed order.
struct GroupBinding {
  std::vector<std::string> ports;
  std::string master;  // one of them
  std::string name{};  // by which faults select it
};

// Files whose numbers are report channels.
//
// `path` is absolute; its components may contain the placeholders {group}, {subgroup} and {name}, each at most once,
// which match any non-empty text, and *, which matches any text (name_pattern.h). A channel's group, subgroup and name
// are the matched texts, or else the members below. Numbers known not to be counters (gauges.h) are skipped.
struct CounterFilesBinding {
  std::string path;
  std::optional<std::string> group;
  std::optional<std::string> subgroup;
  std::optional<std::string> name;
  // For files of lines "KEY NUMBER": which key, or "{name}" for a channel of each. Nothing: the file is one number.
  std::optional<std::string> key;
};

// Tracepoints that are counted (perf_event_open), also those of kprobes that were defined in tracefs.
struct TracepointBinding {
  std::string system;                   // such as "v4l2"; * matches any text
  std::string event;                    // such as "v4l2_dqbuf"; * matches any text
  std::optional<std::string> group;     // default: "tracepoints"
  std::optional<std::string> subgroup;  // default: the system
  std::optional<std::string> name;      // default: the event
};

struct DisplayBinding {
  std::string connector;  // as "Virtual-1": without the number of the card
};

struct Binding {
  std::string title;
  std::vector<CameraBinding> cameras;
  std::vector<GroupBinding> groups;
  std::vector<CounterFilesBinding> counterFiles;
  std::vector<TracepointBinding> tracepoints;
  std::optional<DisplayBinding> display;  // nothing: the first connector that is connected
  // What is made to go wrong. Cameras are selected by their ports, HID devices by the names that they give themselves.
  std::vector<Fault> faults;
};

// Reads a binding file (data/bindings/binding.schema.json describes its form). Throws InputError: one sentence
// with the file, the place in it and what would be right.
Binding readBinding(const std::filesystem::path& file);

}  // namespace quazor
