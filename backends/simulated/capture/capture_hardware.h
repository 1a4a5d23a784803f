// CaptureHardware: the state of the simulated cameras, which all users of the capture service share.
#pragma once

#include "backends/capture/capture_back.h"
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

// One stretch of a camera's stream.
//
// Thread: any, holding the hardware's mutex.
struct SimulatedRun final : CaptureRun {
  StreamRun times;
  std::shared_ptr<FrameDelivery> delivery;  // null where nothing is delivered, and after the stop
};

struct CameraState {
  Camera camera;
  std::shared_ptr<SimulatedRun> running;  // null while the stream does not run

  // The highest frame rate of the format that is set.
  double formatMaximum(const CameraSettings& settings) const;
  // The rate at which frames would really come.
  double deliveredRate(const CameraSettings& settings) const;
  // What ErrorCounters reads: the scenario's counters and what they have grown by in `run`, the present or the last
  // stretch, or null. Nothing when they cannot be read.
  std::optional<Dictionary> errorCounters(const StreamRun* run, std::chrono::nanoseconds now) const;
};

// Plain data under one lock: what of the cameras other devices of the phone depend on.
//
// Thread: any, holding `mutex`; what is const needs no lock.
struct CaptureHardware {
  // Throws std::invalid_argument when a camera has no format.
  CaptureHardware(const Scenario& scenario, std::shared_ptr<Clock> clock, std::shared_ptr<Concurrency> concurrency);

  const CaptureDeviceConfig device;
  const std::shared_ptr<Clock> clock;
  const std::shared_ptr<Concurrency> concurrency;
  const std::shared_ptr<PixelBufferPool> pool;

  std::mutex mutex;
  std::vector<CameraState> cameras;
  std::size_t runningStreams = 0;
  std::chrono::nanoseconds streamedBefore{0};  // until the last moment at which no stream ran
  std::chrono::nanoseconds streamingSince{0};  // while any stream runs

  // Starts the stream of the camera of that index, at the rate that is set now.
  std::shared_ptr<SimulatedRun> start(std::size_t camera, const CameraSettings& settings);
  // The stretch ends now, unless it has already, and no handler begins any more.
  void stop(SimulatedRun& run);
  // For how long any stream has been running until now.
  std::chrono::nanoseconds streamedTime() const;
};

}  // namespace quazor
