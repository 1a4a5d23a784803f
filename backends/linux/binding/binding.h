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

// Seconds per frame.
struct FrameInterval {
  std::uint32_t numerator = 0;
  std::uint32_t denominator = 1;

  double framesPerSecond() const { return static_cast<double>(denominator) / static_cast<double>(numerator); }
  friend bool operator==(const FrameInterval&, const FrameInterval&) = default;
};

// Selects a video node by what its driver reports (VIDIOC_QUERYCAP) and by its place in sysfs, because its number may
// change from boot to boot. A member without a value matches everything.
struct VideoNodeMatch {
  std::optional<std::string> driver;
  std::optional<std::string> card;
  std::optional<std::string> busInfo;
  std::optional<std::uint32_t>
      usbInterface{};                 // the number of the USB interface, for several cameras of one USB device
  std::optional<std::string> path{};  // of the device in sysfs, which changes if it is connected elsewhere
  std::optional<std::string> name{};  // of the node in sysfs, which is that of its entity in a media controller

  friend bool operator==(const VideoNodeMatch&, const VideoNodeMatch&) = default;
};

// A control of a camera, by the driver's name for it (VIDIOC_QUERY_EXT_CTRL), by its number, or after the name of its
// entity in a media controller ("imx219 4-0010:Exposure"), and a value.
struct ControlSetting {
  std::string control;
  std::int64_t value = 0;
};

// Part of a metadata buffer: an unsigned little-endian integer of `bytes` bytes, shifted right, then masked.
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

// What a frame and its metadata buffer have in common.
enum class MetadataPairing { kTimestamp, kSequence };

// The sources of a frame's metadata dictionary. If two give the same key, the later one in this order applies.
struct MetadataBinding {
  Dictionary constants;
  std::optional<VideoNodeMatch> node;      // a metadata node; its buffers are matched to frames by time stamp
  std::optional<std::string> format;       // of that node, as FormatBinding::fourcc; nothing: any
  std::optional<MetadataPairing> pairing;  // nothing: as the driver does it
  std::vector<MetadataField> fields;       // fields of those buffers; empty without a node
  std::vector<MetadataControl> controls;
};

// The controls of the light source. The settings in `off` are applied before the first use, at the end of every stream,
// and whenever the process ends, even by a crash.
struct ProjectorBinding {
  std::vector<ControlSetting> on;  // set in this order when a stream starts with a light source configured
  std::vector<ControlSetting> off;
  // Controls that are set to the numbers of InfraredLightSourceConfiguration.
  std::optional<std::string> modeControl;
  std::optional<std::string> patternControl;
  std::optional<std::string> currentControl;
};

// An error counter of a stream: a file with one number, or a control of the camera. Its value is relative to the start
// of the stream.
struct ErrorCounterBinding {
  std::string name;  // for example "I2CErrorCount"
  std::optional<std::filesystem::path> file;
  std::optional<std::string> control;
};

// The format, size and interval that a FormatIndex selects. The driver's own index is used where there is no such
// entry.
struct FormatBinding {
  std::uint32_t index = 0;
  std::string fourcc;  // four characters, for example "YUYV" or "Y16 ", and "-BE" for a big-endian format
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::optional<FrameInterval> interval;

  friend bool operator==(const FormatBinding&, const FormatBinding&) = default;
};

// Selects a media controller by what its driver reports (MEDIA_IOC_DEVICE_INFO). A member without a value matches
// everything.
struct MediaDeviceMatch {
  std::optional<std::string> driver;
  std::optional<std::string> model;
  std::optional<std::string> busInfo;

  friend bool operator==(const MediaDeviceMatch&, const MediaDeviceMatch&) = default;
};

// A pad of an entity: "imx219 4-0010:0".
struct PadName {
  std::string entity;
  std::uint32_t pad = 0;

  friend bool operator==(const PadName&, const PadName&) = default;
};
std::string textOf(const PadName& pad);

struct LinkBinding {
  PadName source;
  PadName sink;
  bool enabled = true;

  friend bool operator==(const LinkBinding&, const LinkBinding&) = default;
};

struct FrameArea {
  std::uint32_t left = 0;
  std::uint32_t top = 0;
  std::uint32_t width = 0;
  std::uint32_t height = 0;

  friend bool operator==(const FrameArea&, const FrameArea&) = default;
};

// The format of frames at a pad.
struct PadFormat {
  std::uint32_t code = 0;  // MEDIA_BUS_FMT_...
  std::uint32_t width = 0;
  std::uint32_t height = 0;

  friend bool operator==(const PadFormat&, const PadFormat&) = default;
};

// Settings of a pad, made in the order of the members.
struct PadBinding {
  PadName pad;
  std::optional<PadFormat> format;
  std::optional<FrameArea> crop;
  std::optional<FrameInterval> interval;
};

// The path of a camera's frames through a media controller.
struct MediaBinding {
  MediaDeviceMatch device;
  std::vector<LinkBinding> links;       // set in this order, before the pads
  std::vector<PadBinding> pads;         // set in this order
  std::vector<std::string> subdevices;  // entities whose controls the camera has, in addition to those on its path
};

struct CameraBinding {
  std::string port;  // platform/capture_keys.h, port_type
  VideoNodeMatch node;
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::vector<FormatBinding> formats;
  std::uint32_t buffers = 4;
  std::vector<ControlSetting> controls;  // set in this order when a user takes control of the stream
  MetadataBinding metadata;
  std::optional<ProjectorBinding> projector;
  std::vector<ErrorCounterBinding> errorCounters;
  std::optional<MediaBinding> media{};
};

// Cameras that can be synchronised, in a fixed order.
struct GroupBinding {
  std::vector<std::string> ports;
  std::string master;  // one of the ports
  std::string name{};  // the name that faults use
};

// Files that contain the values of report channels.
//
// `path` is absolute; its components may contain the placeholders {group}, {subgroup} and {name}, each at most once,
// which match any non-empty text, and *, which matches any text (name_pattern.h). A channel's group, subgroup and name
// are the matched texts, or else the members below. Numbers known not to be counters (gauges.h) are skipped.
struct CounterFilesBinding {
  std::string path;
  std::optional<std::string> group;
  std::optional<std::string> subgroup;
  std::optional<std::string> name;
  // For files with lines "KEY NUMBER": the key, or "{name}" for one channel per key. Nothing: the file is one number.
  std::optional<std::string> key;
};

// Tracepoints to count (perf_event_open), including those of kprobes that are defined in tracefs.
struct TracepointBinding {
  std::string system;                   // for example "v4l2"; * matches any text
  std::string event;                    // for example "v4l2_dqbuf"; * matches any text
  std::optional<std::string> group;     // default: "tracepoints"
  std::optional<std::string> subgroup;  // default: the system
  std::optional<std::string> name;      // default: the event
};

struct DisplayBinding {
  std::string connector;  // for example "Virtual-1", without the number of the card
};

struct Binding {
  std::string title;
  std::vector<CameraBinding> cameras;
  std::vector<GroupBinding> groups;
  std::vector<CounterFilesBinding> counterFiles;
  std::vector<TracepointBinding> tracepoints;
  std::optional<DisplayBinding> display;  // nothing: the first connected connector
  // The faults to inject. They select cameras by port and HID devices by the name that the device reports.
  std::vector<Fault> faults;
};

// Reads a binding file (the format is described in data/bindings/binding.schema.json), without its key `absent`, which
// the host reads. Throws InputError with one sentence that contains the file, the place and the expectation.
Binding readBinding(const std::filesystem::path& file);

}  // namespace quazor
