// QZNimbeImageStream: finds the display sensor among the HID devices, switches it to streaming, and delivers its
// images.
#pragma once

#include "contract/diagnostic_error.h"
#include "diagnostics/sensor_images/nimbe_image.h"
#include "platform/platform.h"

#include <cstdint>
#include <memory>
#include <span>
#include <utility>

namespace quazor {

// Receives the images and errors of a stream, on the thread that runs the stream's loop.
// Thread: the one of the stream's run loop.
class QZNimbeImageStreamDelegate {
 public:
  QZNimbeImageStreamDelegate() = default;
  QZNimbeImageStreamDelegate(const QZNimbeImageStreamDelegate&) = delete;
  QZNimbeImageStreamDelegate& operator=(const QZNimbeImageStreamDelegate&) = delete;
  virtual ~QZNimbeImageStreamDelegate();

  virtual void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) = 0;
  // Called when the device has failed; the stream is already closed.
  virtual void streamDidError(DiagnosticErrorPtr error) = 0;
};

// Must be owned by a std::shared_ptr: the device's callback holds it weakly, so it may be destroyed before the device.
//
// Thread: the one of the run loop that it is opened with. Reports arrive while the loop runs, and the delegate is
// called from their callback. It may then close the stream, replace itself or release the stream.
class QZNimbeImageStream final : public std::enable_shared_from_this<QZNimbeImageStream> {
 public:
  explicit QZNimbeImageStream(Platform platform = installedPlatform());

  // The delegate, held weakly; without one, images are dropped.
  std::shared_ptr<QZNimbeImageStreamDelegate> delegate() const { return _delegate.lock(); }
  void setDelegate(std::weak_ptr<QZNimbeImageStreamDelegate> delegate) { _delegate = std::move(delegate); }

  // Opens the only matching sensor, switches it to active power and to images only, and schedules it on the loop, which
  // must live until close(). Fails with codes 3, 4 and 5 of QZNimbeImageExperimentErrorDomain; a device that is already
  // open then stays open. Throws std::logic_error if the system has no HID manager.
  bool openWithRunLoop(RunLoop& runLoop, DiagnosticErrorPtr* error);

  // Stops delivery and closes the device, which stays referenced. No effect if it is not open.
  void close();

 private:
  bool _findDevice(DiagnosticErrorPtr* error);
  bool _startDevice(DiagnosticErrorPtr* error);
  // Copies the error, because closing the stream destroys the callback's argument.
  void processInputReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> data, DiagnosticErrorPtr error);

  Platform _platform;
  std::shared_ptr<HidDevice> _hidDevice;
  RunLoop* _runLoop = nullptr;  // not owned
  std::weak_ptr<QZNimbeImageStreamDelegate> _delegate;
};

}  // namespace quazor
