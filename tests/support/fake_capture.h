// A capture service made by hand: it takes what it is given, answers what it is told to, and fails where it is told to.
// For what no healthy phone would do.
#pragma once

#include "contract/message_format.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "platform/capture_keys.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// The end of a run whose cameras could not be synchronised.
inline constexpr std::string_view kNotSynchronized =
    "returned nothing\n"
    "error QZCapturePlugInErrorDomain code 214: Failed to synchronize cameras!\n";

inline const std::string kWidePort(port_type::BackFacingCamera);
inline const std::string kTelePort(port_type::BackFacingTelephotoCamera);
inline const std::string kSuperPort(port_type::BackFacingSuperWideCamera);
inline const std::string kSidePort = "SideFacingCamera";  // has no camera name

// A service looks at what the place for its error holds no more than anybody else; but an error of an earlier call in
// it would be told as this one's when this one has none.
inline void expectFreshPlace(const DiagnosticErrorPtr* error) {
  if (error != nullptr) {
    EXPECT_EQ(*error, nullptr) << "a call was given a place that still holds an error";
  }
}

// Holds whatever properties it is given; refuses to set those it is told to refuse, without an error of its own.
template <class Interface>
class FakeCaptureObject : public Interface {
 public:
  FakeCaptureObject(RunTranscript& transcript, std::string id) : transcript_(transcript), id_(std::move(id)) {}

  std::string description() const override { return id_; }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    const Value* value = properties.find(key);
    record("valueForProperty", key, value != nullptr);
    return value == nullptr ? std::nullopt : std::optional(*value);
  }
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    const bool accepted = !refused.contains(std::string(key));
    record("setValue", std::string(key) + " = " + defaultText(value), accepted);
    if (accepted) properties.set(key, value);
    return accepted;
  }

  Dictionary properties;
  std::set<std::string> refused;

 protected:
  void record(std::string_view operation, std::string_view detail, bool succeeded) const {
    transcript_.addCall("Fake." + std::string(operation), id_, detail, succeeded);
  }

 private:
  RunTranscript& transcript_;
  std::string id_;
};

class FakeStream final : public FakeCaptureObject<CaptureStream> {
 public:
  FakeStream(RunTranscript& transcript, std::string id, const Value& portType)
      : FakeCaptureObject(transcript, std::move(id)) {
    properties.set(capture_key::PortType, portType);
    properties.set(capture_key::ErrorCounters, Dictionary{{"Count", 0}});
  }

  bool start(DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("start", "", true);
    return true;
  }
  bool stop(DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("stop", "", true);
    return true;
  }
};
using FakeStreams = std::vector<std::shared_ptr<FakeStream>>;

class FakeGroup final : public FakeCaptureObject<SynchronizedStreamsGroup> {
 public:
  FakeGroup(RunTranscript& transcript, std::string id, const FakeStreams& streams)
      : FakeCaptureObject(transcript, std::move(id)), members(CaptureStreams(streams.begin(), streams.end())) {
    if (!streams.empty()) properties.set(capture_key::SynchronizationMaster, streams.front());
    properties.set(capture_key::MasterConfigurationSupportedKeys,
                   Array{Value(capture_key::SlaveConfigurationByPortType)});
  }

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("streams", "", members.has_value());
    return members;
  }

  std::optional<CaptureStreams> members;
};

class FakeDevice final : public FakeCaptureObject<CaptureDevice> {
 public:
  explicit FakeDevice(RunTranscript& transcript) : FakeCaptureObject(transcript, "device") {}

  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("synchronizedStreamsGroups", "", true);
    return groups;
  }
  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("requestControlOfStreams", defaultText(Array(streams.begin(), streams.end())), true);
    return true;
  }
  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    record("relinquishControlOfStreams", defaultText(Array(streams.begin(), streams.end())), true);
    return true;
  }

  // What a camera sync run has no use for.
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr*) override {
    record("streams", "", false);
    return std::nullopt;
  }
  bool invalidate(DiagnosticErrorPtr*) override {
    record("invalidate", "", false);
    return false;
  }

  SynchronizedStreamsGroups groups;
};

