// QZTesselFaultExperiment: streams the infrared camera of the depth module with the structured-light projector firing.
#pragma once

#include "contract/diagnostic_contract.h"
#include "diagnostics/projector_fault/tessel_frame_description.h"
#include "platform/pixel_buffer.h"
#include "platform/platform.h"

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <utility>

namespace quazor {

// Counts the arriving frames, checks that each one was lit, and ends at the first lit frame whose number is at least
// the required number, at the first frame that fails, or at the timeout. The result contains the frame count, the
// stream's error counters, and the increase of every fault channel.
//
// Must be owned by a std::shared_ptr: its stream's handlers hold it weakly, some of its tasks strongly. The last
// reference may be released on any thread, including a thread of its own queues.
//
// Thread: the host's calls are made on the host's thread. Frames and events arrive on the capture service's threads.
// The receiving queue counts the frames; the processing queue checks that they were lit and handles the timeout. The
// first of these that ends the stream does so under the experiment's lock.
class QZTesselFaultExperiment final : public QZExperiment,
                                      public QZTeardown,
                                      public std::enable_shared_from_this<QZTesselFaultExperiment> {
 public:
  // Uses the stream of the front infrared camera, or of another capture port.
  explicit QZTesselFaultExperiment(Platform platform = installedPlatform());
  explicit QZTesselFaultExperiment(std::string port, Platform platform = installedPlatform());

  const std::string& port() const { return _port; }
  void setPort(std::string port) { _port = std::move(port); }
  std::uint64_t formatIndex() const { return _formatIndex; }
  void setFormatIndex(std::uint64_t index) { _formatIndex = index; }
  const std::shared_ptr<CaptureDevice>& device() const { return _device; }
  void setDevice(std::shared_ptr<CaptureDevice> device) { _device = std::move(device); }
  const std::shared_ptr<CaptureStream>& stream() const { return _stream; }
  void setStream(std::shared_ptr<CaptureStream> stream) { _stream = std::move(stream); }

  QZDescription experimentDescription() const override;
  // Parameters: "frameCount", and "timeout" in seconds. Fails with QZErrorDomain code 5 if one is negative.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Blocks until the stream has ended. Fails with codes of QZCapturePlugInErrorDomain, and with QZTelemonErrorDomain
  // code 100. May store an error and still succeed.
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;
  // Invalidates the capture device; fails with QZCapturePlugInErrorDomain code 200.
  bool teardown(DiagnosticErrorPtr* error) override;

 private:
  struct Examination;

  bool _openStream(DiagnosticErrorPtr* error);
  bool _findStream(const CaptureStreams& streams, DiagnosticErrorPtr* error);
  bool _configureStream(DiagnosticErrorPtr* error);
  Dictionary _handlers();
  std::shared_ptr<const ReportSnapshot> _subscribe(std::shared_ptr<const ReportChannelSet>& channels,
                                                   DiagnosticErrorPtr* error);
  void _scheduleTimeout();
  std::unique_ptr<QZExperimentResult> _finish(const ReportChannelSet& channels, const ReportSnapshot& baseline,
                                              DiagnosticErrorPtr* error);
  std::unique_ptr<QZExperimentResult> _buildResult() const;

  // Any thread. Takes over the caller's reference to the buffer, which is released only if the frame is passed on to
  // the processing queue.
  void _handlePixelBuffer(PixelBuffer& buffer, MediaTime time);
  // Any thread.
  void _handleEvent(std::int32_t event, MediaTime time, const Value* info);
  // On the receiving queue.
  static void _takeIn(std::shared_ptr<QZTesselFaultExperiment> self, PixelBuffer& buffer, MediaTime time);
  // On the processing queue.
  void _examine(const QZTesselFrameDescription& frame, std::uint64_t number);
  // Any thread. The first call ends the stream; `error` may be null.
  void _stopWithError(const DiagnosticErrorPtr& error);

  Platform _platform;
  std::string _port;
  std::uint64_t _formatIndex = 0;
  std::shared_ptr<CaptureDevice> _device;
  std::shared_ptr<CaptureStream> _stream;
  std::shared_ptr<Semaphore> _done_semaphore;  // signalled once, after the stream was stopped
  DiagnosticErrorPtr _error;            // the error that ended the stream; written before the signal, read after it
  std::optional<Value> _errorCounters;  // read at the stop; same rule as _error
  std::shared_ptr<const ReportSnapshot> _telemonDelta;
  std::atomic<std::uint64_t> _frameCount{0};  // written on the receiving queue only
  RecordPool _records;                        // of frames that wait for examination
  std::shared_ptr<SerialQueue> _receivingQueue;
  std::shared_ptr<SerialQueue> _processingQueue;
  std::recursive_mutex _mutex;     // held for all of _stopWithError
  std::atomic<bool> _stop{false};  // once true, stays true; set under _mutex, read without it
  std::uint64_t _stopCount = 0;    // the frame number that ends the run
  double _timeout = 0;             // seconds
};

}  // namespace quazor
