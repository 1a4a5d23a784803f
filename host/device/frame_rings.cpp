#include "host/device/frame_rings.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <bit>
#include <cerrno>
#include <cstring>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

namespace quazor {

// Plain words, because the memory begins as zeros: a constructor would write to all of it.
// Thread: any; the words are used as atomics.
struct SharedFrames {
  static constexpr std::size_t kCacheLine = 64;

  // A place in a ring, in a cache line of its own. `state` says which frame it holds, and how far it is, in one word:
  // it never belongs to two frames.
  struct alignas(kCacheLine) Slot {
    std::uint64_t state;
    std::int64_t number;
    std::int64_t captured;
    std::int64_t delivered;
    std::int64_t returned;
    std::uint64_t step;
  };

  struct Ring {
    std::uint64_t kind;
    std::uint64_t nameSize;
    char name[FrameRings::kMaxName];
    alignas(kCacheLine) std::uint64_t seen;  // frames that were delivered
    std::uint64_t head;                      // the place of the next frame
    std::uint64_t lost;
    alignas(kCacheLine) std::uint64_t tail;  // places before this one are free; written by the host
    alignas(kCacheLine) Slot slots[FrameRings::kFramesOfRing];

    Slot& slot(std::uint64_t place) { return slots[place % FrameRings::kFramesOfRing]; }
  };

  struct Content {
    std::uint64_t framesPerStep;
    std::int64_t origin;
    std::uint64_t streams;
    std::uint64_t withoutRing;
    alignas(kCacheLine) std::uint64_t seen[2];  // frames of all streams, and tasks of all queues
    Ring rings[FrameRings::kMaxStreams];
  };

  SharedFrames() {
    void* const memory =
        ::mmap(nullptr, sizeof(Content), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    if (memory == MAP_FAILED) throw std::system_error(errno, std::generic_category(), "sharing memory");
    content = static_cast<Content*>(memory);
  }
  SharedFrames(const SharedFrames&) = delete;
  SharedFrames& operator=(const SharedFrames&) = delete;
  ~SharedFrames() { ::munmap(content, sizeof(Content)); }

  Content* content = nullptr;
};

namespace {

using std::chrono::nanoseconds;
using namespace std::chrono_literals;

// How long a delivery waits for room while none is made. A host that does not make any has come to a halt.
constexpr std::chrono::seconds kMaxWait = 10s;
constexpr std::chrono::microseconds kWait = 200us;

using Slot = SharedFrames::Slot;
using Ring = SharedFrames::Ring;

enum class Phase : std::uint64_t { kTaken, kDelivered, kReturning, kReturned };

constexpr std::uint64_t stateOf(std::uint64_t place, Phase phase) {
  return ((place + 1) << 2U) | static_cast<std::uint64_t>(phase);
}

static_assert(std::atomic_ref<std::uint64_t>::is_always_lock_free, "a lock would be each process' own");

template <class Word>
Word load(Word& word, std::memory_order order = std::memory_order_relaxed) {
  return std::atomic_ref<Word>(word).load(order);
}

template <class Word>
void store(Word& word, Word value, std::memory_order order = std::memory_order_relaxed) {
  std::atomic_ref<Word>(word).store(value, order);
}

template <class Word>
Word count(Word& word) {
  return std::atomic_ref<Word>(word).fetch_add(1, std::memory_order_relaxed);
}

bool change(std::uint64_t& word, std::uint64_t from, std::uint64_t to) {
  return std::atomic_ref<std::uint64_t>(word).compare_exchange_strong(from, to, std::memory_order_acq_rel,
                                                                      std::memory_order_acquire);
}

std::int64_t sinceOrigin(nanoseconds time, std::int64_t origin) {
  std::int64_t difference = 0;
  if (__builtin_sub_overflow(time.count(), origin, &difference)) return time.count() < 0 ? -kMaxTraced : kMaxTraced;
  return std::clamp(difference, -kMaxTraced, kMaxTraced);
}

// Lets the kernel provide the memory at once. Otherwise one frame in sixty-four waits for it, for microseconds, as it
// does where the kernel is older than 5.14.
void makeResident(Ring& ring) {
  const std::size_t before =
      reinterpret_cast<std::uintptr_t>(&ring) % static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
  static_cast<void>(::madvise(reinterpret_cast<std::byte*>(&ring) - before, sizeof ring + before, MADV_POPULATE_WRITE));
}

TracedKind kindIn(Ring& ring) { return load(ring.kind) == 0 ? TracedKind::kFrames : TracedKind::kTasks; }

// 1 for the first `framesPerStep` frames, 2 for twice as many after them, and so on.
std::uint64_t stepOf(std::uint64_t frame, std::uint64_t framesPerStep) {
  return framesPerStep == 0 ? 1 : std::bit_floor(frame / framesPerStep + 1);
}

// A delivery touches few cache lines beside this object: between two frames of a camera, the processor has forgotten
// them all.
// Thread: any.
class StreamOfRing final : public TracedStream {
 public:
  StreamOfRing(std::shared_ptr<SharedFrames> shared, Ring& ring, std::shared_ptr<const Clock> clock,
               WhenTraceIsFull whenFull)
      : shared_(std::move(shared)),
        ring_(ring),
        seen_(shared_->content->seen[kindIn(ring) == TracedKind::kTasks ? 1 : 0]),
        framesPerStep_(shared_->content->framesPerStep),
        origin_(shared_->content->origin),
        clock_(std::move(clock)),
        whenFull_(whenFull) {}

