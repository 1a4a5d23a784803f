// QZNimbeImageExperiment: captures scan images of the display sensor.
#pragma once

#include "contract/diagnostic_contract.h"
#include "diagnostics/sensor_images/nimbe_image.h"
#include "diagnostics/sensor_images/nimbe_image_stream.h"
#include "platform/platform.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <vector>

namespace quazor {

// Streams the sensor on the calling thread's run loop until the requested images have arrived, the device fails or the
// timeout expires. The entry "images" of the auxiliary data has one dictionary per image, in the order of arrival:
// "frameID", "dScanI", "dScanQ", "tmonDataInC" and "timestampInMilliseconds".
//
// Must be owned by a std::shared_ptr: the stream and the loop's observer hold it weakly.
//
// Thread: one; setup and run on the same one, whose loop makes all other calls during the run. After the run the stream
// stays referenced, closed.
class QZNimbeImageExperiment final : public QZExperiment,
                                     public QZNimbeImageStreamDelegate,
                                     public std::enable_shared_from_this<QZNimbeImageExperiment> {
 public:
  // Creates the stream of a run; may return null.
  using StreamFactory = std::function<std::shared_ptr<QZNimbeImageStream>(const Platform& platform)>;

  explicit QZNimbeImageExperiment(Platform platform = installedPlatform());
  QZNimbeImageExperiment(Platform platform, StreamFactory makeStream);

  QZDescription experimentDescription() const override;
  // Parameters: "images", the number to capture, and "timeout", in seconds. Fails with codes 1 and 2 of
  // QZNimbeImageExperimentErrorDomain.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Blocks at most until the timeout. May return more images than requested, or fewer if the loop has no sources left.
  // Fails with codes 1 and 3 to 6 of QZNimbeImageExperimentErrorDomain, or with the error of a device that fails while
  // streaming. Throws std::logic_error if the system has no HID manager.
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;

  void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) override;
  void streamDidError(DiagnosticErrorPtr error) override;

 private:
  bool displayIsPowered(DiagnosticErrorPtr* error) const;
  std::shared_ptr<RunLoopObserver> _makeObserver();
  RunLoopResult _runLoopOnce();
  std::unique_ptr<QZExperimentResult> _buildResult() const;

  Platform _platform;
  StreamFactory _makeStream;
  std::shared_ptr<QZNimbeImageStream> _stream;
  std::vector<std::shared_ptr<QZNimbeCorvaneImage>> _images;
  std::uint64_t _imagesToCapture = 0;
  std::uint64_t _timeoutInSeconds = 0;
  std::shared_ptr<Semaphore> _done_seamphore;  // never signalled and never waited for
  DiagnosticErrorPtr _asyncError;              // the error of a failed stream
  RunLoop* _runLoop = nullptr;                 // not owned
};

}  // namespace quazor
