#include "tests/support/fake_camera.h"

#include "platform/capture_keys.h"
#include "tests/support/scripted_capture.h"

#include <cstdint>
#include <string>

namespace quazor {

namespace {

constexpr int kSafetyBit = 0x2000;

// The metadata that the module attaches to every frame, in its order.
Dictionary metadata(int lightSource, int hardwareEvents) {
  return Dictionary{{"MetaDataProjectorMode", 0},
                    {std::string(capture_key::InfraredLightSource), lightSource},
                    {"MetaDataProjectorIndex", 1},
                    {"MetaDataProjectorPowerLow", 2},
                    {"MetaDataProjectorPowerHigh", 3},
                    {"MetaDataProjectorPowerFlood", 4},
                    {"MetaDataProjectorProbeMode", 5},
                    {"MetaDataProjectorPowerProbeA", 6},
                    {"MetaDataProjectorPowerProbeB", 7},
                    {"MetaDataProjectorPulseWidth", 8},
                    {std::string(capture_key::FloodActiveTemperature), 36.5},
                    {"NTCTemperatureIdle", 9},
                    {"NTCTemperatureStandby", 10},
                    {"NTCTemperatureActive", 11},
                    {"DIETemperatureIdle", 12},
                    {"DIETemperatureStandby", 13},
                    {"DIETemperatureActive", 14},
                    {"HardwareEvents", hardwareEvents}};
}

Dictionary incompleteMetadata() {
  Dictionary numbers = metadata(1, 0);
  numbers.erase("HardwareEvents");
  return numbers;
}

std::optional<Value> metadataOf(FrameKind kind) {
  static const Value lit(metadata(1, 0));
  static const Value unlit(metadata(0, 0));
  static const Value unlitForSafety(metadata(0, kSafetyBit));
  static const Value wrong("no dictionary");
  static const Value incomplete(incompleteMetadata());
  switch (kind) {
    case FrameKind::kLit: return lit;
    case FrameKind::kUnlit: return unlit;
    case FrameKind::kUnlitForSafety: return unlitForSafety;
    case FrameKind::kWithWrongMetadata: return wrong;
    case FrameKind::kWithIncompleteMetadata: return incomplete;
    case FrameKind::kWithoutMetadata: break;
  }
  return std::nullopt;
}

// All channels have the same count.
class FakeSnapshot final : public ReportSnapshot {
 public:
  FakeSnapshot(std::shared_ptr<const FakeReports::Descriptions> channels, std::uint64_t count)
      : channels_(std::move(channels)) {
    samples_.reserve(channels_->size());
    for (const auto& channel : *channels_) samples_.emplace_back(ReportChannel(channel, count));
  }

  const std::vector<ReportSample>& samples() const override { return samples_; }
  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr*) const override {
    return std::make_shared<FakeSnapshot>(channels_, samples_.empty() ? 0 : countOf(*this) - countOf(baseline));
  }

 private:
  static std::uint64_t countOf(const ReportSnapshot& snapshot) {
    return toUnsigned(pointerTo(snapshot.samples().front().channel().count()));
  }

  std::shared_ptr<const FakeReports::Descriptions> channels_;
  std::vector<ReportSample> samples_;
};

class FakeChannelSet final : public ReportChannelSet {
 public:
  FakeChannelSet(std::shared_ptr<const FakeReports::Descriptions> channels, std::uint64_t growth)
      : channels_(std::move(channels)), growth_(growth) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    auto kept = std::make_shared<FakeReports::Descriptions>();
    for (const auto& channel : *channels_) {
      if (keep(*channel)) kept->push_back(channel);
    }
    return std::make_shared<FakeChannelSet>(std::move(kept), growth_);
  }
  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr*) const override {
    return std::make_shared<FakeSnapshot>(channels_, growth_ * snapshots_.fetch_add(1));
  }

 private:
  std::shared_ptr<const FakeReports::Descriptions> channels_;
  std::uint64_t growth_;
  mutable std::atomic<std::uint64_t> snapshots_{0};
};

}  // namespace