  std::optional<std::uint64_t> deliver(std::uint64_t number, nanoseconds captured) override {
    const std::uint64_t step = stepOf(count(seen_), framesPerStep_);
    if (count(ring_.seen) % step != 0) return std::nullopt;
    std::uint64_t place = load(ring_.head, std::memory_order_acquire);
    nanoseconds now{};
    do {
      if (!hasRoom(place) && !waitForRoom(place)) {
        count(ring_.lost);
        return std::nullopt;
      }
      now = clock_->now();
    } while (!std::atomic_ref(ring_.head).compare_exchange_weak(place, place + 1, std::memory_order_acq_rel));
    Slot& slot = ring_.slot(place);
    store(slot.number, static_cast<std::int64_t>(std::min<std::uint64_t>(number, kMaxTraced)));
    store(slot.captured, sinceOrigin(captured, origin_));
    store(slot.delivered, sinceOrigin(now, origin_));
    store(slot.step, step);
    store(slot.state, stateOf(place, Phase::kDelivered), std::memory_order_release);
    __builtin_prefetch(&ring_.slot(place + 1), 1);  // of the next frame
    return place;
  }

  void handBack(std::uint64_t place) override {
    Slot& slot = ring_.slot(place);
    // Fails if the frame was already taken, also if the place belongs to another frame now.
    if (!change(slot.state, stateOf(place, Phase::kDelivered), stateOf(place, Phase::kReturning))) return;
    store(slot.returned, sinceOrigin(clock_->now(), origin_));
    store(slot.state, stateOf(place, Phase::kReturned), std::memory_order_release);
  }

 private:
  bool hasRoom(std::uint64_t place) const {
    if (isRoomBefore(place, tail_.load(std::memory_order_acquire))) return true;
    const std::uint64_t tail = load(ring_.tail, std::memory_order_acquire);
    tail_.store(tail, std::memory_order_release);
    return isRoomBefore(place, tail);
  }

  // A place that other threads have taken meanwhile may lie before the tail, and is then not taken a second time.
  static bool isRoomBefore(std::uint64_t place, std::uint64_t tail) {
    return static_cast<std::int64_t>(place - tail) < static_cast<std::int64_t>(FrameRings::kFramesOfRing);
  }

  // Changes `place` to the next free one. Returns false if none becomes free.
  bool waitForRoom(std::uint64_t& place) const {
    if (whenFull_ == WhenTraceIsFull::kLose) return false;
    const auto end = std::chrono::steady_clock::now() + kMaxWait;
    while (!hasRoom(place)) {
      if (std::chrono::steady_clock::now() > end) return false;
      std::this_thread::sleep_for(kWait);
      place = load(ring_.head, std::memory_order_acquire);
    }
    return true;
  }

