// Port types and the property keys of capture devices, groups and streams: the strings shared by plug-ins and capture
// services.
#pragma once

#include "contract/contract.h"

#include <string_view>

namespace QUAZOR_CONTRACT {

// The position and type of a camera.
namespace port_type {
inline constexpr std::string_view BackFacingCamera = "BackFacingCamera";
inline constexpr std::string_view BackFacingTelephotoCamera = "BackFacingTelephotoCamera";
inline constexpr std::string_view BackFacingSuperWideCamera = "BackFacingSuperWideCamera";
inline constexpr std::string_view FrontFacingCamera = "FrontFacingCamera";
inline constexpr std::string_view FrontFacingInfraredCamera = "FrontFacingInfraredCamera";
}  // namespace port_type

namespace capture_key {

// Of streams.
inline constexpr std::string_view PortType = "PortType";  // string; read only
// string: what the system calls the camera, for people; read only. Perhaps only with control of the stream.
inline constexpr std::string_view CameraName = "CameraName";
inline constexpr std::string_view FormatIndex = "FormatIndex";                                    // integer
inline constexpr std::string_view MinimumFrameRate = "MinimumFrameRate";                          // number, per second
inline constexpr std::string_view MaximumFrameRate = "MaximumFrameRate";                          // number, per second
inline constexpr std::string_view MultipleOutputSupportEnabled = "MultipleOutputSupportEnabled";  // boolean
inline constexpr std::string_view ErrorCounters = "ErrorCounters";  // dictionary: counter name to count; read only
// Dictionary of the four entries below it.
inline constexpr std::string_view SynchronizedStreamsSlaveConfiguration = "SynchronizedStreamsSlaveConfiguration";
inline constexpr std::string_view StreamingOutputsEnabled = "StreamingOutputsEnabled";          // boolean
inline constexpr std::string_view FrameSkippingEnabled = "FrameSkippingEnabled";                // boolean
inline constexpr std::string_view TimeMachineEnabled = "TimeMachineEnabled";                    // boolean
inline constexpr std::string_view MasterToSlaveFrameRateRatio = "MasterToSlaveFrameRateRatio";  // integer

inline constexpr std::string_view AEEnabled = "AEEnabled";  // boolean: automatic exposure
// Dictionary of the three integers below it, which configure the infrared light sources.
inline constexpr std::string_view InfraredLightSourceConfiguration = "InfraredLightSourceConfiguration";
inline constexpr std::string_view Mode = "Mode";
inline constexpr std::string_view StructuredLightPattern = "StructuredLightPattern";
inline constexpr std::string_view StructuredLightCurrent = "StructuredLightCurrent";
// Dictionaries by video output.
inline constexpr std::string_view VideoOutputConfigurations = "VideoOutputConfigurations";  // of dictionaries
inline constexpr std::string_view VideoOutputsEnabled = "VideoOutputsEnabled";              // of booleans
inline constexpr std::string_view VideoOutputHandlers = "VideoOutputHandlers";              // of dictionaries
inline constexpr std::string_view PrimaryScaler = "PrimaryScaler";                          // a video output
inline constexpr std::string_view AttachRaw = "AttachRaw";                    // in a configuration: boolean
inline constexpr std::string_view PixelBufferHandler = "PixelBufferHandler";  // in handlers: platform/pixel_buffer.h
inline constexpr std::string_view EventHandler = "EventHandler";              // in handlers: platform/pixel_buffer.h

// In ErrorCounters.
inline constexpr std::string_view I2CErrorCount = "I2CErrorCount";
inline constexpr std::string_view MIPIErrorCount = "MIPIErrorCount";

// Of groups of synchronised streams.
inline constexpr std::string_view ActiveStreams = "ActiveStreams";                  // array of streams
inline constexpr std::string_view SynchronizationMaster = "SynchronizationMaster";  // a stream; read only
// Array of the keys that MasterConfiguration may hold; read only.
inline constexpr std::string_view MasterConfigurationSupportedKeys = "MasterConfigurationSupportedKeys";
inline constexpr std::string_view MasterConfiguration = "MasterConfiguration";  // dictionary
// In MasterConfiguration: dictionary, port type to a slave configuration.
inline constexpr std::string_view SlaveConfigurationByPortType = "SlaveConfigurationByPortType";

// Of devices.
inline constexpr std::string_view MultiCamConfiguration = "MultiCamConfiguration";  // dictionary
// In MultiCamConfiguration: array of groups.
inline constexpr std::string_view ActiveSynchronizedStreamsGroups = "ActiveSynchronizedStreamsGroups";
// Dictionary, port type to a dictionary of the two entries below it; read only.
inline constexpr std::string_view MulticamSessionStatus = "MulticamSessionStatus";
// Number of frames between the session's first frame and the camera's first frame.
inline constexpr std::string_view Offset = "Offset";
// Number of frames since the camera's first; negative if it recorded none.
inline constexpr std::string_view FrameCount = "FrameCount";

// Of pixel buffers: the attachment that holds the frame's metadata, a dictionary, and what it holds among others.
inline constexpr std::string_view MetadataDictionary = "MetadataDictionary";
inline constexpr std::string_view InfraredLightSource = "InfraredLightSource";        // number
inline constexpr std::string_view FloodActiveTemperature = "FloodActiveTemperature";  // number; not on every frame

}  // namespace capture_key

}  // namespace QUAZOR_CONTRACT
