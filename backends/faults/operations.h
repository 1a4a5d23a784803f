// The operations of a platform by name, for faults and observers.
#pragma once

#include <array>
#include <string_view>

namespace quazor {

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

namespace report_operation {
inline constexpr std::string_view kSimpleChannels = "ReportFacility.reportWithOnlySimpleChannels";
inline constexpr std::string_view kSnapshot = "ReportChannelSet.snapshot";
inline constexpr std::string_view kDelta = "ReportSnapshot.snapshotWithBaseline";
// Cannot fail, so faults do not reach it; observers do.
inline constexpr std::string_view kFilter = "ReportChannelSet.reportByFilteringChannels";
}  // namespace report_operation

namespace sensor_operation {
inline constexpr std::string_view kCreateManager = "HidService.createManager";
inline constexpr std::string_view kEnumerate = "HidManager.enumerateDevicesMatching";
inline constexpr std::string_view kDevices = "HidManager.devices";
inline constexpr std::string_view kOpen = "HidDevice.open";
inline constexpr std::string_view kSetCallback = "HidDevice.setInputReportCallback";
inline constexpr std::string_view kSetFeature = "HidDevice.setFeatureReportWithID";
inline constexpr std::string_view kSchedule = "HidDevice.scheduleWithRunLoop";
inline constexpr std::string_view kUnschedule = "HidDevice.unscheduleFromRunLoop";
inline constexpr std::string_view kClose = "HidDevice.close";
inline constexpr std::string_view kMainDisplay = "FramebufferService.mainDisplay";
inline constexpr std::string_view kRegistryService = "Display.registryService";
inline constexpr std::string_view kRegistryProperty = "RegistryService.registryProperty";
inline constexpr std::string_view kCurrentRunLoop = "RunLoops.currentRunLoop";
}  // namespace sensor_operation

// Cannot fail, so faults do not reach it; observers do.
inline constexpr std::string_view kClockSleep = "Clock.sleep";

// The service that an operation belongs to. The display and the run loops belong to the sensors.
enum class OperationService { kCapture, kReports, kSensors };

// The kind of object that an operation belongs to. A platform has only one object of each other kind.
enum class OperationObject { kOnlyOne, kStream, kGroup, kHidDevice };

// The property that an operation reads or sets.
enum class OperationProperty { kNone, kOfDevice, kOfGroup, kOfStream, kFeatureReport, kOfRegistry };

struct Operation {
  std::string_view name;
  OperationService service;
  OperationObject object = OperationObject::kOnlyOne;
  OperationProperty property = OperationProperty::kNone;
};

// The operations that faults apply to. One without a result, such as HidDevice.close, has no effect if it fails.
inline constexpr std::array kOperations{
    Operation{capture_operation::kCreatePlugIn, OperationService::kCapture},
    Operation{capture_operation::kDefaultPlugIn, OperationService::kCapture},
    Operation{capture_operation::kDevice, OperationService::kCapture},
    Operation{capture_operation::kDeviceStreams, OperationService::kCapture},
    Operation{capture_operation::kGroups, OperationService::kCapture},
    Operation{capture_operation::kRequestControl, OperationService::kCapture},
    Operation{capture_operation::kRelinquishControl, OperationService::kCapture},
    Operation{capture_operation::kInvalidate, OperationService::kCapture},
    Operation{capture_operation::kReadDevice, OperationService::kCapture, OperationObject::kOnlyOne,
              OperationProperty::kOfDevice},
    Operation{capture_operation::kSetDevice, OperationService::kCapture, OperationObject::kOnlyOne,
              OperationProperty::kOfDevice},
    Operation{capture_operation::kGroupStreams, OperationService::kCapture, OperationObject::kGroup},
    Operation{capture_operation::kReadGroup, OperationService::kCapture, OperationObject::kGroup,
              OperationProperty::kOfGroup},
    Operation{capture_operation::kSetGroup, OperationService::kCapture, OperationObject::kGroup,
              OperationProperty::kOfGroup},
    Operation{capture_operation::kReadStream, OperationService::kCapture, OperationObject::kStream,
              OperationProperty::kOfStream},
    Operation{capture_operation::kSetStream, OperationService::kCapture, OperationObject::kStream,
              OperationProperty::kOfStream},
    Operation{capture_operation::kStart, OperationService::kCapture, OperationObject::kStream},
    Operation{capture_operation::kStop, OperationService::kCapture, OperationObject::kStream},
    Operation{report_operation::kSimpleChannels, OperationService::kReports},
    Operation{report_operation::kSnapshot, OperationService::kReports},
    Operation{report_operation::kDelta, OperationService::kReports},
    Operation{sensor_operation::kCreateManager, OperationService::kSensors},
    Operation{sensor_operation::kEnumerate, OperationService::kSensors},
    Operation{sensor_operation::kDevices, OperationService::kSensors},
    Operation{sensor_operation::kOpen, OperationService::kSensors, OperationObject::kHidDevice},
    Operation{sensor_operation::kSetCallback, OperationService::kSensors, OperationObject::kHidDevice},
    Operation{sensor_operation::kSetFeature, OperationService::kSensors, OperationObject::kHidDevice,
              OperationProperty::kFeatureReport},
    Operation{sensor_operation::kSchedule, OperationService::kSensors, OperationObject::kHidDevice},
    Operation{sensor_operation::kUnschedule, OperationService::kSensors, OperationObject::kHidDevice},
    Operation{sensor_operation::kClose, OperationService::kSensors, OperationObject::kHidDevice},
    Operation{sensor_operation::kMainDisplay, OperationService::kSensors},
    Operation{sensor_operation::kRegistryService, OperationService::kSensors},
    Operation{sensor_operation::kRegistryProperty, OperationService::kSensors, OperationObject::kOnlyOne,
              OperationProperty::kOfRegistry},
    Operation{sensor_operation::kCurrentRunLoop, OperationService::kSensors},
};

// The operation with that name, or null.
const Operation* findOperation(std::string_view name);

}  // namespace quazor
