// A scripted capture service for camera synchronisation; a transcript records its calls.
#pragma once

#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "platform/capture_keys.h"
#include "tests/support/run_transcript.h"
#include "tests/support/scripted_capture.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// The trace at the end of a run whose cameras could not be synchronised.
inline constexpr std::string_view kNotSynchronized =
    "returned nothing\n"
    "error QZCapturePlugInErrorDomain code 214: Failed to synchronize cameras!\n";

inline const std::string kWidePort(port_type::BackFacingCamera);
inline const std::string kTelePort(port_type::BackFacingTelephotoCamera);
inline const std::string kSuperPort(port_type::BackFacingSuperWideCamera);
inline const std::string kSidePort = "SideFacingCamera";  // has no camera name

// Checks that the error variable of a call is empty. If it contained the error of an earlier call, the caller would
// report that error for a call that fails without one.
inline void expectFreshPlace(const DiagnosticErrorPtr* error) {
  if (error != nullptr) {
    EXPECT_EQ(*error, nullptr) << "a call was given a place that still holds an error";
  }
}

// A clock that records sleeps and does not advance.
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

// A device with one group of the three back cameras and the wide one as master; tests modify it.
class ScriptedCameraSyncTest : public testing::Test {
 protected:
  ScriptedCameraSyncTest() {
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

  std::shared_ptr<ScriptedStream> makeStream(const std::string& id, const Value& port) {
    auto stream = std::make_shared<ScriptedStream>(id, script);
    stream->properties.set(capture_key::PortType, port);
    stream->properties.set(capture_key::ErrorCounters, Dictionary{{"Count", 0}});
    return stream;
  }
  std::shared_ptr<ScriptedGroup> makeGroup(const std::string& id,
                                           const std::vector<std::shared_ptr<ScriptedStream>>& streams) {
    auto made = std::make_shared<ScriptedGroup>(id, script);
    made->members = CaptureStreams(streams.begin(), streams.end());
    if (!streams.empty()) made->properties.set(capture_key::SynchronizationMaster, streams.front());
    made->properties.set(capture_key::MasterConfigurationSupportedKeys,
                         Array{Value(capture_key::SlaveConfigurationByPortType)});
    return made;
  }

  RunTranscript transcript;
  const CaptureScript script = [this](const ScriptedCall& call) {
    if (call.object == "service") return call.operation == "createPlugIn";  // a camera sync run creates its own plug-in
    expectFreshPlace(call.error);
    if (call.object != "plug-in") {
      transcript.addCall("Fake." + std::string(call.operation), call.object, call.detail, call.succeeds);
    }
    return call.succeeds;
  };
  std::shared_ptr<ScriptedDevice> device = std::make_shared<ScriptedDevice>("device", script);
  std::shared_ptr<ScriptedStream> wide = makeStream("wide", kWidePort);
  std::shared_ptr<ScriptedStream> tele = makeStream("tele", kTelePort);
  std::shared_ptr<ScriptedStream> super = makeStream("super", kSuperPort);
  std::shared_ptr<ScriptedGroup> group = makeGroup("group", {wide, tele, super});
  std::shared_ptr<ScriptedCapture> service = std::make_shared<ScriptedCapture>(device, script);
  std::shared_ptr<FakeClock> clock = std::make_shared<FakeClock>(transcript);

 private:
  Dictionary status_;
};

// The text from the first occurrence of `line`; the whole text if there is none.
inline std::string from(const std::string& text, std::string_view line) {
  const std::size_t at = text.find(line);
  return at == std::string::npos ? text : text.substr(at);
}

// The text from the first occurrence of `first` up to the next one of `end`.
inline std::string between(const std::string& text, std::string_view first, std::string_view end) {
  const std::string rest = from(text, first);
  return rest.substr(0, rest.find(end));
}

}  // namespace quazor
