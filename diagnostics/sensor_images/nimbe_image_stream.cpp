#include "diagnostics/sensor_images/nimbe_image_stream.h"

#include "diagnostics/sensor_images/nimbe_image_errors.h"

#include <array>
#include <stdexcept>
#include <string>
#include <vector>

namespace quazor {

namespace {

// The sensor's usage, in a vendor-defined page of the HID usage tables.
constexpr std::uint64_t kUsagePage = 0xFF00;
constexpr std::uint64_t kUsage = 0x24;

// Its feature reports, each beginning with its ID.
constexpr std::array<std::uint8_t, 2> kPowerModeActive{0xAB, 0x01};
constexpr std::array<std::uint8_t, 2> kStreamingModeImagesOnly{0xAC, 0x01};

constexpr std::uint32_t kNoCloseOptions = 0;

}  // namespace

QZNimbeImageStreamDelegate::~QZNimbeImageStreamDelegate() = default;

QZNimbeImageStream::QZNimbeImageStream(Platform platform) : _platform(std::move(platform)) {}

bool QZNimbeImageStream::openWithRunLoop(RunLoop& runLoop, DiagnosticErrorPtr* error) {
  _runLoop = &runLoop;
  if (!_findDevice(error) || !_startDevice(error)) return false;
  _hidDevice->scheduleWithRunLoop(runLoop, kRunLoopDefaultMode);
  return true;
}

bool QZNimbeImageStream::_findDevice(DiagnosticErrorPtr* error) {
  const Dictionary matching{{std::string(kHidPrimaryUsagePage), kUsagePage}, {std::string(kHidPrimaryUsage), kUsage}};
  const std::shared_ptr<HidManager> manager = _platform.hid->createManager();
  if (manager == nullptr) throw std::logic_error("No HID Manager available?!");
  manager->enumerateDevicesMatching({matching});
  const std::vector<std::shared_ptr<HidDevice>> devices = manager->devices();
  if (devices.size() != 1) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kNoDevice, nullptr,
         "Nimbe device match was ambiguous!");
    return false;
  }
  _hidDevice = devices.front();
  return true;
}

bool QZNimbeImageStream::_startDevice(DiagnosticErrorPtr* error) {
  DiagnosticErrorPtr openError;
  if (!_hidDevice->open(&openError)) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kNoDevice, openError,
         "Could not open Nimbe device.");
    return false;
  }
  _hidDevice->setInputReportCallback([stream = weak_from_this()](std::uint8_t reportID,
                                                                 std::span<const std::uint8_t> data,
                                                                 const DiagnosticErrorPtr& reportError) {
    if (const auto held = stream.lock()) held->processInputReportWithID(reportID, data, reportError);
  });
  DiagnosticErrorPtr powerError;
  if (!_hidDevice->setFeatureReportWithID(kPowerModeActive.front(), kPowerModeActive, &powerError)) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kPowerModeRefused, powerError,
         "Failed to override power mode to active!");
    return false;
  }
  DiagnosticErrorPtr streamingError;
  if (!_hidDevice->setFeatureReportWithID(kStreamingModeImagesOnly.front(), kStreamingModeImagesOnly,
                                          &streamingError)) {
    fail(error, QZNimbeImageExperimentErrorDomain, nimbe_image_error::kStreamingModeRefused, streamingError,
         "Failed to set streaming mode to images only!");
    return false;
  }
  return true;
}

void QZNimbeImageStream::close() {
  if (_hidDevice == nullptr) return;
  _hidDevice->setInputReportCallback({});
  _hidDevice->unscheduleFromRunLoop(*_runLoop, kRunLoopDefaultMode);
  _hidDevice->close(kNoCloseOptions);
}

void QZNimbeImageStream::processInputReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> data,
                                                  DiagnosticErrorPtr error) {
  const std::shared_ptr<QZNimbeImageStreamDelegate> delegate = _delegate.lock();
  if (error != nullptr) {
    close();
    if (delegate != nullptr) delegate->streamDidError(std::move(error));
    return;
  }
  // A truncated report contains no image.
  if (reportID != kNimbeImageReportID || data.size() < kNimbeImageRecordSize) return;
  auto image = std::make_shared<QZNimbeCorvaneImage>(data.first<kNimbeImageRecordSize>());
  if (delegate != nullptr) delegate->handleImage(std::move(image));
}

}  // namespace quazor
