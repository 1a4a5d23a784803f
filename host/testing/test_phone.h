// A phone for tests of runs.
#pragma once

#include "host/device/phone.h"
#include "host/plugin/null_platform.h"

#include <chrono>
#include <memory>
#include <vector>

namespace quazor {

// A clock that advances only in sleep(). It starts at 7 s.
class ManualClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return time; }
  Date date() const override { return Date(time); }
  void sleep(std::chrono::nanoseconds duration) override { time += duration; }

  std::chrono::nanoseconds time = std::chrono::seconds(7);
};

// A phone with only a clock. It reports that one fault fired three times and that 17 frames were delivered.
class TestPhone : public Phone {
 public:
  Platform platform() const override {
    Platform platform = nullPlatform();
    platform.clock = clock_;
    return platform;
  }
  std::vector<DeclaredFault> faults() const override { return {{{{"operation", "x"}}, 3}}; }
  std::uint64_t framesDelivered() const override { return 17; }
  void traceFrames(FrameTrace& /*trace*/) override {}

 private:
  std::shared_ptr<Clock> clock_ = std::make_shared<ManualClock>();
};

}  // namespace quazor
