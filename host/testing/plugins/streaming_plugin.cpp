// A plug-in for tests of the host: its diagnostic takes frames from the phone's first camera.
#include "host/testing/plugins/fake_diagnostic.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"
#include "platform/platform.h"

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

namespace quazor::fake {

namespace {

// Parameters: "frameCount", the number of frames to wait for; "timeout", which has no effect.
class StreamingExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("Takes frames.");
    description.addParameter(QZNumberParameter("How many frames it takes.", true), "frameCount");
    description.addParameter(QZNumberParameter("Not used.", true), "timeout");
    return description;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    wanted_ = toUnsigned(parameters.find("frameCount"));
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    const Platform& platform = installedPlatform();
    const std::shared_ptr<CaptureDevice> device = platform.capture->createPlugIn()->device(error);
    const CaptureStreams streams = *device->streams(error);
    const auto frames = std::make_shared<std::atomic<std::uint64_t>>(0);
    const auto handler = std::make_shared<PixelBufferHandler>([frames](PixelBuffer&, MediaTime) { ++*frames; });
    const std::string output(capture_key::PrimaryScaler);
    const Dictionary handlers{{std::string(capture_key::PixelBufferHandler), handler}};
    const bool isStarted =
        device->requestControlOfStreams(streams, error) &&
        streams[0]->setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, error) &&
        streams[0]->setValue(Dictionary{{output, handlers}}, capture_key::VideoOutputHandlers, error) &&
        streams[0]->start(error);
    if (!isStarted) return nullptr;
    while (*frames < wanted_) platform.clock->sleep(std::chrono::milliseconds(5));
    static_cast<void>(device->invalidate(error));
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set("Count",
                               Measurement(static_cast<double>(frames->load()), QZDimensionlessUnit::frames()));
    return result;
  }

 private:
  std::uint64_t wanted_ = 0;
};

[[gnu::constructor]] void registerStreaming() { registerDiagnostic<StreamingExperiment>("Streaming", "Takes frames."); }

}  // namespace

}  // namespace quazor::fake
