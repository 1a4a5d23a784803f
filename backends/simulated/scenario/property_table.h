// What can be called on the simulated capture service, and which properties its objects have: the vocabulary of
// scenario files, of faults and of the service's own checks.
#pragma once

#include "platform/capture_keys.h"

#include <array>
#include <span>
#include <string_view>

namespace quazor {

// The objects of the capture service. Phones have many groups and streams, which faults tell apart by their ids, and
// one of each of the others.
enum class CaptureObjectKind { kService, kPlugIn, kDevice, kGroup, kStream };

struct CaptureProperty {
  std::string_view key;
  bool readOnly;
};

inline constexpr std::array kDeviceProperties{
    CaptureProperty{capture_key::MultiCamConfiguration, false},
    CaptureProperty{capture_key::MulticamSessionStatus, true},
};
inline constexpr std::array kGroupProperties{
    CaptureProperty{capture_key::ActiveStreams, false},
    CaptureProperty{capture_key::SynchronizationMaster, true},
    CaptureProperty{capture_key::MasterConfigurationSupportedKeys, true},
    CaptureProperty{capture_key::MasterConfiguration, false},
};
inline constexpr std::array kStreamProperties{
    CaptureProperty{capture_key::PortType, true},
    CaptureProperty{capture_key::FormatIndex, false},
    CaptureProperty{capture_key::MinimumFrameRate, false},
    CaptureProperty{capture_key::MaximumFrameRate, false},
    CaptureProperty{capture_key::MultipleOutputSupportEnabled, false},
    CaptureProperty{capture_key::SynchronizedStreamsSlaveConfiguration, false},
    CaptureProperty{capture_key::ErrorCounters, true},
    CaptureProperty{capture_key::AEEnabled, false},
    CaptureProperty{capture_key::InfraredLightSourceConfiguration, false},
    CaptureProperty{capture_key::VideoOutputConfigurations, false},
    CaptureProperty{capture_key::VideoOutputsEnabled, false},
    CaptureProperty{capture_key::VideoOutputHandlers, false},
};

// The properties of an object of that kind; none for the service and the plug-in.
std::span<const CaptureProperty> propertiesOf(CaptureObjectKind kind);
// The property, or null.
const CaptureProperty* findProperty(CaptureObjectKind kind, std::string_view key);

namespace capture_operation {
inline constexpr std::string_view kCreatePlugIn = "CaptureService.createPlugIn";
inline constexpr std::string_view kDefaultPlugIn = "CaptureService.defaultPlugIn";
inline constexpr std::string_view kDevice = "CapturePlugIn.device";
inline constexpr std::string_view kDeviceStreams = "CaptureDevice.streams";
inline constexpr std::string_view kGroups = "CaptureDevice.synchronizedStreamsGroups";
inline constexpr std::string_view kRequestControl = "CaptureDevice.requestControlOfStreams";
inline constexpr std::string_view kRelinquishControl = "CaptureDevice.relinquishControlOfStreams";
inline constexpr std::string_view kInvalidate = "CaptureDevice.invalidate";
inline constexpr std::string_view kReadDevice = "CaptureDevice.valueForProperty";
inline constexpr std::string_view kSetDevice = "CaptureDevice.setValue";
inline constexpr std::string_view kGroupStreams = "SynchronizedStreamsGroup.streams";
inline constexpr std::string_view kReadGroup = "SynchronizedStreamsGroup.valueForProperty";
inline constexpr std::string_view kSetGroup = "SynchronizedStreamsGroup.setValue";
inline constexpr std::string_view kReadStream = "CaptureStream.valueForProperty";
inline constexpr std::string_view kSetStream = "CaptureStream.setValue";
inline constexpr std::string_view kStart = "CaptureStream.start";
inline constexpr std::string_view kStop = "CaptureStream.stop";
}  // namespace capture_operation

// Cannot fail, so faults do not reach it; observers do.
inline constexpr std::string_view kClockSleep = "Clock.sleep";

// An operation that can fail.
struct CaptureOperation {
  std::string_view name;
  CaptureObjectKind on;
  bool hasProperty;  // reads or sets one
};

inline constexpr std::array kCaptureOperations{
    CaptureOperation{capture_operation::kCreatePlugIn, CaptureObjectKind::kService, false},
    CaptureOperation{capture_operation::kDefaultPlugIn, CaptureObjectKind::kService, false},
    CaptureOperation{capture_operation::kDevice, CaptureObjectKind::kPlugIn, false},
    CaptureOperation{capture_operation::kDeviceStreams, CaptureObjectKind::kDevice, false},
    CaptureOperation{capture_operation::kGroups, CaptureObjectKind::kDevice, false},
    CaptureOperation{capture_operation::kRequestControl, CaptureObjectKind::kDevice, false},
    CaptureOperation{capture_operation::kRelinquishControl, CaptureObjectKind::kDevice, false},
    CaptureOperation{capture_operation::kInvalidate, CaptureObjectKind::kDevice, false},
    CaptureOperation{capture_operation::kReadDevice, CaptureObjectKind::kDevice, true},
    CaptureOperation{capture_operation::kSetDevice, CaptureObjectKind::kDevice, true},
    CaptureOperation{capture_operation::kGroupStreams, CaptureObjectKind::kGroup, false},
    CaptureOperation{capture_operation::kReadGroup, CaptureObjectKind::kGroup, true},
    CaptureOperation{capture_operation::kSetGroup, CaptureObjectKind::kGroup, true},
    CaptureOperation{capture_operation::kReadStream, CaptureObjectKind::kStream, true},
    CaptureOperation{capture_operation::kSetStream, CaptureObjectKind::kStream, true},
    CaptureOperation{capture_operation::kStart, CaptureObjectKind::kStream, false},
    CaptureOperation{capture_operation::kStop, CaptureObjectKind::kStream, false},
};

inline constexpr std::array kPortTypes{
    port_type::BackFacingCamera,  port_type::BackFacingTelephotoCamera, port_type::BackFacingSuperWideCamera,
    port_type::FrontFacingCamera, port_type::FrontFacingInfraredCamera,
};

}  // namespace quazor
