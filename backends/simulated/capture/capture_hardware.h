// CaptureHardware: the state of the simulated cameras, shared by all users of the capture service.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/capture/frame_trace.h"
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

// One streaming run of a camera.
//
// Thread: any, holding the hardware's mutex.
struct SimulatedRun final : CaptureRun {
  StreamRun times;
  std::shared_ptr<FrameDelivery> delivery;  // null without a handler, and after the stop
};

struct CameraState {
  Camera camera;
  std::shared_ptr<SimulatedRun> running;  // null if the stream does not run
  std::shared_ptr<TracedStream> traced;   // null if its frames are not traced

  // The highest frame rate of the current format.
  double formatMaximum(const CameraSettings& settings) const;
  // The actual frame rate.
  double deliveredRate(const CameraSettings& settings) const;
  // ErrorCounters: the scenario's counters plus their growth in `run`, which is the current or the last run, or null.
  // Nothing if they cannot be read.
  std::optional<Dictionary> errorCounters(const StreamRun* run, std::chrono::nanoseconds now) const;
};

// State of the cameras that other devices of the phone also use, under one lock.
//
// Thread: any, holding `mutex`; const members need no lock.
struct CaptureHardware {
  // Throws std::invalid_argument if a camera has no format.
  CaptureHardware(const Scenario& scenario, std::shared_ptr<Clock> clock, std::shared_ptr<Concurrency> concurrency);

  const CaptureDeviceConfig device;
  const std::shared_ptr<Clock> clock;
  const std::shared_ptr<Concurrency> concurrency;
  const std::shared_ptr<PixelBufferPool> pool;

  std::mutex mutex;
  std::vector<CameraState> cameras;
  std::size_t runningStreams = 0;
  std::chrono::nanoseconds streamedBefore{0};  // total streaming time before streamingSince
  std::chrono::nanoseconds streamingSince{0};  // while any stream runs

  // Starts the stream of the camera with that index, at the current rate.
  std::shared_ptr<SimulatedRun> start(std::size_t camera, const CameraSettings& settings);
  // Ends the run now, unless it has already ended; no further handler starts.
  void stop(SimulatedRun& run);
  // Locks the mutex itself. Every stream that starts later tells its frames to the trace.
  void traceFrames(FrameTrace& trace, WhenTraceIsFull whenFull);
  // The total time during which any stream has run.
  std::chrono::nanoseconds streamedTime() const;
};

}  // namespace quazor
