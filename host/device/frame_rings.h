// FrameRings: the frames of a phone's streams, and the tasks of queues, in memory that a process shares with the
// children that it creates later.
#pragma once

#include "backends/capture/frame_trace.h"
#include "host/device/traced_frame.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <span>
#include <string>
#include <vector>

namespace quazor {

struct SharedFrames;

// The side of the phone. A stream has a ring of its own, without locks, from which FrameDrain takes the frames, so that
// they outlast a crash. Several threads may deliver frames of one stream: each takes the next place and reads the clock
// in one step, which it repeats if another thread was quicker. So the frames are in the order of their delivery.
// Thread: any, but for begin(), which is called first.
class FrameRings final : public FrameTrace {
 public:
  static constexpr std::size_t kMaxStreams = 64;  // with queues
  static constexpr std::size_t kMaxName = 256;    // bytes; the rest of a longer name is left out
  static constexpr std::size_t kFramesOfRing = 8192;

  // After that many frames of all streams only every second frame of a stream is told, after as many again every
  // fourth, and so on; 0: every frame. Tasks are counted in the same way, on their own. Throws std::system_error if the
  // memory cannot be mapped.
  explicit FrameRings(std::uint64_t framesPerStep);

  // The time by the phone's clock from which all times count. Called before addStream().
  void begin(std::chrono::nanoseconds origin);

  std::shared_ptr<TracedStream> addStream(const std::string& name, std::shared_ptr<const Clock> clock,
                                          WhenTraceIsFull whenFull) override;
  // The same for the tasks of a queue, each of which is told as TracedKind::kTasks says.
  std::shared_ptr<TracedStream> addQueue(const std::string& name, std::shared_ptr<const Clock> clock,
                                         WhenTraceIsFull whenFull);

  // All that the other process can write to.
  std::span<std::byte> memory() const;

 private:
  friend class FrameDrain;

  std::shared_ptr<TracedStream> addRing(TracedKind kind, const std::string& name, std::shared_ptr<const Clock> clock,
                                        WhenTraceIsFull whenFull);

  const std::shared_ptr<SharedFrames> shared_;
  std::mutex adding_;
};

// The side of the host. The other process may write anything to the memory; whatever it writes, the frames of a stream
// have times within kMaxTraced and are in the order of their delivery.
// Thread: one at a time.
class FrameDrain {
 public:
  using Take = std::function<void(std::size_t stream, const TracedFrame& frame, std::uint64_t step)>;

  explicit FrameDrain(const FrameRings& rings);

  // Passes on frames that were handed back and those before them. Those that were not stay, unless half of the ring is
  // full or, if `isLast`, everything is taken. Returns true if there were so many that the next call should come soon.
  bool drain(bool isLast, const Take& take);

  // The name of a stream whose frames were passed on; no two streams of a kind have the same.
  const std::string& nameOf(std::size_t stream) const { return streams_[stream].name; }
  TracedKind kindOf(std::size_t stream) const { return streams_[stream].kind; }
  // How many streams there are.
  std::size_t size() const { return streams_.size(); }
  // The number of frames of the stream that were lost since the last call.
  std::uint64_t takeLost(std::size_t stream);
  // The number of streams and queues that there was no ring for.
  std::uint64_t withoutRing() const;

 private:
  struct Stream {
    std::string name;
    TracedKind kind = TracedKind::kFrames;
    std::uint64_t tail = 0;  // the place of the next frame
    std::int64_t delivered = -kMaxTraced;
    std::uint64_t lost = 0;        // by this side
    std::uint64_t lostThere = 0;   // as the other side counted
    std::uint64_t lostBefore = 0;  // of both, as it was told
  };

  void findStreams();
  bool drainOne(std::size_t index, bool isLast, const Take& take);

  const std::shared_ptr<SharedFrames> shared_;
  std::vector<Stream> streams_;
};

}  // namespace quazor
