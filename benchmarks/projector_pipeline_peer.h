// The pipeline of the projector fault experiment, implemented with standalone Asio for comparison.
#pragma once

#include "contract/log_channel.h"
#include "diagnostics/projector_fault/tessel_frame_description.h"
#include "platform/capture_keys.h"
#include "platform/clock.h"
#include "platform/pixel_buffer.h"

#include <asio.hpp>

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <semaphore>
#include <utility>

namespace quazor {

// Two strands on a pool of two threads: one receives frames, counts them and builds their records, the other one
// examines them. Ends with the first lit frame whose number is at least `stopCount`, or with the first that fails.
class AsioPipeline final : public std::enable_shared_from_this<AsioPipeline> {
 public:
  AsioPipeline(std::uint64_t stopCount, const Clock& clock) : stopCount_(stopCount), clock_(clock) {}

  // Any thread.
  void handleFrame(PixelBuffer& buffer, MediaTime time) {
    buffer.retain();
    asio::post(receiving_, std::function<void()>([weak = weak_from_this(), &buffer, time] {
                 if (const auto self = weak.lock()) self->takeIn(buffer, time);
               }));
  }
  void waitForEnd() { done_.acquire(); }
  bool failed() const { return failed_; }
  // Ends the threads. Must not be called on one of them.
  void join() { pool_.join(); }

 private:
  void takeIn(PixelBuffer& buffer, MediaTime time) {
    if (stop_) return;
    const std::uint64_t number = ++frameCount_;
    logDebug("Received frame %@.", number);
    const std::optional<Value> metadata = buffer.attachment(capture_key::MetadataDictionary);
    if (!metadata || metadata->dictionary() == nullptr) return end(true);
    auto frame = QZTesselFrameDescription::descriptionWithMonotonicCount(number, time, *metadata->dictionary(), clock_);
    if (frame == nullptr) return end(true);
    buffer.release();
    asio::post(processing_, std::function<void()>([self = shared_from_this(), frame = std::move(frame), number] {
                 self->examine(*frame, number);
               }));
  }

  void examine(const QZTesselFrameDescription& frame, std::uint64_t number) {
    logDebug("Processing frame %lu.", frame.monotonicCount());
    const std::int32_t source = toInt32(pointerTo(frame.infraredLightSource()));
    if (source != 1 && source != 2) return end(true);
    if (number >= stopCount_) end(false);
  }

  void end(bool failed) {
    if (stop_.exchange(true)) return;
    failed_ = failed;
    done_.release();
  }

  using Strand = asio::strand<asio::thread_pool::executor_type>;

  const std::uint64_t stopCount_;
  const Clock& clock_;
  std::uint64_t frameCount_ = 0;  // on the receiving strand
  std::atomic<bool> stop_{false};
  std::atomic<bool> failed_{false};
  std::binary_semaphore done_{0};
  asio::thread_pool pool_{2};
  Strand receiving_{pool_.get_executor()};
  Strand processing_{pool_.get_executor()};
};

}  // namespace quazor
