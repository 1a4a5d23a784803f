// FrameTrace: where the cameras of a phone tell each frame that they deliver.
#pragma once

#include "platform/clock.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace quazor {

// The frames of one stream. Both functions are called in the path of a frame, so neither takes a lock, allocates memory
// or calls the system, unless it has to wait for room.
//
// Thread: any.
class TracedStream {
 public:
  TracedStream() = default;
  TracedStream(const TracedStream&) = delete;
  TracedStream& operator=(const TracedStream&) = delete;
  virtual ~TracedStream();

  // Tells that the frame's handler is called now. `captured` is when the camera says that it was captured, by the
  // phone's clock. Returns the frame's place for handBack(); nothing if the frame is not told.
  virtual std::optional<std::uint64_t> deliver(std::uint64_t number, std::chrono::nanoseconds captured) = 0;
  // Tells that the frame in that place is handed back now.
  virtual void handBack(std::uint64_t place) = 0;
};

// A frame from its delivery until it is handed back.
//
// Thread: one at a time.
class TracedDelivery {
 public:
  TracedDelivery() = default;
  // `stream` may be null: the frame is not traced.
  TracedDelivery(std::shared_ptr<TracedStream> stream, std::uint64_t number, std::chrono::nanoseconds captured)
      : stream_(std::move(stream)) {
    if (stream_ != nullptr) place_ = stream_->deliver(number, captured);
  }

  void handBack() const {
    if (place_) stream_->handBack(*place_);
  }

 private:
  std::shared_ptr<TracedStream> stream_;
  std::optional<std::uint64_t> place_;
};

// What becomes of a frame for which there is no room.
enum class WhenTraceIsFull {
  kLose,  // it is counted as lost
  kWait   // its delivery waits for room: for a phone whose clock stands still meanwhile
};

// Thread: one at a time.
class FrameTrace {
 public:
  FrameTrace() = default;
  FrameTrace(const FrameTrace&) = delete;
  FrameTrace& operator=(const FrameTrace&) = delete;
  virtual ~FrameTrace();

  // The stream of that name, which is told to nobody else; null if there are too many. `clock` is the phone's.
  virtual std::shared_ptr<TracedStream> addStream(const std::string& name, std::shared_ptr<const Clock> clock,
                                                  WhenTraceIsFull whenFull) = 0;
};

}  // namespace quazor