  const std::shared_ptr<SharedFrames> shared_;
  Ring& ring_;
  std::uint64_t& seen_;  // frames of all streams, or tasks of all queues
  const std::uint64_t framesPerStep_;
  const std::int64_t origin_;
  mutable std::atomic<std::uint64_t> tail_{0};  // of the ring, as it was read last
  const std::shared_ptr<const Clock> clock_;
  const WhenTraceIsFull whenFull_;
};

}  // namespace

FrameRings::FrameRings(std::uint64_t framesPerStep) : shared_(std::make_shared<SharedFrames>()) {
  shared_->content->framesPerStep = framesPerStep;
}

void FrameRings::begin(nanoseconds origin) { shared_->content->origin = origin.count(); }

std::shared_ptr<TracedStream> FrameRings::addStream(const std::string& name, std::shared_ptr<const Clock> clock,
                                                    WhenTraceIsFull whenFull) {
  return addRing(TracedKind::kFrames, name, std::move(clock), whenFull);
}

std::shared_ptr<TracedStream> FrameRings::addQueue(const std::string& name, std::shared_ptr<const Clock> clock,
                                                   WhenTraceIsFull whenFull) {
  return addRing(TracedKind::kTasks, name, std::move(clock), whenFull);
}

std::shared_ptr<TracedStream> FrameRings::addRing(TracedKind kind, const std::string& name,
                                                  std::shared_ptr<const Clock> clock, WhenTraceIsFull whenFull) {
  const std::lock_guard lock(adding_);
  SharedFrames::Content& all = *shared_->content;
  const std::uint64_t index = load(all.streams);
  if (index >= kMaxStreams) {
    count(all.withoutRing);
    return nullptr;
  }
  Ring& ring = all.rings[index];
  ring.kind = kind == TracedKind::kFrames ? 0 : 1;
  ring.nameSize = std::min(name.size(), kMaxName);
  std::memcpy(ring.name, name.data(), ring.nameSize);
  // In virtual time, where frames wait for room, this would only take real time.
  if (whenFull == WhenTraceIsFull::kLose) makeResident(ring);
  store(all.streams, index + 1, std::memory_order_release);
  return std::make_shared<StreamOfRing>(shared_, ring, std::move(clock), whenFull);
}

std::span<std::byte> FrameRings::memory() const {
  return {reinterpret_cast<std::byte*>(shared_->content), sizeof *shared_->content};
}

FrameDrain::FrameDrain(const FrameRings& rings) : shared_(rings.shared_) {}

void FrameDrain::findStreams() {
  SharedFrames::Content& all = *shared_->content;
  const std::uint64_t count =
      std::min<std::uint64_t>(load(all.streams, std::memory_order_acquire), FrameRings::kMaxStreams);
  while (streams_.size() < count) {
    Ring& ring = all.rings[streams_.size()];
    const std::string name(ring.name, std::min<std::uint64_t>(load(ring.nameSize), FrameRings::kMaxName));
    Stream stream;
    stream.name = name;
    stream.kind = kindIn(ring);
    const auto isTaken = [&stream](const Stream& one) { return one.kind == stream.kind && one.name == stream.name; };
    for (int number = 2; std::any_of(streams_.begin(), streams_.end(), isTaken); ++number) {
      stream.name = name + " (" + std::to_string(number) + ")";
    }
    streams_.push_back(std::move(stream));
  }
}

bool FrameDrain::drain(bool isLast, const Take& take) {
  findStreams();
  bool isUrgent = false;
  for (std::size_t i = 0; i < streams_.size(); ++i) isUrgent = drainOne(i, isLast, take) || isUrgent;
  return isUrgent;
}

namespace {

// What became of a frame that is to be taken.
enum class Taken { kNotYet, kMissing, kDelivered, kReturned };

// Takes the frame in that place. `mustNotStay`: even if it was not handed back; `isLast`: even if it never arrived.
Taken takeFrom(Slot& slot, std::uint64_t place, bool mustNotStay, bool isLast) {
  for (int tries = 0; tries < 3; ++tries) {
    const std::uint64_t state = load(slot.state, std::memory_order_acquire);
    if (state == stateOf(place, Phase::kReturned)) return Taken::kReturned;
    if (state == stateOf(place, Phase::kReturning)) return isLast ? Taken::kDelivered : Taken::kNotYet;
    if (state != stateOf(place, Phase::kDelivered)) return isLast ? Taken::kMissing : Taken::kNotYet;
    if (!mustNotStay) return Taken::kNotYet;
    if (change(slot.state, state, stateOf(place, Phase::kTaken))) return Taken::kDelivered;
  }
  return Taken::kNotYet;  // it is being handed back
}

TracedFrame frameIn(Slot& slot, bool isReturned) {
  const auto timeIn = [](std::int64_t& word) { return std::clamp(load(word), -kMaxTraced, kMaxTraced); };
  TracedFrame frame{std::clamp<std::int64_t>(load(slot.number), 0, kMaxTraced), timeIn(slot.captured),
                    timeIn(slot.delivered), std::nullopt};
  if (isReturned) frame.returned = timeIn(slot.returned);
  return frame;
}

}  // namespace

bool FrameDrain::drainOne(std::size_t index, bool isLast, const Take& take) {
  Ring& ring = shared_->content->rings[index];
  Stream& stream = streams_[index];
  // Not more than the ring holds, whatever the other process wrote.
  std::uint64_t waiting =
      std::min<std::uint64_t>(load(ring.head, std::memory_order_acquire) - stream.tail, FrameRings::kFramesOfRing);
  const std::uint64_t begin = stream.tail;
  for (; waiting > 0; --waiting, ++stream.tail) {
    Slot& slot = ring.slot(stream.tail);
    const Taken taken = takeFrom(slot, stream.tail, isLast || waiting > FrameRings::kFramesOfRing / 2, isLast);
    if (taken == Taken::kNotYet) break;
    const TracedFrame frame = frameIn(slot, taken == Taken::kReturned);
    const std::uint64_t step = load(slot.step);
    if (taken == Taken::kMissing || frame.delivered < stream.delivered || !std::has_single_bit(step)) {
      ++stream.lost;
      continue;
    }
    stream.delivered = frame.delivered;
    take(index, frame, step);
  }
  store(ring.tail, stream.tail, std::memory_order_release);
  return stream.tail - begin > FrameRings::kFramesOfRing / 16;
}

std::uint64_t FrameDrain::takeLost(std::size_t index) {
  Stream& stream = streams_[index];
  stream.lostThere = std::max(stream.lostThere, load(shared_->content->rings[index].lost));
  const std::uint64_t lost = stream.lost + stream.lostThere;
  return lost - std::exchange(stream.lostBefore, lost);
}

std::uint64_t FrameDrain::withoutRing() const { return load(shared_->content->withoutRing); }

}  // namespace quazor
