// A user of all cameras of a simulated phone, who notes each frame with the phone's clock.
#pragma once

#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "host/device/traced_frame.h"
#include "platform/platform.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

namespace quazor {

// What the user saw of one camera.
struct SeenStream {
  std::string name;
  std::vector<TracedFrame> frames;
};

// It has a phone of its own, in virtual time. It keeps some buffers for a while or for ever and takes its time with
// others.
// Thread: one at a time.
class CameraUser {
 public:
  // The seed determines the phone's course of events, its clock and what the user does.
  CameraUser(const Scenario& scenario, std::uint64_t seed);

  SimulatedPhone& phone() { return phone_; }
  // Streams twice with all cameras of the phone. All times count from the creation of the user. Calls that fail are
  // left at that; one that never returns throws SimulationStall.
  void stream(const Platform& platform);

  // In the order of the scenario.
  const std::vector<SeenStream>& seen() const { return seen_; }

 private:
  struct Use {
    std::chrono::nanoseconds started{};
    std::map<PixelBuffer*, std::size_t> kept;  // buffers that were not handed back, and their frames
    std::vector<std::uint64_t> held;           // the numbers of the frames whose buffers are in use
  };

  void handle(CaptureStream& stream, std::size_t index);
  void take(std::size_t index, PixelBuffer& buffer, MediaTime time);
  std::int64_t numberOfNewFrame(std::size_t index);
  void forget(Use& use, std::int64_t number);
  std::chrono::nanoseconds now() const { return clock_->now() - origin_; }

  std::mt19937_64 random_;
  SimulatedPhone phone_;
  const std::shared_ptr<Clock> clock_;
  std::chrono::nanoseconds origin_{};
  std::vector<SeenStream> seen_;
  std::vector<Use> uses_;  // of the same streams
};

}  // namespace quazor
