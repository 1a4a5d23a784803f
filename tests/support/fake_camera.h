// A fake depth camera and its report channels: a test pushes every frame itself.
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

// What a frame shows and carries.
enum class FrameKind {
  kLit,
  kUnlit,                   // dark for no known reason
  kUnlitForSafety,          // dark because the module kept its projector off
  kWithoutMetadata,         // nothing is attached
  kWithWrongMetadata,       // what is attached is no dictionary
  kWithIncompleteMetadata,  // a number is missing
};
inline constexpr std::array kFrameKinds{FrameKind::kLit,
                                        FrameKind::kUnlit,
                                        FrameKind::kUnlitForSafety,
                                        FrameKind::kWithoutMetadata,
                                        FrameKind::kWithWrongMetadata,
                                        FrameKind::kWithIncompleteMetadata};
std::string_view nameOf(FrameKind kind);

// A buffer that belongs to whoever made it and counts the references that others take. Any thread.
class FakePixelBuffer final : public PixelBuffer {
 public:
  explicit FakePixelBuffer(FrameKind kind = FrameKind::kLit) : kind_(kind) {}

  void retain() override { references_.fetch_add(1); }
  void release() override { references_.fetch_sub(1); }
  std::optional<Value> attachment(std::string_view key) const override;

  // How many references have been taken and not given back.
  int references() const { return references_.load(); }
  // Makes it a new frame without references. REQUIRES: nobody uses it.
  void renew(FrameKind kind);

  // Called by attachment() before it answers, unless it is empty.
  std::function<void()> onRead;

 private:
  std::atomic<FrameKind> kind_;  // whoever renews it may know that nobody uses it, and still not have met them
  std::atomic<int> references_{0};
};

// The stream of the front infrared camera. It takes every property, and frames and events from its test.
class FakeStream final : public CaptureStream {
 public:
  FakeStream();

  // Before the stream is used: what it answers.
  bool stops = true;  // a stop that is refused leaves the stream running
  std::optional<Value> errorCounters;
  // Before the stream is used: called, unless it is empty, at the beginning of a start, of a reading of the error
  // counters and of a stop ("start", "get ErrorCounters", "stop"), and at the end of a stop ("stopped"). May block.
  std::function<void(std::string_view call)> onCall;

  std::string description() const override { return "stream"; }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;
  bool start(DiagnosticErrorPtr* error) override;
  // Waits for the handlers that are running.
  bool stop(DiagnosticErrorPtr* error) override;

  // Hands a frame or an event to its handler. False, and nothing is done, when the stream does not run. Any thread.
  bool deliver(PixelBuffer& buffer, MediaTime time);
  bool deliverEvent(std::int32_t event, MediaTime time);

  // The handler that was set last. Any thread, after it has been set.
  const PixelBufferHandler& frameHandler() const { return *frames_; }

 private:
  bool enter();
  void leave();

  std::shared_ptr<PixelBufferHandler> frames_;
  std::shared_ptr<EventHandler> events_;
  std::mutex mutex_;
  std::condition_variable left_;
  bool running_ = false;  // guarded by mutex_
  int handlers_ = 0;      // that are running; guarded by mutex_
};

// The error counters that a FakeStream answers unless told otherwise: all six, from I2C 1 to projector 6.
const Dictionary& fakeErrorCounters();

// A capture service, plug-in and device with the one stream.
std::shared_ptr<CaptureService> makeFakeCapture(std::shared_ptr<FakeStream> stream);

// Report channels whose every counter goes up by `growth` from one snapshot to the next. Any thread.
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
