// Runs the projector fault experiment with a timeout of about thirty years, ends the run with a frame, and exits while
// the timeout is pending. Prints the steady clock's nanoseconds at the end of the run.
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "tests/support/fake_camera.h"

#include <cstdio>
#include <memory>
#include <string_view>

int main() {
  using namespace quazor;
  // The experiment is never destroyed and may use its clock until the process ends.
  const auto clock = std::make_shared<RealClock>();
  const auto stream = std::make_shared<FakeStream>();
  FakePixelBuffer buffer;
  stream->onCall = [&buffer, frames = stream.get()](std::string_view call) {
    if (call == "start") frames->deliver(buffer, MediaTime{});
  };
  auto experiment = std::make_shared<QZTesselFaultExperiment>(
      Platform{makeFakeCapture(stream), clock, std::make_shared<ThreadConcurrency>(),
               std::make_shared<FakeReports>(fakeChannels(1), 5)});
  if (!experiment->setupWithParameters({{"frameCount", 1}, {"timeout", 1e9}}, nullptr, nullptr)) return 1;
  if (experiment->run(nullptr) == nullptr || !experiment->teardown(nullptr)) return 1;
  const std::weak_ptr<QZTesselFaultExperiment> watch = experiment;
  experiment.reset();
  if (watch.expired()) return 1;  // nothing was pending
  std::printf("%lld\n", static_cast<long long>(clock->now().count()));
  return 0;
}
