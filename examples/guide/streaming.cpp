// Streaming: how regularly a camera delivers its frames.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"
#include "platform/platform.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

constexpr std::string_view kLongest = "Longest Interval";
constexpr double kLongestMilliseconds = 50;  // that passes: at 30 frames per second, not even one frame is missing
constexpr std::uint64_t kFrames = 30;
constexpr std::chrono::seconds kTimeout{5};

constexpr std::string_view kFrameIntervalErrorDomain = "FrameIntervalErrorDomain";
constexpr int kNoCamera = 1;
constexpr int kNotStarted = 2;
constexpr int kTooFewFrames = 3;
constexpr int kMissingMeasurement = 6;  // of QZErrorDomain

// Receives the frames, on any thread of the capture service, perhaps several at once.
class FrameIntervals {
 public:
  explicit FrameIntervals(std::shared_ptr<Semaphore> done) : done_(std::move(done)) {}

  void add(MediaTime time) {
    const std::lock_guard lock(mutex_);
    if (last_) longest_ = std::max(longest_, time.seconds() - last_->seconds());
    last_ = time;
    if (++count_ == kFrames) done_->signal();
  }

  // In milliseconds; nothing if there were too few frames.
  std::optional<double> longest() const {
    const std::lock_guard lock(mutex_);
    return count_ < kFrames ? std::nullopt : std::optional(longest_ * 1000);
  }

 private:
  const std::shared_ptr<Semaphore> done_;
  mutable std::mutex mutex_;
  std::uint64_t count_ = 0;
  std::optional<MediaTime> last_;
  double longest_ = 0;  // seconds
};

// Gives the device back on every path: stops its streams and releases their control.
class InvalidatedAtEnd {
 public:
  explicit InvalidatedAtEnd(std::shared_ptr<CaptureDevice> device) : device_(std::move(device)) {}
  InvalidatedAtEnd(const InvalidatedAtEnd&) = delete;
  InvalidatedAtEnd& operator=(const InvalidatedAtEnd&) = delete;
  ~InvalidatedAtEnd() { static_cast<void>(device_->invalidate(nullptr)); }

 private:
  const std::shared_ptr<CaptureDevice> device_;
};

class FrameIntervalExperiment final : public QZExperiment {
 public:
  explicit FrameIntervalExperiment(const Platform& platform = installedPlatform())
      : capture_(platform.capture), concurrency_(platform.concurrency) {}

  QZDescription experimentDescription() const override {
    return QZDescription("Take 30 frames of the back camera and measure the longest time between two.");
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    DiagnosticErrorPtr reason;
    const auto plugIn = capture_->createPlugIn();
    const auto device = plugIn == nullptr ? nullptr : plugIn->device(&reason);
    const auto stream = device == nullptr ? nullptr : backCamera(*device, &reason);
    if (stream == nullptr) {
      fail(error, kFrameIntervalErrorDomain, kNoCamera, reason, "There is no back camera.");
      return nullptr;
    }
    const InvalidatedAtEnd invalidated(device);

    const auto done = concurrency_->makeSemaphore(0);
    const auto intervals = std::make_shared<FrameIntervals>(done);
    if (!start(*device, stream, intervals, &reason)) {
      fail(error, kFrameIntervalErrorDomain, kNotStarted, reason, "The camera cannot be started.");
      return nullptr;
    }
    const auto timer = concurrency_->makeSerialQueue("frame_interval.timeout", QualityOfService::kDefault);
    timer->asyncAfter(kTimeout, [done] { done->signal(); });
    done->wait();
    static_cast<void>(stream->stop(nullptr));  // from here on no handler runs

    const std::optional<double> longest = intervals->longest();
    if (!longest) {
      fail(error, kFrameIntervalErrorDomain, kTooFewFrames, nullptr, "Fewer than %@ frames in %@ s.", kFrames,
           static_cast<std::int64_t>(kTimeout.count()));
      return nullptr;
    }
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kLongest, Measurement(*longest, QZUnit::unitWithSymbol("ms")));
    return result;
  }

 private:
  static std::shared_ptr<CaptureStream> backCamera(CaptureDevice& device, DiagnosticErrorPtr* reason) {
    const std::optional<CaptureStreams> streams = device.streams(reason);
    if (!streams) return nullptr;
    for (const std::shared_ptr<CaptureStream>& stream : *streams) {
      const std::optional<Value> port = stream->valueForProperty(capture_key::PortType, reason);
      if (port && port->string() != nullptr && *port->string() == port_type::BackFacingCamera) return stream;
    }
    return nullptr;
  }

  static bool start(CaptureDevice& device, const std::shared_ptr<CaptureStream>& stream,
                    const std::shared_ptr<FrameIntervals>& intervals, DiagnosticErrorPtr* reason) {
    const std::string output(capture_key::PrimaryScaler);
    const auto handler = std::make_shared<PixelBufferHandler>(
        [intervals](PixelBuffer& /*buffer*/, MediaTime time) { intervals->add(time); });
    const Dictionary handlers{{std::string(capture_key::PixelBufferHandler), handler}};
    return device.requestControlOfStreams({stream}, reason) &&
           stream->setValue(30, capture_key::MinimumFrameRate, reason) &&
           stream->setValue(30, capture_key::MaximumFrameRate, reason) &&
           stream->setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, reason) &&
           stream->setValue(Dictionary{{output, handlers}}, capture_key::VideoOutputHandlers, reason) &&
           stream->start(reason);
  }

  const std::shared_ptr<CaptureService> capture_;
  const std::shared_ptr<Concurrency> concurrency_;
};

class FrameIntervalAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override {
    return QZDescription("Ensure that no frame was late or missing.");
  }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    const Measurement* const longest = result.measurements().find(kLongest);
    if (longest == nullptr) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", kLongest);
      return nullptr;
    }
    QZLimit limit("IntervalLimit");
    limit.setUpperBound(std::make_shared<QZBound>(Measurement(kLongestMilliseconds, longest->unit()), false));
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back(kLongest, *longest);
    analysis->measuredResults().back().setLimit(std::move(limit));
    return analysis;
  }
};

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("FrameIntervalExperiment", [] { return std::make_shared<FrameIntervalExperiment>(); });
  lab.addAnalysisWithName("FrameIntervalAnalysis", [] { return std::make_shared<FrameIntervalAnalysis>(); });
  lab.addDiagnosticWithName("FrameIntervalDiagnostic", "Ensure that the back camera delivers its frames regularly.",
                            "FrameIntervalExperiment", "FrameIntervalAnalysis");
}

}  // namespace
