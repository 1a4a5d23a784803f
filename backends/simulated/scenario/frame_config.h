// The frames and events of a camera in a scenario.
#pragma once

#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace quazor {

// The attachment with a frame's metadata. Any other kind than a dictionary is a fault of the capture service.
enum class FrameAttachment { kDictionary, kMissing, kText, kNumber };

// Changes to the metadata of some frames.
struct FrameMetadata {
  FrameAttachment attachment = FrameAttachment::kDictionary;
  Dictionary overrides;              // entries that are added or replaced
  std::vector<std::string> without;  // keys that are removed
};

// A structured-light projector next to the camera. Cameras with a projector report its state with every frame.
struct Projector {
  FrameMetadata metadata;                         // of every frame
  std::map<std::uint64_t, FrameMetadata> frames;  // of single frames, by number starting at 0; applied after `metadata`
};

// Frames `at` to `at + count - 1` are delayed and delivered together, at the time of the last one.
struct FrameBurst {
  std::uint64_t at = 0;
  std::uint64_t count = 1;
};

// A change to the time stamp of frame `at` and, unless `every` is 0, of every `every`th frame after it. The frames
// themselves come when they are due.
struct TimeStampChange {
  std::uint64_t at = 0;
  std::uint64_t every = 0;
  std::chrono::nanoseconds by{0};  // what the time stamp is late by; negative: early
  bool isValid = true;             // false: the frame has no time stamp
};

// An event on the output of the stream.
struct CameraEvent {
  std::chrono::nanoseconds at{0};  // since the stream's start
  std::int32_t number = 0;
};

// The delivery of frames and events to the handlers of the output.
struct DeliveryConfig {
  std::vector<FrameBurst> bursts;
  std::vector<TimeStampChange> timeStamps;
  std::vector<CameraEvent> events;
  std::uint64_t framesAfterStop = 0;  // the number of frames delivered after stop() has returned
  std::uint64_t queues = 1;           // frame k is delivered by queue k modulo this; several queues deliver at once
  bool stopWaitsForHandlers = true;   // false: stop() returns while handlers are still running
};

}  // namespace quazor
