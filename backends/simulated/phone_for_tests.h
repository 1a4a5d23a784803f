// A small scenario, and a user of its capture device, for the tests of this folder.
#pragma once

#include "backends/simulated/errors/capture_error.h"
#include "backends/simulated/simulated_phone.h"
#include "platform/capture_service.h"

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// Cameras "wide", "tele" and "front", with two formats of at most 30 and 60 frames per second; group "back" of the
// first two with master "wide", group "selfie" of the third.
inline Scenario smallScenario() {
  Scenario scenario;
  scenario.title = "A small phone";
  for (const auto& [id, port] :
       {std::pair("wide", port_type::BackFacingCamera), std::pair("tele", port_type::BackFacingTelephotoCamera),
        std::pair("front", port_type::FrontFacingCamera)}) {
    Camera camera;
    camera.id = id;
    camera.port = port;
    camera.formats = {{30}, {60}};
    scenario.cameras.push_back(std::move(camera));
  }
  scenario.groups = {{"back", {"wide", "tele"}, "wide", true}, {"selfie", {"front"}, "front", true}};
  return scenario;
}

// The result of a call with an error out-argument, for comparisons: "done", or the error's text.
template <class Call>
std::string outcome(Call&& call) {
  DiagnosticErrorPtr error;
  const bool succeeded = static_cast<bool>(call(&error));
  if (succeeded) return error == nullptr ? "done" : "done, with an error";
  return defaultText(error);
}

// An error of the service as formatted by outcome().
inline std::string refusal(CaptureErrorCode code, std::string_view message) {
  return formatMessage("%@ code %@: %@", SimulatedCaptureErrorDomain, static_cast<std::int64_t>(code), message);
}

// A user's device with its groups and streams.
struct PhoneUser {
  explicit PhoneUser(const SimulatedPhone& phone) : PhoneUser(phone.platform()) {}
  explicit PhoneUser(const Platform& platform)
      : device(platform.capture->createPlugIn()->device(nullptr)),
        groups(*device->synchronizedStreamsGroups(nullptr)),
        streams(*device->streams(nullptr)) {}

  SynchronizedStreamsGroup& back() const { return *groups[0]; }
  CaptureStream& wide() const { return *streams[0]; }
  CaptureStream& tele() const { return *streams[1]; }
  CaptureStreams backStreams() const { return {streams[0], streams[1]}; }
  bool control(const CaptureStreams& wanted) const { return device->requestControlOfStreams(wanted, nullptr); }
  // Takes control of the back cameras and configures their session.
  bool configureSession() const {
    return control(backStreams()) &&
           back().setValue(Array{streams[0], streams[1]}, capture_key::ActiveStreams, nullptr) &&
           device->setValue(Dictionary{{std::string(capture_key::ActiveSynchronizedStreamsGroups), Array{groups[0]}}},
                            capture_key::MultiCamConfiguration, nullptr);
  }
  // The default text of the session's status.
  std::string status() const {
    return defaultText(device->valueForProperty(capture_key::MulticamSessionStatus, nullptr));
  }

  std::shared_ptr<CaptureDevice> device;
  SynchronizedStreamsGroups groups;
  CaptureStreams streams;
};

// A configuration that is valid for any slave of a group.
inline Dictionary slaveConfiguration() {
  return {{"StreamingOutputsEnabled", true},
          {"FrameSkippingEnabled", false},
          {"TimeMachineEnabled", false},
          {"MasterToSlaveFrameRateRatio", 1}};
}

}  // namespace quazor
