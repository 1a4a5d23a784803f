#include "diagnostics/sensor_images/nimbe_image_experiment.h"

#include "diagnostics/sensor_images/nimbe_image_errors.h"

#include <chrono>
#include <optional>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kImagesParameter = "images";
constexpr std::string_view kTimeoutParameter = "timeout";
constexpr std::string_view kImagesEntry = "images";

// The property in which the framebuffer driver reports the power of the panel.
constexpr std::string_view kDisplayProperty = "DSPLY Debug Info";
constexpr std::string_view kPowerInfo = "DSPLY power info";
constexpr std::string_view kPanelPower = "DSPLY power info panel";

constexpr std::int64_t kObserverOrder = 0;

// Adds an observer for its own lifetime, so that it is removed even if an exception ends the run.
class AddedObserver {
 public:
  AddedObserver(RunLoop& loop, std::shared_ptr<RunLoopObserver> observer)
      : loop_(loop), observer_(std::move(observer)) {
    loop_.addObserver(observer_, kRunLoopCommonModes);
  }
  AddedObserver(const AddedObserver&) = delete;
  AddedObserver& operator=(const AddedObserver&) = delete;
  ~AddedObserver() { loop_.removeObserver(observer_, kRunLoopCommonModes); }

 private:
  RunLoop& loop_;
  std::shared_ptr<RunLoopObserver> observer_;
};

bool failDisplay(DiagnosticErrorPtr* error, MessageFormat<> message) {
  fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kDisplayNotPowered, nullptr, message);
  return false;
}

bool failWithoutRunLoop(DiagnosticErrorPtr* error) {
  fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kNoRunLoop, nullptr,
       "Nimbe is a HID device that requires a current run loop.");
  return false;
}

Dictionary entriesOf(const QZNimbeCorvaneImage& image) {
  Dictionary entries;
  entries.reserve(5);
  entries.set("frameID", image.frameID());
  entries.set("dScanI", image.dScanI());
  entries.set("dScanQ", image.dScanQ());
  entries.set("tmonDataInC", image.tmonDataInC());
  entries.set("timestampInMilliseconds", image.timestampInMilliseconds());
  return entries;
}

}  // namespace

QZNimbeImageExperiment::QZNimbeImageExperiment(Platform platform)
    : QZNimbeImageExperiment(std::move(platform),
                             [](const Platform& services) { return std::make_shared<QZNimbeImageStream>(services); }) {}

QZNimbeImageExperiment::QZNimbeImageExperiment(Platform platform, StreamFactory makeStream)
    : _platform(std::move(platform)),
      _makeStream(std::move(makeStream)),
      _done_seamphore(_platform.concurrency->makeSemaphore(0)) {}

QZDescription QZNimbeImageExperiment::experimentDescription() const {
  QZDescription description("Stream Nimbe in active mode and capture frames.");
  description.addParameter(QZNumberParameter("The number of frames to capture.", true), kImagesParameter);
  description.addParameter(QZNumberParameter("The timeout in seconds.", true), kTimeoutParameter);
  return description;
}

bool QZNimbeImageExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                                 DiagnosticErrorPtr* error) {
  if (!displayIsPowered(error)) return false;
  _runLoop = _platform.runLoops->currentRunLoop();
  if (_runLoop == nullptr) return failWithoutRunLoop(error);
  _imagesToCapture = toUnsigned(parameters.find(kImagesParameter));
  _timeoutInSeconds = toUnsigned(parameters.find(kTimeoutParameter));
  return true;
}

bool QZNimbeImageExperiment::displayIsPowered(DiagnosticErrorPtr* error) const {
  const std::shared_ptr<Display> display = _platform.framebuffer->mainDisplay();
  if (display == nullptr) {
    return failDisplay(error, "Could not get the main display to determine device power state.");
  }
  const std::shared_ptr<RegistryService> service = display->registryService();
  if (service == nullptr) {
    return failDisplay(error, "Could not get the frame buffer to determine device power state.");
  }
  const std::optional<Value> property = service->registryProperty(kDisplayProperty);
  const Value* power = entryOf(entryOf(pointerTo(property), kPowerInfo), kPanelPower);
  if (power == nullptr) return failDisplay(error, "Could not find the display power state.");
  if (!toBoolean(power)) return failDisplay(error, "The display is not powered.");
  return true;
}

std::unique_ptr<QZExperimentResult> QZNimbeImageExperiment::run(DiagnosticErrorPtr* error) {
  if (_runLoop == nullptr) {  // setup was not called
    failWithoutRunLoop(error);
    return nullptr;
  }
  _stream = _makeStream(_platform);
  if (_stream == nullptr) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kNoDevice, nullptr,
         "Failed to create nimbe stream.");
    return nullptr;
  }
  _stream->setDelegate(weak_from_this());
  if (!_stream->openWithRunLoop(*_runLoop, error)) return nullptr;

  if (_runLoopOnce() == RunLoopResult::kTimedOut) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kTimedOut, nullptr,
         "Timed out after %lu seconds.", _timeoutInSeconds);
    return nullptr;
  }
  if (_asyncError != nullptr) {
    storeError(error, _asyncError);
    return nullptr;
  }
  return _buildResult();
}

// An observer that closes the stream at the end of the run.
std::shared_ptr<RunLoopObserver> QZNimbeImageExperiment::_makeObserver() {
  const auto closeAtExit = [experiment = weak_from_this()](RunLoopActivities activity) {
    if (activity != kRunLoopExit) return;
    if (const auto held = experiment.lock()) {
      held->_stream->setDelegate({});
      held->_stream->close();
    }
  };
  return _runLoop->makeObserver(kRunLoopAllActivities, true, kObserverOrder, closeAtExit);
}

RunLoopResult QZNimbeImageExperiment::_runLoopOnce() {
  const AddedObserver observer(*_runLoop, _makeObserver());
  const std::chrono::nanoseconds limit = nanosecondsFromSeconds(static_cast<double>(_timeoutInSeconds));
  return _runLoop->runInMode(kRunLoopDefaultMode, limit, false);
}

std::unique_ptr<QZExperimentResult> QZNimbeImageExperiment::_buildResult() const {
  auto result = std::make_unique<QZExperimentResult>();
  Array images;
  images.reserve(_images.size());
  for (const auto& image : _images) images.emplace_back(entriesOf(*image));
  result->auxiliaryData().set(kImagesEntry, std::move(images));
  return result;
}

void QZNimbeImageExperiment::handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) {
  _images.push_back(std::move(image));
  if (_images.size() >= _imagesToCapture) _runLoop->stop();
}

void QZNimbeImageExperiment::streamDidError(DiagnosticErrorPtr error) {
  _asyncError = std::move(error);
  _runLoop->stop();
}

}  // namespace quazor