std::string_view nameOf(FrameKind kind) {
  switch (kind) {
    case FrameKind::kLit: return "lit";
    case FrameKind::kUnlit: return "unlit";
    case FrameKind::kUnlitForSafety: return "unlit for safety";
    case FrameKind::kWithoutMetadata: return "without metadata";
    case FrameKind::kWithWrongMetadata: return "with wrong metadata";
    case FrameKind::kWithIncompleteMetadata: return "with incomplete metadata";
  }
  return "of no known kind";
}

std::optional<Value> FakePixelBuffer::attachment(std::string_view key) const {
  if (onRead) onRead();
  return key == capture_key::MetadataDictionary ? metadataOf(kind_) : std::nullopt;
}

void FakePixelBuffer::renew(FrameKind kind) {
  kind_ = kind;
  references_.store(0);
}

FakeStream::FakeStream() : errorCounters(fakeErrorCounters()) {}

std::optional<Value> FakeStream::valueForProperty(std::string_view key, DiagnosticErrorPtr*) {
  if (key == capture_key::PortType) return Value(port_type::FrontFacingInfraredCamera);
  if (key != capture_key::ErrorCounters) return std::nullopt;
  if (onCall) onCall("get ErrorCounters");
  return errorCounters;
}

bool FakeStream::setValue(const Value& value, std::string_view key, DiagnosticErrorPtr*) {
  if (key == capture_key::VideoOutputHandlers) {
    const Value* handlers = entryOf(&value, capture_key::PrimaryScaler);
    frames_ =
        std::dynamic_pointer_cast<PixelBufferHandler>(entryOf(handlers, capture_key::PixelBufferHandler)->object());
    events_ = std::dynamic_pointer_cast<EventHandler>(entryOf(handlers, capture_key::EventHandler)->object());
  }
  return true;
}

bool FakeStream::start(DiagnosticErrorPtr*) {
  {
    const std::lock_guard lock(mutex_);
    running_ = true;
  }
  if (onCall) onCall("start");
  return true;
}

bool FakeStream::stop(DiagnosticErrorPtr*) {
  if (onCall) onCall("stop");
  if (stops) {
    std::unique_lock lock(mutex_);
    running_ = false;
    left_.wait(lock, [this] { return handlers_ == 0; });
  }
  if (onCall) onCall("stopped");
  return stops;
}

bool FakeStream::deliver(PixelBuffer& buffer, MediaTime time) {
  if (!enter()) return false;
  (*frames_)(buffer, time);
  leave();
  return true;
}

bool FakeStream::deliverEvent(std::int32_t event, MediaTime time) {
  if (!enter()) return false;
  (*events_)(event, time, nullptr);
  leave();
  return true;
}

bool FakeStream::enter() {
  const std::lock_guard lock(mutex_);
  if (running_) ++handlers_;
  return running_;
}

void FakeStream::leave() {
  const std::lock_guard lock(mutex_);
  if (--handlers_ == 0) left_.notify_all();
}

const Dictionary& fakeErrorCounters() {
  static const Dictionary counters{{"I2CErrorCount", 1},  {"MIPIErrorCount", 2}, {"LPDPErrorCount", 3},
                                   {"UARTErrorCount", 4}, {"SIFErrorCount", 5},  {"ProjectorErrorCount", 6}};
  return counters;
}

std::shared_ptr<CaptureService> makeFakeCapture(std::shared_ptr<FakeStream> stream) {
  auto device = std::make_shared<ScriptedDevice>("device");
  device->members = CaptureStreams{std::move(stream)};
  return std::make_shared<ScriptedCapture>(std::move(device));
}

std::shared_ptr<const ReportChannelSet> FakeReports::reportWithOnlySimpleChannels(DiagnosticErrorPtr*) {
  return std::make_shared<FakeChannelSet>(channels_, growth_);
}

FakeReports::Descriptions fakeChannels(std::size_t count) {
  // One allocation that the pointers to all descriptions share.
  const auto descriptions = std::make_shared<std::vector<ReportChannelDescription>>();
  for (std::size_t i = 0; i < count; ++i) {
    const std::string name = "Channel " + std::to_string(i);
    for (const char* subGroup : {"K42ISP Events", "Other Events"}) descriptions->push_back({"K42ISP", subGroup, name});
  }
  FakeReports::Descriptions channels;
  channels.reserve(descriptions->size());
  for (const ReportChannelDescription& description : *descriptions) channels.emplace_back(descriptions, &description);
  return channels;
}

}  // namespace quazor
