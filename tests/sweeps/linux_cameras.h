// What the tests of the camera experiments on a fake video driver share.
#pragma once

#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/threads/thread_concurrency.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

// Sleeping advances the time of the fake cameras; `during` is called in the middle.
class FakeClock final : public Clock {
 public:
  explicit FakeClock(std::shared_ptr<FakeV4l2Api> kernel) : kernel_(std::move(kernel)) {}

  std::chrono::nanoseconds now() const override { return kernel_->now(); }
  Date date() const override { return Date(kernel_->now()); }
  void sleep(std::chrono::nanoseconds duration) override {
    kernel_->passTime(duration / 2);
    if (during) during();
    kernel_->passTime(duration - duration / 2);
  }

  std::function<void()> during;

 private:
  const std::shared_ptr<FakeV4l2Api> kernel_;
};

// The name of a test with single-planar cameras, or, as its second parameter, with multi-planar ones.
template <class Function>
std::string nodesName(const testing::TestParamInfo<Function>& test) {
  return test.index == 0 ? "SinglePlanar" : "Multiplanar";
}

struct Outcome {
  std::string error;  // empty if there is none
  std::unique_ptr<QZExperimentResult> result;

  double measured(std::string_view name) const {
    const Measurement* const one = result == nullptr ? nullptr : result->measurements().find(name);
    return one == nullptr ? -1000 : one->value();
  }
  std::int64_t counter(std::string_view camera, std::string_view name) const {
    const Value* const all = result->auxiliaryData().find(capture_key::ErrorCounters);
    return toSigned(entryOf(entryOf(all, camera), name));
  }
};

inline Outcome outcomeOf(QZExperiment& experiment, const Dictionary& parameters) {
  EXPECT_TRUE(experiment.setupWithParameters(parameters, nullptr, nullptr));
  DiagnosticErrorPtr error;
  Outcome outcome;
  outcome.result = experiment.run(&error);
  if (outcome.result == nullptr && error != nullptr) outcome.error = defaultText(error);
  return outcome;
}

}  // namespace quazor
