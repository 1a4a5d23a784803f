#include "tests/sweeps/projector_virtual_run.h"

#include "backends/simulated/time/simulation_stall.h"
#include "backends/simulated/time/virtual_services.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "tests/support/run_transcript.h"

#include <chrono>
#include <map>
#include <stdexcept>
#include <string>
#include <string_view>

namespace quazor {

namespace {

class WatchedSemaphore final : public Semaphore {
 public:
  WatchedSemaphore(std::shared_ptr<Semaphore> semaphore, RunTranscript& transcript)
      : semaphore_(std::move(semaphore)), transcript_(transcript) {}

  void signal() override {
    transcript_.addCall("Semaphore.signal", "semaphore", "", true);
    semaphore_->signal();
  }
  void wait() override { semaphore_->wait(); }

 private:
  std::shared_ptr<Semaphore> semaphore_;
  RunTranscript& transcript_;
};

// A separate timer posts the delayed tasks, at any time after they are due.
class SlowTimerQueue final : public SerialQueue {
 public:
  SlowTimerQueue(std::shared_ptr<SerialQueue> queue, VirtualScheduler& scheduler)
      : queue_(std::move(queue)), scheduler_(scheduler), timer_(scheduler.makeStrand()) {}

  void async(Task task) override { queue_->async(std::move(task)); }
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override {
    scheduler_.submitAt(scheduler_.after(delay), timer_,
                        [queue = queue_, late = std::move(task)]() mutable { queue->async(std::move(late)); });
  }

 private:
  std::shared_ptr<SerialQueue> queue_;
  VirtualScheduler& scheduler_;
  std::shared_ptr<VirtualScheduler::Strand> timer_;
};

class WatchedConcurrency final : public Concurrency {
 public:
  WatchedConcurrency(const std::shared_ptr<VirtualScheduler>& scheduler, RunTranscript& transcript, bool timerIsSlow)
      : scheduler_(*scheduler), concurrency_(scheduler), transcript_(transcript), timerIsSlow_(timerIsSlow) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override {
    std::shared_ptr<SerialQueue> queue = concurrency_.makeSerialQueue(label, quality);
    if (timerIsSlow_) queue = std::make_shared<SlowTimerQueue>(std::move(queue), scheduler_);
    return queue;
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override {
    return std::make_shared<WatchedSemaphore>(concurrency_.makeSemaphore(count), transcript_);
  }

 private:
  VirtualScheduler& scheduler_;
  VirtualConcurrency concurrency_;
  RunTranscript& transcript_;
  bool timerIsSlow_;
};

std::vector<std::string> linesOf(const std::string& text) {
  std::vector<std::string> lines;
  for (std::size_t at = 0; at < text.size();) {
    const std::size_t end = text.find('\n', at);
    lines.push_back(text.substr(at, end - at));
    at = end + 1;
  }
  return lines;
}

// The camera of a plan in virtual time.
class PlannedCamera {
 public:
  PlannedCamera(const ProjectorPlan& plan, std::shared_ptr<VirtualScheduler> scheduler, RunTranscript& transcript)
      : plan_(plan), scheduler_(std::move(scheduler)), transcript_(transcript) {
    stream_->stops = plan.stops;
    if (!plan.countersAreRead) stream_->errorCounters.reset();
    stream_->onCall = [this](std::string_view call) { answer(call); };
    for (std::size_t i = 0; i < plan.deliveries.size(); ++i) {
      buffers_.push_back(std::make_unique<FakePixelBuffer>(plan.deliveries[i].kind));
      buffers_.back()->onRead = [this, name = "frame " + std::to_string(i)] {
        takeTime();
        transcript_.addCall("PixelBuffer.attachment", name, "MetadataDictionary", true);
      };
    }
  }

  const std::shared_ptr<FakeStream>& stream() const { return stream_; }
  const std::vector<std::size_t>& delivered() const { return delivered_; }
  std::vector<int> references() const {
    std::vector<int> references;
    for (const auto& buffer : buffers_) references.push_back(buffer->references());
    return references;
  }

