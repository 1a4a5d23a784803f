// QZNimbeImageStream: finds the display sensor among the HID devices, switches it to streaming, and hands on its
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

// Receives what a stream has to tell, on the thread that runs the stream's loop.
// Thread: that of the stream's run loop.
class QZNimbeImageStreamDelegate {
 public:
  QZNimbeImageStreamDelegate() = default;
  QZNimbeImageStreamDelegate(const QZNimbeImageStreamDelegate&) = delete;
  QZNimbeImageStreamDelegate& operator=(const QZNimbeImageStreamDelegate&) = delete;
  virtual ~QZNimbeImageStreamDelegate();

  virtual void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) = 0;
  // The device has failed; the stream is closed already.
  virtual void streamDidError(DiagnosticErrorPtr error) = 0;
};

// Must be owned by a std::shared_ptr: the device's callback holds it weakly, so it may go while the device stays.
//
// Thread: that of the run loop which it is opened with. Reports come there while the loop runs, and the delegate is
//   called from inside them. It may close the stream, replace itself or drop the stream then.
class QZNimbeImageStream final : public std::enable_shared_from_this<QZNimbeImageStream> {
 public:
  explicit QZNimbeImageStream(Platform platform = installedPlatform());

  // Held weakly; without one, images are dropped.
  std::shared_ptr<QZNimbeImageStreamDelegate> delegate() const { return _delegate.lock(); }
  void setDelegate(std::weak_ptr<QZNimbeImageStreamDelegate> delegate) { _delegate = std::move(delegate); }

  // Opens the one sensor, switches it to active power and to images only, and schedules it on the loop, which must
  // live until close(). Fails with codes 3, 4 and 5 of QZNimbeImageExperimentErrorDomain; a device that was opened
  // until then is left as it is. Throws std::logic_error when the system has no HID manager.
  bool openWithRunLoop(RunLoop& runLoop, DiagnosticErrorPtr* error);

  // Stops the delivery and closes the device, which stays referenced. Harmless when it is not open.
  void close();

 private:
  bool _findDevice(DiagnosticErrorPtr* error);
  bool _startDevice(DiagnosticErrorPtr* error);
  // The error is a copy of its own: what the callback was given goes when the stream is closed.
  void processInputReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> data, DiagnosticErrorPtr error);

  Platform _platform;
  std::shared_ptr<HidDevice> _hidDevice;
  RunLoop* _runLoop = nullptr;  // not owned
  std::weak_ptr<QZNimbeImageStreamDelegate> _delegate;
};

}  // namespace quazor
