// FrameDelivery: one stretch of a stream, as its handlers see it.
#pragma once

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

// The time since a stream's start at which its frame `frame`, counted from 0, has come: (frame + 1) / rate, rounded up
// to the nanosecond and saturated.
std::chrono::nanoseconds frameTime(MicroFrameRate rate, std::uint64_t frame);

// Calls the handlers of a stream's output, on queues of its own, from the stream's start to its stop: frame k at
// frameTime(k), the scenario's events at theirs. Presentation and event times are in nanoseconds since the stream's
// start, whenever the handler is called.
//
// Thread: any. Handlers are called without any lock.
class FrameDelivery final : public std::enable_shared_from_this<FrameDelivery> {
 public:
  struct Source {
    std::size_t index = 0;  // the camera's, for the pool
    Camera camera;
    StreamRun run;
    bool lit = false;                            // the projector, where there is one, fires
    std::shared_ptr<PixelBufferHandler> frames;  // either may be null
    std::shared_ptr<EventHandler> events;
  };

  FrameDelivery(Source source, std::shared_ptr<PixelBufferPool> pool, std::shared_ptr<Clock> clock);
  FrameDelivery(const FrameDelivery&) = delete;
  FrameDelivery& operator=(const FrameDelivery&) = delete;

  // Begins to deliver. Called once; the owner keeps the delivery until it is closed.
  void begin(Concurrency& concurrency);
  // From here on no handler begins to run.
  void close();
  // After close(): waits until no handler runs any more, where the scenario has stops wait. A handler that stops its
  // own stream is not waited for.
  void quiesce();
  // Ends a stop, once: the scenario's frames after the stop are on their way.
  void finish();
  // Calls the frame handler with the next `count` frames at once, on this thread, without regard to time; counts from
  // 0, apart from the frames that come by themselves. For benches. Returns how many were delivered: fewer when the
  // delivery is closed meanwhile, or 0 without a handler.
  std::uint64_t push(std::uint64_t count);

 private:
  // A handler's call; `entered()` is false, and the call must not be made, when the delivery is closed.
  class Entry;

  void arm(std::size_t queue, std::uint64_t frame);
  void armEvent(const CameraEvent& event);
  void deliver(std::uint64_t frame);
  void callHandler(std::uint64_t frame);
  bool isDropped(std::uint64_t frame) const;
  std::chrono::nanoseconds arrival(std::uint64_t frame) const;
  std::optional<Value> attachment(std::uint64_t frame) const;
  std::chrono::nanoseconds sinceStart() const { return clock_->now() - source_.run.started; }

  const Source source_;
  const std::shared_ptr<PixelBufferPool> pool_;
  const std::shared_ptr<Clock> clock_;
  std::optional<Value> usual_;                             // the attachment of frames that are not special
  std::map<std::uint64_t, std::optional<Value>> special_;  // those that are
  std::vector<std::shared_ptr<SerialQueue>> queues_;
  std::atomic<std::uint64_t> pushed_{0};

  std::mutex mutex_;  // guards what follows
  std::condition_variable quiet_;
  bool closed_ = false;
  std::vector<std::thread::id> calling_;  // the threads that are in a handler
};

}  // namespace quazor
