#include "backends/simulated/capture/frame_delivery.h"

#include "backends/simulated/capture/frame_metadata.h"

#include <algorithm>
#include <limits>
#include <string>
#include <utility>

namespace quazor {
namespace {

__extension__ using Wide = __int128;

// The scale of nanoseconds times millionths of a frame per second.
constexpr Wide kFrame = Wide{1'000'000'000} * 1'000'000;

constexpr std::int32_t kTimescale = 1'000'000'000;

MediaTime mediaTime(std::chrono::nanoseconds sinceStart) {
  MediaTime time;
  time.value = sinceStart.count();
  time.timescale = kTimescale;
  return time;
}

}  // namespace

std::chrono::nanoseconds frameTime(MicroFrameRate rate, std::uint64_t frame) {
  const Wide time = ((static_cast<Wide>(frame) + 1) * kFrame + static_cast<Wide>(rate) - 1) / static_cast<Wide>(rate);
  constexpr Wide kMaximum = std::numeric_limits<std::int64_t>::max();
  return std::chrono::nanoseconds(static_cast<std::int64_t>(std::min(time, kMaximum)));
}

class FrameDelivery::Entry {
 public:
  explicit Entry(FrameDelivery& delivery) : delivery_(delivery) {
    const std::lock_guard lock(delivery_.mutex_);
    entered_ = !delivery_.closed_;
    if (entered_) delivery_.calling_.push_back(std::this_thread::get_id());
  }
  Entry(const Entry&) = delete;
  Entry& operator=(const Entry&) = delete;
  ~Entry() {
    if (!entered_) return;
    const std::lock_guard lock(delivery_.mutex_);
    std::vector<std::thread::id>& calling = delivery_.calling_;
    calling.erase(std::ranges::find(calling, std::this_thread::get_id()));
    if (delivery_.closed_) delivery_.quiet_.notify_all();
  }

  bool entered() const { return entered_; }

