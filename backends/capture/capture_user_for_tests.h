// A user of a capture service and values to set, for the suites that every backend runs.
#pragma once

#include "backends/capture/capture_refusal.h"
#include "contract/message_format.h"
#include "platform/capture_keys.h"
#include "platform/capture_service.h"
#include "platform/pixel_buffer.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// Keys and values for the tables of the suites.
namespace capture_sample {

inline std::string text(std::string_view key) { return std::string(key); }

inline Dictionary with(Dictionary entries, std::string_view key, Value value) {
  entries.set(key, std::move(value));
  return entries;
}

inline Dictionary without(Dictionary entries, std::string_view key) {
  entries.erase(key);
  return entries;
}

inline Dictionary primary(Value value) { return {{text(capture_key::PrimaryScaler), std::move(value)}}; }

inline Dictionary light(Value mode, Value pattern, Value current) {
  return {{text(capture_key::Mode), std::move(mode)},
          {text(capture_key::StructuredLightPattern), std::move(pattern)},
          {text(capture_key::StructuredLightCurrent), std::move(current)}};
}

// A configuration that is valid for any slave.
inline Dictionary slave() {
  return {{text(capture_key::StreamingOutputsEnabled), true},
          {text(capture_key::FrameSkippingEnabled), false},
          {text(capture_key::TimeMachineEnabled), false},
          {text(capture_key::MasterToSlaveFrameRateRatio), 1}};
}

inline Dictionary slaves(std::string_view port, Value configuration) {
  return {{text(capture_key::SlaveConfigurationByPortType), Dictionary{{text(port), std::move(configuration)}}}};
}

inline Dictionary session(Array groups) {
  return {{text(capture_key::ActiveSynchronizedStreamsGroups), std::move(groups)}};
}

inline Array arrayOf(const CaptureStreams& streams) { return Array(streams.begin(), streams.end()); }

inline Value frameHandler() {
  return std::make_shared<PixelBufferHandler>([](PixelBuffer&, MediaTime) {});
}

inline Value eventHandler() {
  return std::make_shared<EventHandler>([](std::int32_t, MediaTime, const Value*) {});
}

inline Dictionary handlers(Value frames) {
  return primary(Dictionary{{text(capture_key::PixelBufferHandler), frames}});
}

}  // namespace capture_sample

// The result of a call with an error out-argument: "done", or "DOMAIN CODE" of its error.
template <class Call>
std::string endOf(Call&& call) {
  DiagnosticErrorPtr error;
  const bool succeeded = static_cast<bool>(call(&error));
  if (succeeded) return error == nullptr ? "done" : "done, with an error";
  return error == nullptr ? "no error" : std::string(error->domain()) + " " + std::to_string(error->code());
}

// One user's device, with its streams and groups. Thread: one at a time.
struct CaptureUser {
  explicit CaptureUser(CaptureService& service)
      : device(service.createPlugIn()->device(nullptr)),
        streams(*device->streams(nullptr)),
        groups(*device->synchronizedStreamsGroups(nullptr)) {}

  CaptureStream& wide() const { return *streams[0]; }
  CaptureStream& infrared() const { return *streams[3]; }
  SynchronizedStreamsGroup& back() const { return *groups[0]; }
  CaptureStreams backStreams() const { return {streams[0], streams[1], streams[2]}; }
  std::string request(const CaptureStreams& wanted) const {
    return endOf([&](auto* error) { return device->requestControlOfStreams(wanted, error); });
  }
  std::string relinquish(const CaptureStreams& given) const {
    return endOf([&](auto* error) { return device->relinquishControlOfStreams(given, error); });
  }
  std::string start(std::size_t index) const {
    return endOf([&](auto* error) { return streams[index]->start(error); });
  }
  std::string stop(std::size_t index) const {
    return endOf([&](auto* error) { return streams[index]->stop(error); });
  }
  static std::string set(CaptureObject& object, std::string_view key, const Value& value) {
    return endOf([&](auto* error) { return object.setValue(value, key, error); });
  }
  static std::string read(CaptureObject& object, std::string_view key) {
    return endOf([&](auto* error) { return object.valueForProperty(key, error); });
  }
  // Takes control of the back cameras' streams and creates a session for them.
  void synchronize() const {
    ASSERT_EQ(request(backStreams()), "done");
    ASSERT_EQ(set(back(), capture_key::ActiveStreams, capture_sample::arrayOf(backStreams())), "done");
    ASSERT_EQ(set(*device, capture_key::MultiCamConfiguration, capture_sample::session({groups[0]})), "done");
  }
  // An entry of the session's status, "OFFSET FRAMES"; empty if there is none.
  std::string status(std::string_view port) const {
    const auto all = device->valueForProperty(capture_key::MulticamSessionStatus, nullptr);
    const Value* const one = entryOf(pointerTo(all), port);
    if (one == nullptr) return "";
    return std::to_string(toSigned(entryOf(one, capture_key::Offset))) + " " +
           std::to_string(toSigned(entryOf(one, capture_key::FrameCount)));
  }

  std::shared_ptr<CaptureDevice> device;
  CaptureStreams streams;
  SynchronizedStreamsGroups groups;
};

// The common part of both suites; capture_conformance.h describes UnderTest.
template <class UnderTest>
class CaptureFixture : public ::testing::Test {
 protected:
  using Refusal = CaptureRefusal;

  std::string no(CaptureRefusal reason) { return under_test_.refusal(reason); }
  CaptureUser newUser() { return CaptureUser(*service_); }

  UnderTest under_test_;
  std::shared_ptr<CaptureService> service_ = under_test_.service();
  CaptureUser user_{*service_};
};

}  // namespace quazor
