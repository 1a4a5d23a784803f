// CameraRun: one streaming run of a camera, from start to stop.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/capture/frame_trace.h"
#include "backends/linux/capture/camera_buffers.h"
#include "backends/linux/capture/camera_counters.h"
#include "backends/linux/capture/camera_metadata.h"
#include "backends/linux/capture/camera_pairing.h"
#include "backends/linux/capture/camera_poller.h"
#include "platform/pixel_buffer.h"

#include <atomic>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The parameters of a run.
struct CameraRunPlan {
  CameraBinding camera;
  FrameInterval interval;                       // as set by the driver
  std::shared_ptr<PixelBufferHandler> handler;  // may be null: frames are then only counted
  std::vector<ControlSetting> light;            // set before the first frame; empty: the projector stays off
  std::shared_ptr<V4l2Device> node;
  std::shared_ptr<V4l2Device> metadataNode;  // may be null
  std::shared_ptr<const CameraControls> controls;
  std::shared_ptr<TracedStream> traced;  // of the camera; null: its frames are not traced
};

// The number of frames passed to handlers, for all cameras.
using DeliveredFrames = std::atomic<std::uint64_t>;

// Thread: begin() and end() one at a time; the poller's thread serves in between; counts() and errorCounters() any.
class CameraRun final : public PolledStream, public CaptureRun {
 public:
  CameraRun(CameraRunPlan plan, std::shared_ptr<DeliveredFrames> delivered);
  ~CameraRun() override;

  // Switches the projector on, requests buffers and starts the stream; starts the metadata node first so that it has
  // the metadata of frame 0. Undoes everything on failure.
  bool begin(DiagnosticErrorPtr* error);
  // Stops the stream, switches the projector off and releases all resources including the nodes. Returns false with the
  // first error if a step fails. REQUIRES: the poller does not serve this object, except on the calling thread.
  bool end(DiagnosticErrorPtr* error);

  FrameCounts counts() const;
  FrameInterval interval() const { return interval_; }
  // ErrorCounters; nothing and an error if a counter of the binding can no longer be read.
  std::optional<Dictionary> errorCounters(DiagnosticErrorPtr* error) const;

  void watch(std::vector<pollfd>& descriptors) const override;
  std::optional<std::chrono::nanoseconds> deadline() const override;
  bool serve(std::span<const pollfd> polled) override;
  void onPollFailed(int number) override { countFailure("poll", number); }

 private:
  bool enableProjector(DiagnosticErrorPtr* error);
  bool disableProjector(DiagnosticErrorPtr* error);
  bool startGuards(DiagnosticErrorPtr* error);
  bool prepare(DiagnosticErrorPtr* error);
  bool serveMetadata(const pollfd& polled);
  bool serveVideo(const pollfd& polled);
  void takeFrame(const DequeuedBuffer& buffer);
  void hand(const CapturedFrame& frame);
  void countFailure(std::string_view call, int number);
  void logFailure(std::string_view call, const CameraBuffers& buffers, int number) const;
  std::optional<Dictionary> counters(DiagnosticErrorPtr* error) const;

  const CameraBinding camera_;
  const FrameInterval interval_;
  const std::vector<ControlSetting> light_;
  const std::shared_ptr<DeliveredFrames> delivered_;
  const std::shared_ptr<TracedStream> traced_;

  std::unique_ptr<CameraMetadata> contents_;
  std::vector<std::unique_ptr<ControlGuard>> guards_;  // one for each device that has controls of the projector
  FramePairing pairing_;
  bool toldUnpaired_ = false;  // only the first frame without metadata is logged

  // Null after end(). Only the poller's thread may read it without the mutex.
  std::shared_ptr<PixelBufferHandler> handler_;
  std::shared_ptr<V4l2Device> node_;
  std::shared_ptr<V4l2Device> metadataNode_;
  std::shared_ptr<const CameraControls> controls_;
  std::unique_ptr<CameraBuffers> video_;
  std::unique_ptr<CameraBuffers> metadata_;

  mutable std::mutex mutex_;  // guards the members below
  FrameCounts counts_;
  std::optional<BoundCounters> bound_;
  std::optional<Dictionary> finalCounters_;  // the values at the end
  DiagnosticErrorPtr finalError_;            // why they could not be read at the end
};

}  // namespace quazor
