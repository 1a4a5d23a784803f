// A hand-written depth camera and its report channels: the test delivers every frame itself.
#pragma once

#include "platform/capture_service.h"
#include "platform/pixel_buffer.h"
#include "platform/report_facility.h"

#include <array>
#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// The image and metadata of a frame.
enum class FrameKind {
  kLit,
  kUnlit,                   // dark for an unknown reason
  kUnlitForSafety,          // dark because the module kept its projector off
  kWithoutMetadata,         // without an attachment
  kWithWrongMetadata,       // the attachment is not a dictionary
  kWithIncompleteMetadata,  // a number is missing
};
inline constexpr std::array kFrameKinds{FrameKind::kLit,
                                        FrameKind::kUnlit,
                                        FrameKind::kUnlitForSafety,
                                        FrameKind::kWithoutMetadata,
                                        FrameKind::kWithWrongMetadata,
                                        FrameKind::kWithIncompleteMetadata};
std::string_view nameOf(FrameKind kind);

// A buffer that its creator owns; it counts the references that others take. Any thread.
class FakePixelBuffer final : public PixelBuffer {
 public:
  explicit FakePixelBuffer(FrameKind kind = FrameKind::kLit) : kind_(kind) {}

  void retain() override { references_.fetch_add(1); }
  void release() override { references_.fetch_sub(1); }
  std::optional<Value> attachment(std::string_view key) const override;

  // The number of references not yet released.
  int references() const { return references_.load(); }
  // Turns it into a new frame without references. REQUIRES: the buffer is not in use.
  void renew(FrameKind kind);

  // Called by attachment() before it returns, unless empty.
  std::function<void()> onRead;

 private:
  std::atomic<FrameKind> kind_;  // atomic, because renew() may not be synchronised with earlier users
  std::atomic<int> references_{0};
};

// The stream of the front infrared camera. It accepts every property; its test delivers frames and events.
class FakeStream final : public CaptureStream {
 public:
  FakeStream();

  // Results of its calls; set them before the stream is used.
  bool stops = true;  // false: stop() fails and the stream keeps running
  std::optional<Value> errorCounters;
  // Called, unless empty, at the beginning of a start, of reading the error counters and of a stop ("start", "get
  // ErrorCounters", "stop"), and at the end of a stop ("stopped"). May block. Set it before the stream is used.
  std::function<void(std::string_view call)> onCall;

  std::string description() const override { return "stream"; }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;
  bool start(DiagnosticErrorPtr* error) override;
  // Waits for running handlers.
  bool stop(DiagnosticErrorPtr* error) override;

  // Passes a frame or an event to its handler. Returns false without an effect if the stream does not run. Any thread.
  bool deliver(PixelBuffer& buffer, MediaTime time);
  bool deliverEvent(std::int32_t event, MediaTime time);

  // The handler that was set last. Any thread, after it was set.
  const PixelBufferHandler& frameHandler() const { return *frames_; }

 private:
  bool enter();
  void leave();

  std::shared_ptr<PixelBufferHandler> frames_;
  std::shared_ptr<EventHandler> events_;
  std::mutex mutex_;
  std::condition_variable left_;
  bool running_ = false;  // guarded by mutex_
  int handlers_ = 0;      // the number of running handlers; guarded by mutex_
};

// The default error counters of a FakeStream: all six, from I2C 1 to projector 6.
const Dictionary& fakeErrorCounters();

// A capture service, plug-in and device with only this stream.
std::shared_ptr<CaptureService> makeFakeCapture(std::shared_ptr<FakeStream> stream);

// Report channels whose counters all increase by `growth` between two snapshots. Any thread.
class FakeReports final : public ReportFacility {
 public:
  using Descriptions = std::vector<std::shared_ptr<const ReportChannelDescription>>;

  FakeReports(Descriptions channels, std::uint64_t growth)
      : channels_(std::make_shared<const Descriptions>(std::move(channels))), growth_(growth) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override;

 private:
  std::shared_ptr<const Descriptions> channels_;
  std::uint64_t growth_;
};

// `count` channels "Channel 0", "Channel 1" and so on of the fault report, each followed by one of another subgroup.
FakeReports::Descriptions fakeChannels(std::size_t count);

}  // namespace quazor