 private:
  FrameDelivery& delivery_;
  bool entered_ = false;
};

FrameDelivery::FrameDelivery(Source source, std::shared_ptr<PixelBufferPool> pool, std::shared_ptr<Clock> clock)
    : source_(std::move(source)), pool_(std::move(pool)), clock_(std::move(clock)) {
  const std::optional<Projector>& projector = source_.camera.projector;
  if (!projector) {
    usual_ = Value(Dictionary{});
    return;
  }
  const Dictionary healthy = healthyMetadata(source_.lit);
  usual_ = attachmentOf(healthy, projector->metadata);
  const Dictionary base = usual_ && usual_->dictionary() != nullptr ? *usual_->dictionary() : healthy;
  for (const auto& [frame, special] : projector->frames) special_.emplace(frame, attachmentOf(base, special));
}

void FrameDelivery::begin(Concurrency& concurrency) {
  for (std::uint64_t i = 0; i < source_.camera.delivery.queues; ++i) {
    queues_.push_back(
        concurrency.makeSerialQueue("SimulatedCapture." + source_.camera.id, QualityOfService::kUserInteractive));
  }
  if (source_.events != nullptr) {
    for (const CameraEvent& event : source_.camera.delivery.events) armEvent(event);
  }
  if (source_.frames == nullptr || !source_.camera.deliversFrames) return;
  for (std::size_t i = 0; i < queues_.size(); ++i) arm(i, i);
}

// Schedules a queue's next frame. The tasks do not own the delivery, so frames end with the owner's reference.
void FrameDelivery::arm(std::size_t queue, std::uint64_t frame) {
  queues_[queue]->asyncAfter(arrival(frame) - sinceStart(), [weak = weak_from_this(), queue, frame] {
    const std::shared_ptr<FrameDelivery> self = weak.lock();
    if (self == nullptr) return;
    self->deliver(frame);
    self->arm(queue, frame + self->queues_.size());
  });
}

void FrameDelivery::armEvent(const CameraEvent& event) {
  queues_.front()->asyncAfter(event.at - sinceStart(), [weak = weak_from_this(), event] {
    const std::shared_ptr<FrameDelivery> self = weak.lock();
    if (self == nullptr) return;
    const Entry entry(*self);
    if (entry.entered()) (*self->source_.events)(event.number, mediaTime(event.at), nullptr);
  });
}

void FrameDelivery::deliver(std::uint64_t frame) {
  if (isDropped(frame)) return;
  const Entry entry(*this);
  if (entry.entered()) callHandler(frame);
}

void FrameDelivery::callHandler(std::uint64_t frame) {
  const std::chrono::nanoseconds time = frameTime(source_.run.rate, frame);
  const MediaTime stamp = timeStamp(frame, time);
  const std::chrono::nanoseconds told = atTime(std::chrono::nanoseconds(stamp.value));
  PixelBuffer& buffer = pool_->take(source_.index, frame, attachment(frame), source_.traced, told);
  (*source_.frames)(buffer, stamp);
  buffer.release();
}

MediaTime FrameDelivery::timeStamp(std::uint64_t frame, std::chrono::nanoseconds time) const {
  MediaTime stamp = mediaTime(time);
  for (const TimeStampChange& change : source_.camera.delivery.timeStamps) {
    if (frame < change.at) continue;
    const std::uint64_t after = frame - change.at;
    if (after != 0 && (change.every == 0 || after % change.every != 0)) continue;
    constexpr Wide kMaximum = std::numeric_limits<std::int64_t>::max();
    stamp.value = static_cast<std::int64_t>(std::min(Wide{stamp.value} + change.by.count(), kMaximum));
    if (!change.isValid) stamp.flags &= ~MediaTime::kValid;
  }
  return stamp;
}

// By the phone's clock, saturated.
std::chrono::nanoseconds FrameDelivery::atTime(std::chrono::nanoseconds sinceStart) const {
  constexpr std::chrono::nanoseconds kMaximum = std::chrono::nanoseconds::max();
  const std::chrono::nanoseconds started = source_.run.started;
  return sinceStart > kMaximum - started ? kMaximum : started + sinceStart;
}

bool FrameDelivery::isDropped(std::uint64_t frame) const {
  const Camera& camera = source_.camera;
  return camera.droppedFrames.contains(frame) || (camera.dropEvery != 0 && (frame + 1) % camera.dropEvery == 0);
}

// The time at which the frame reaches the handler: a burst delays frames.
std::chrono::nanoseconds FrameDelivery::arrival(std::uint64_t frame) const {
  std::uint64_t with = frame;
  for (const FrameBurst& burst : source_.camera.delivery.bursts) {
    if (frame >= burst.at && frame - burst.at < burst.count) with = std::max(with, burst.at + burst.count - 1);
  }
  return frameTime(source_.run.rate, with);
}

std::optional<Value> FrameDelivery::attachment(std::uint64_t frame) const {
  if (!special_.empty()) {
    if (const auto found = special_.find(frame); found != special_.end()) return found->second;
  }
  return usual_;
}

void FrameDelivery::close() {
  const std::lock_guard lock(mutex_);
  closed_ = true;
}

void FrameDelivery::quiesce() {
  if (!source_.camera.delivery.stopWaitsForHandlers) return;
  std::unique_lock lock(mutex_);
  quiet_.wait(lock, [this] {
    return std::ranges::all_of(calling_, [](std::thread::id id) { return id == std::this_thread::get_id(); });
  });
}

void FrameDelivery::finish() {
  if (source_.frames == nullptr) return;
  auto frame = static_cast<std::uint64_t>(Wide{sinceStart().count()} * static_cast<Wide>(source_.run.rate) / kFrame);
  for (std::uint64_t i = 0; i < source_.camera.delivery.framesAfterStop; ++i, ++frame) {
    queues_.front()->async([self = shared_from_this(), frame] { self->callHandler(frame); });
  }
}

std::uint64_t FrameDelivery::push(std::uint64_t count) {
  if (source_.frames == nullptr) return 0;
  for (std::uint64_t delivered = 0; delivered < count; ++delivered) {
    const Entry entry(*this);
    if (!entry.entered()) return delivered;
    callHandler(pushed_.fetch_add(1, std::memory_order_relaxed));
  }
  return count;
}

}  // namespace quazor
