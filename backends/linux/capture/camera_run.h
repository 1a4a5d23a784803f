// CameraRun: one stretch of a camera's stream, from its start to its stop.
#pragma once

#include "backends/capture/capture_back.h"
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

// What a stretch needs to know.
struct CameraRunPlan {
  CameraBinding camera;
  FrameInterval interval;                       // between frames, as the driver has it
  std::shared_ptr<PixelBufferHandler> handler;  // may be null: frames are then only counted
  std::vector<ControlSetting> light;            // set before the first frame; empty: the projector stays dark
  std::shared_ptr<V4l2Device> node;
  std::shared_ptr<V4l2Device> metadataNode;  // may be null
};

// Frames whose handlers have been called, of all cameras.
using DeliveredFrames = std::atomic<std::uint64_t>;

// Thread: begin() and end() one at a time; the poller's thread serves in between; counts() and errorCounters() any.
class CameraRun final : public PolledStream, public CaptureRun {
 public:
  CameraRun(CameraRunPlan plan, std::shared_ptr<DeliveredFrames> delivered);
  ~CameraRun() override;

  // Lights the projector, requests buffers and starts the stream: the metadata node first, so that its buffers are
  // there for frame 0. On failure everything is as before.
  bool begin(DiagnosticErrorPtr* error);
  // Stops the stream, puts the projector out and gives everything back, the nodes included. False, with the first
  // error, when the system refused any of that. REQUIRES: the poller does not serve it, but on the calling thread.
  bool end(DiagnosticErrorPtr* error);

  FrameCounts counts() const;
  FrameInterval interval() const { return interval_; }
  // ErrorCounters; nothing, and an error, when a counter of the binding cannot be read any more.
  std::optional<Dictionary> errorCounters(DiagnosticErrorPtr* error) const;

  void watch(std::vector<pollfd>& descriptors) const override;
  std::optional<std::chrono::nanoseconds> deadline() const override;
  bool serve(std::span<const pollfd> polled) override;

 private:
  bool light(DiagnosticErrorPtr* error);
  bool darken(DiagnosticErrorPtr* error);
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

  std::unique_ptr<CameraMetadata> contents_;
  std::unique_ptr<ControlGuard> guard_;
  FramePairing pairing_;

  // Until end(); then null, which needs the mutex for who is not the poller's thread.
  std::shared_ptr<PixelBufferHandler> handler_;
  std::shared_ptr<V4l2Device> node_;
  std::shared_ptr<V4l2Device> metadataNode_;
  std::unique_ptr<CameraBuffers> video_;
  std::unique_ptr<CameraBuffers> metadata_;

  mutable std::mutex mutex_;  // guards what follows
  FrameCounts counts_;
  std::optional<BoundCounters> bound_;
  std::optional<Dictionary> finalCounters_;  // as they were at the end
  DiagnosticErrorPtr finalError_;            // when they could not be read then
};

}  // namespace quazor
