// FrameDelivery: delivers the frames and events of one streaming run to its handlers.
#pragma once

#include "backends/capture/frame_trace.h"
#include "backends/simulated/capture/pixel_buffer_pool.h"
#include "backends/simulated/capture/session_status.h"
#include "backends/simulated/scenario/scenario.h"
#include "contract/value.h"
#include "platform/clock.h"
#include "platform/concurrency.h"
#include "platform/media_time.h"
#include "platform/pixel_buffer.h"

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace quazor {

// The time of frame `frame`, counted from 0, since the stream's start: (frame + 1) / rate, rounded up to the nanosecond
// and saturated.
std::chrono::nanoseconds frameTime(MicroFrameRate rate, std::uint64_t frame);

// Calls the handlers of a stream's output, on its own queues, from the stream's start to its stop: frame k at
// frameTime(k), the scenario's events at their times. Presentation and event times are in nanoseconds since the
// stream's start, independent of the time of the call; the scenario's time stamps may differ from them.
//
// Thread: any. Handlers are called without any lock.
class FrameDelivery final : public std::enable_shared_from_this<FrameDelivery> {
 public:
  struct Source {
    std::size_t index = 0;  // index of the camera, for the pool
    Camera camera;
    StreamRun run;
    bool lit = false;                            // the projector, if any, is on
    std::shared_ptr<PixelBufferHandler> frames;  // either may be null
    std::shared_ptr<EventHandler> events;
    std::shared_ptr<TracedStream> traced;  // null: the frames are not traced
  };

  FrameDelivery(Source source, std::shared_ptr<PixelBufferPool> pool, std::shared_ptr<Clock> clock);
  FrameDelivery(const FrameDelivery&) = delete;
  FrameDelivery& operator=(const FrameDelivery&) = delete;

  // Starts delivering. Called once; the owner must keep the delivery until it is closed.
  void begin(Concurrency& concurrency);
  // After this no handler starts.
  void close();
  // After close(): waits for running handlers, unless the scenario has stops that do not wait. Does not wait for a
  // handler that stops its own stream.
  void quiesce();
  // Ends a stop, once: sends the frames that the scenario delivers after the stop.
  void finish();
  // Passes the next `count` frames to the handler immediately, on this thread; they are numbered from 0, independently
  // of the regular frames. For tests. Returns the number of delivered frames: fewer if the delivery is closed in the
  // meantime, 0 without a handler.
  std::uint64_t push(std::uint64_t count);

 private:
  // A handler's call; if `entered()` is false, the delivery is closed and the call must not be made.
  class Entry;

  void arm(std::size_t queue, std::uint64_t frame);
  void armEvent(const CameraEvent& event);
  void deliver(std::uint64_t frame);
  void callHandler(std::uint64_t frame);
  bool isDropped(std::uint64_t frame) const;
  std::chrono::nanoseconds arrival(std::uint64_t frame) const;
  std::optional<Value> attachment(std::uint64_t frame) const;
  MediaTime timeStamp(std::uint64_t frame, std::chrono::nanoseconds time) const;
  std::chrono::nanoseconds atTime(std::chrono::nanoseconds sinceStart) const;
  std::chrono::nanoseconds sinceStart() const { return clock_->now() - source_.run.started; }

  const Source source_;
  const std::shared_ptr<PixelBufferPool> pool_;
  const std::shared_ptr<Clock> clock_;
  std::optional<Value> usual_;                             // the attachment of ordinary frames
  std::map<std::uint64_t, std::optional<Value>> special_;  // attachments of other frames
  std::vector<std::shared_ptr<SerialQueue>> queues_;
  std::atomic<std::uint64_t> pushed_{0};

  std::mutex mutex_;  // guards the members below
  std::condition_variable quiet_;
  bool closed_ = false;
  std::vector<std::thread::id> calling_;  // the threads that are running a handler
};

}  // namespace quazor
