// What a scenario says of a camera's frames and events.
#pragma once

#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace quazor {

// What is attached to a frame as its metadata. Everything but a dictionary is a fault of the capture service.
enum class FrameAttachment { kDictionary, kMissing, kText, kNumber };

// What is special about the metadata of some frames.
struct FrameMetadata {
  FrameAttachment attachment = FrameAttachment::kDictionary;
  Dictionary overrides;              // entries that replace or join the healthy ones
  std::vector<std::string> without;  // keys that are left out
};

// A structured-light projector beside the camera. Cameras that have one report on it with every frame.
struct Projector {
  FrameMetadata metadata;                         // of every frame
  std::map<std::uint64_t, FrameMetadata> frames;  // of single frames, by number from 0, on top of `metadata`
};

// Frames `at` to `at + count - 1` are held back and come together, at the time of the last of them.
struct FrameBurst {
  std::uint64_t at = 0;
  std::uint64_t count = 1;
};

// An event of the stream's output.
struct CameraEvent {
  std::chrono::nanoseconds at{0};  // since the stream's start
  std::int32_t number = 0;
};

// How frames and events reach the handlers of the stream's output.
struct DeliveryConfig {
  std::vector<FrameBurst> bursts;
  std::vector<CameraEvent> events;
  std::uint64_t framesAfterStop = 0;  // frames that still come when stop() has returned
  std::uint64_t queues = 1;           // frame k comes from queue k modulo this; several deliver at once
  bool stopWaitsForHandlers = true;   // false: stop() returns while handlers are still running
};

}  // namespace quazor
