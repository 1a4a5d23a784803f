#include "host/run/traced_run.h"

#include "host/run/frame_teller.h"

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <thread>
#include <variant>

namespace quazor {

namespace {

using namespace std::chrono_literals;

// Tells the frames on a thread of its own, and the last of them before the run is complete.
// Thread: one at a time.
class TracedEvents final : public RunEventSink {
 public:
  TracedEvents(const FrameRings& rings, RunEventSink& events) : events_(events), teller_(rings, events) {
    thread_ = std::thread([this] { tellNowAndThen(); });
  }
  ~TracedEvents() override { stop(); }

  void onEvent(const RunEvent& event) override {
    if (std::holds_alternative<DiagnosticCompleted>(event)) {
      stop();
      teller_.end();
    }
    events_.onEvent(event);
  }

 private:
  void tellNowAndThen() {
    std::unique_lock lock(mutex_);
    std::chrono::milliseconds pause = 100ms;
    while (!wake_.wait_for(lock, pause, [this] { return stopped_; })) pause = teller_.update() ? 1ms : 100ms;
  }

  void stop() {
    if (!thread_.joinable()) return;
    {
      const std::lock_guard lock(mutex_);
      stopped_ = true;
    }
    wake_.notify_one();
    thread_.join();
  }

  RunEventSink& events_;
  FrameTeller teller_;
  std::mutex mutex_;
  std::condition_variable wake_;
  bool stopped_ = false;  // guarded by mutex_
  std::thread thread_;
};

}  // namespace

void runDiagnosticHere(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const RunOptions& options,
                       RunEventSink& events) {
  if (!options.trace.isOn) {
    runDiagnostic(diagnostic, parameters, options, events);
    return;
  }
  RunOptions traced = options;
  traced.frames = std::make_shared<FrameRings>(options.trace.framesPerStep);
  TracedEvents withFrames(*traced.frames, events);
  runDiagnostic(diagnostic, parameters, traced, withFrames);
}

}  // namespace quazor
