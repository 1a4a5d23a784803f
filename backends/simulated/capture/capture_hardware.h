// CaptureHardware: the state of the simulated cameras, which all users of the capture service share.
#pragma once

#include "backends/simulated/capture/frame_delivery.h"
#include "backends/simulated/capture/pixel_buffer_pool.h"
#include "backends/simulated/capture/session_status.h"
#include "backends/simulated/scenario/scenario.h"
#include "contract/value.h"
#include "platform/clock.h"
#include "platform/concurrency.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// One user of the capture device: each device that a plug-in hands out. 0 is nobody.
using CaptureUserId = std::uint64_t;

struct CameraState {
  Camera camera;
  CaptureUserId holder = 0;
  bool running = false;
  std::optional<StreamRun> run;             // the present stretch, or else the last one
  std::shared_ptr<FrameDelivery> delivery;  // while it runs

  // As they were set, so that they read back as the kind of number they were.
  Value formatIndex{0U};
  std::optional<Value> maximumFrameRate;  // while not set, the format's
  std::optional<Value> minimumFrameRate;  // while not set, the maximum
  Value multipleOutputs{false};
  Value slaveConfiguration{Dictionary{}};
  Value autoExposure{true};
  Value lightSource = darkness();  // of cameras with a projector
  Value outputConfigurations{Dictionary{}};
  Value outputsEnabled{Dictionary{}};
  Value outputHandlers{Dictionary{}};  // the holder's; dropped when the stream is given back

  // The InfraredLightSourceConfiguration that lets nothing fire.
  static Value darkness();
  // The highest frame rate of the format that is set.
  double formatMaximum() const;
  double minimumRate() const;
  double maximumRate() const;
  // The rate at which frames would really come.
  double deliveredRate() const;
  // What ErrorCounters reads: the scenario's counters and what they have grown by in the present or the last stretch.
  // Nothing when they cannot be read.
  std::optional<Dictionary> errorCounters(std::chrono::nanoseconds now) const;
};

struct GroupState {
  std::string id;
  std::vector<std::size_t> cameras;  // indexes, in the group's order
  std::size_t master = 0;            // the index of one of them
  bool masterConfigurationSupported = true;
  std::vector<std::size_t> active;  // what ActiveStreams was set to
  Value masterConfiguration{Dictionary{}};
};

// Plain data under one lock; the objects of the capture service (simulated_capture.h) hold the rules.
//
// Thread: any, holding `mutex`; what is const needs no lock.
struct CaptureHardware {
  // Throws std::invalid_argument when a camera has no format or a group names a camera that there is not.
  CaptureHardware(const Scenario& scenario, std::shared_ptr<Clock> clock, std::shared_ptr<Concurrency> concurrency);

  const CaptureDeviceConfig device;
  const std::shared_ptr<Clock> clock;
  const std::shared_ptr<Concurrency> concurrency;
  const std::shared_ptr<PixelBufferPool> pool;

  std::mutex mutex;
  std::vector<CameraState> cameras;
  std::vector<GroupState> groups;
  std::vector<std::size_t> configuredGroups;  // what MultiCamConfiguration was set to
  CaptureUserId lastUser = 0;
  std::size_t runningStreams = 0;
  std::chrono::nanoseconds streamedBefore{0};  // until the last moment at which no stream ran
  std::chrono::nanoseconds streamingSince{0};  // while any stream runs

  // Starts the camera's stream, at the rate that is set now.
  void start(CameraState& camera);
  // Stops the camera's stream, which runs. No handler begins any more; the result, null where none could, is to be
  // finished when the mutex is given back.
  std::shared_ptr<FrameDelivery> stop(CameraState& camera);
  // Gives back what the user has: its streams stop, lose their handlers and are free. As stop() for each that ran.
  std::vector<std::shared_ptr<FrameDelivery>> release(CaptureUserId user);
  // For how long any stream has been running until now.
  std::chrono::nanoseconds streamedTime() const;
  // MulticamSessionStatus: an entry for every active stream of the configured groups; nothing when no session of
  // theirs has begun.
  std::optional<Dictionary> sessionStatus() const;
};

}  // namespace quazor
