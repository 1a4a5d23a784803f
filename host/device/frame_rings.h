// FrameRings: the frames of a phone's streams in memory that a process shares with the children that it creates later.
#pragma once

#include "backends/capture/frame_trace.h"
#include "host/device/traced_frame.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace quazor {

struct SharedFrames;

// The side of the phone. A stream has a ring of its own, without locks, from which FrameDrain takes the frames, so that
// they outlast a crash. Several threads may deliver frames of one stream: each takes the next place and reads the clock
// in one step, which it repeats if another thread was quicker. So the frames are in the order of their delivery.
// Thread: one at a time; its streams any.
class FrameRings final : public FrameTrace {
 public:
  static constexpr std::size_t kMaxStreams = 64;
  static constexpr std::size_t kMaxName = 256;  // bytes; the rest of a longer name is left out
  static constexpr std::size_t kFramesOfRing = 8192;

  // After that many frames of all streams only every second frame of a stream is told, after as many again every
  // fourth, and so on; 0: every frame. Throws std::system_error if the memory cannot be mapped.
  explicit FrameRings(std::uint64_t framesPerStep);

  // The time by the phone's clock from which all times count. Called before addStream().
  void begin(std::chrono::nanoseconds origin);

  std::shared_ptr<TracedStream> addStream(const std::string& name, std::shared_ptr<const Clock> clock,
                                          WhenTraceIsFull whenFull) override;

  // All that the other process can write to.
  std::span<std::byte> memory() const;

 private:
  friend class FrameDrain;

  const std::shared_ptr<SharedFrames> shared_;
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

  // The name of a stream whose frames were passed on; no two streams have the same.
  const std::string& nameOf(std::size_t stream) const { return streams_[stream].name; }
  // How many streams there are.
  std::size_t size() const { return streams_.size(); }
  // The number of frames of the stream that were lost since the last call.
  std::uint64_t takeLost(std::size_t stream);
  // The number of streams that there was no ring for.
  std::uint64_t withoutRing() const;

 private:
  struct Stream {
    std::string name;
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