 private:
  void answer(std::string_view call) {
    if (call == "start") startDelivery();
    if (call == "get ErrorCounters") {
      transcript_.addCall("CaptureStream.valueForProperty", "stream", "ErrorCounters", true);
    }
    if (call == "stopped") {
      transcript_.addCall("CaptureStream.stop", "stream", "", plan_.stops);
    } else {
      takeTime();
    }
  }

  // Lets any number of other possible events happen first.
  void takeTime() {
    if (plan_.cameraIsSlow) scheduler_->blockUntil([] { return true; }, "nothing");
  }

  void startDelivery() {
    std::map<std::size_t, std::shared_ptr<VirtualScheduler::Strand>> threads;
    for (std::size_t i = 0; i < plan_.deliveries.size(); ++i) {
      auto& thread = threads[plan_.deliveries[i].thread];
      if (thread == nullptr) thread = scheduler_->makeStrand();
      scheduler_->submitAt(scheduler_->after(plan_.deliveries[i].at), thread, [this, i] { deliver(i); });
    }
  }

  void deliver(std::size_t number) {
    const MediaTime time{static_cast<std::int64_t>(number)};
    const bool isDelivered = plan_.deliveries[number].isEvent
                                 ? stream_->deliverEvent(static_cast<std::int32_t>(number), time)
                                 : stream_->deliver(*buffers_[number], time);
    if (isDelivered) delivered_.push_back(number);
  }

  const ProjectorPlan& plan_;
  std::shared_ptr<VirtualScheduler> scheduler_;
  RunTranscript& transcript_;
  std::shared_ptr<FakeStream> stream_ = std::make_shared<FakeStream>();
  std::vector<std::unique_ptr<FakePixelBuffer>> buffers_;
  std::vector<std::size_t> delivered_;
};

}  // namespace

std::size_t EveryOrder::choose(std::size_t count) {
  if (at_ == choices_.size()) choices_.emplace_back(0, count);
  const auto& [choice, possibilities] = choices_[at_++];
  if (possibilities != count) throw std::logic_error("The run is not the same when it is repeated.");
  return choice;
}

bool EveryOrder::toNextOrder() {
  at_ = 0;
  while (!choices_.empty() && choices_.back().first + 1 == choices_.back().second) choices_.pop_back();
  if (choices_.empty()) return false;
  ++choices_.back().first;
  return true;
}

ProjectorRun runVirtually(const ProjectorPlan& plan, const std::shared_ptr<VirtualScheduler>& scheduler) {
  static const FakeReports::Descriptions channels = fakeChannels(1);
  const auto clock = std::make_shared<VirtualClock>(scheduler);
  RunTranscript transcript;
  PlannedCamera camera(plan, scheduler, transcript);
  auto experiment = std::make_shared<QZTesselFaultExperiment>(
      Platform{makeFakeCapture(camera.stream()), clock,
               std::make_shared<WatchedConcurrency>(scheduler, transcript, plan.timerIsSlow),
               std::make_shared<FakeReports>(channels, 5)});
  const std::weak_ptr<QZTesselFaultExperiment> watch = experiment;

  ProjectorRun run;
  run.error = callersOwnError();
  static_cast<void>(
      experiment->setupWithParameters({{"frameCount", plan.stopCount}, {"timeout", plan.timeout}}, nullptr, nullptr));
  try {
    run.result = experiment->run(&run.error);
    transcript.addCall("Host.release", "host", "", true);
    experiment.reset();
    clock->sleep(std::chrono::hours(1));
    run.experimentIsGone = watch.expired();
  } catch (const SimulationStall& stall) {
    transcript.addCall("Simulation.stall", "simulation", stall.what(), false);
  }
  scheduler->discardPending();
  run.lines = linesOf(transcript.text());
  run.delivered = camera.delivered();
  run.references = camera.references();
  return run;
}

}  // namespace quazor
