// Which properties the objects of a capture service have: the vocabulary of the service's own checks, of scenario files
// and of faults.
#pragma once

#include "platform/capture_keys.h"

#include <array>
#include <span>
#include <string_view>

namespace quazor {

// The objects of the capture service that have properties.
enum class CaptureObjectKind { kDevice, kGroup, kStream };

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
    CaptureProperty{capture_key::CameraName, true},
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

// The properties of an object of that kind.
std::span<const CaptureProperty> propertiesOf(CaptureObjectKind kind);
// The property, or null.
const CaptureProperty* findProperty(CaptureObjectKind kind, std::string_view key);

inline constexpr std::array kPortTypes{
    port_type::BackFacingCamera,  port_type::BackFacingTelephotoCamera, port_type::BackFacingSuperWideCamera,
    port_type::FrontFacingCamera, port_type::FrontFacingInfraredCamera,
};

}  // namespace quazor