class FakePlugIn final : public CapturePlugIn {
 public:
  explicit FakePlugIn(std::shared_ptr<FakeDevice> device) : device_(std::move(device)) {}

  std::string description() const override { return "plug-in"; }
  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    expectFreshPlace(error);
    return device_;
  }

 private:
  std::shared_ptr<FakeDevice> device_;
};

class FakeService final : public CaptureService {
 public:
  explicit FakeService(std::shared_ptr<FakeDevice> device) : device_(std::move(device)) {}

  std::shared_ptr<CapturePlugIn> createPlugIn() override {
    auto plugIn = std::make_shared<FakePlugIn>(device_);
    lastPlugIn = plugIn;
    return plugIn;
  }

  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return nullptr; }  // a camera sync run makes its own

  void forgetDevice() { device_.reset(); }

  std::weak_ptr<FakePlugIn> lastPlugIn;

 private:
  std::shared_ptr<FakeDevice> device_;
};

// Lets no time pass and tells how long it was asked to sleep.
class FakeClock final : public Clock {
 public:
  explicit FakeClock(RunTranscript& transcript) : transcript_(transcript) {}

  std::chrono::nanoseconds now() const override { return {}; }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds duration) override {
    transcript_.addCall("Clock.sleep", "", std::to_string(duration.count()) + " ns", true);
  }

 private:
  RunTranscript& transcript_;
};

inline Value statusEntry(Value offset, Value frames) {
  return Dictionary{{std::string(capture_key::Offset), std::move(offset)},
                    {std::string(capture_key::FrameCount), std::move(frames)}};
}

// A device with one group of the three back cameras, the wide one its master; a test changes what it is about.
class FakeCaptureTest : public testing::Test {
 protected:
  FakeCaptureTest() {
    device->groups = {group};
    setStatus(kWidePort, statusEntry(0, 60));
    setStatus(kTelePort, statusEntry(1, 59));
    setStatus(kSuperPort, statusEntry(2, 58));
    setStatus(kSidePort, statusEntry(3, 57));
  }

  void setStatus(const std::string& port, Value entry) {
    status_.set(port, std::move(entry));
    device->properties.set(capture_key::MulticamSessionStatus, status_);
  }

  Platform platform() const {
    Platform platform;
    platform.capture = service;
    platform.clock = clock;
    return platform;
  }

  std::string run(const std::vector<std::string>& ports, const Array& formatIndexes = {16, 14, 9}) {
    QZCameraSyncExperiment experiment(ports, formatIndexes, 30, platform());
    EXPECT_TRUE(experiment.setupWithParameters({{"duration", 2}}, nullptr, nullptr));
    return runAndTell(experiment, ErrorPlace::kGiven, transcript);
  }

  std::shared_ptr<FakeStream> makeStream(const std::string& id, const Value& port) {
    return std::make_shared<FakeStream>(transcript, id, port);
  }
  std::shared_ptr<FakeGroup> makeGroup(const std::string& id, const FakeStreams& streams) {
    return std::make_shared<FakeGroup>(transcript, id, streams);
  }

  RunTranscript transcript;
  std::shared_ptr<FakeDevice> device = std::make_shared<FakeDevice>(transcript);
  std::shared_ptr<FakeStream> wide = makeStream("wide", kWidePort);
  std::shared_ptr<FakeStream> tele = makeStream("tele", kTelePort);
  std::shared_ptr<FakeStream> super = makeStream("super", kSuperPort);
  std::shared_ptr<FakeGroup> group = makeGroup("group", {wide, tele, super});
  std::shared_ptr<FakeService> service = std::make_shared<FakeService>(device);
  std::shared_ptr<FakeClock> clock = std::make_shared<FakeClock>(transcript);

 private:
  Dictionary status_;
};

// What stands behind the first occurrence of `line`, with it; the whole text when it is not there.
inline std::string from(const std::string& text, std::string_view line) {
  const std::size_t at = text.find(line);
  return at == std::string::npos ? text : text.substr(at);
}

// What stands from the first occurrence of `first` up to the next one of `end`.
inline std::string between(const std::string& text, std::string_view first, std::string_view end) {
  const std::string rest = from(text, first);
  return rest.substr(0, rest.find(end));
}

}  // namespace quazor
