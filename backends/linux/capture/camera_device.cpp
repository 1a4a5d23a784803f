#include "backends/linux/capture/camera_device.h"

#include "backends/linux/capture/camera_checks.h"
#include "platform/capture_keys.h"

#include <cmath>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

std::shared_ptr<V4l2Device> openMatching(const std::shared_ptr<V4l2Api>& kernel,
                                         const std::vector<V4l2DeviceInfo>& nodes, VideoNodeKind kind,
                                         const VideoNodeMatch& match, const std::string& port,
                                         DiagnosticErrorPtr* error) {
  const std::optional<V4l2DeviceInfo> node = findVideoNode(nodes, kind, match, port, error);
  return node ? V4l2Device::open(kernel, node->path.string(), error) : nullptr;
}

}  // namespace

Value CameraSettings::darkness() {
  Dictionary dark;
  for (const std::string_view key :
       {capture_key::Mode, capture_key::StructuredLightPattern, capture_key::StructuredLightCurrent}) {
    dark.set(key, 0);
  }
  return dark;
}

std::shared_ptr<PixelBufferHandler> CameraSettings::frameHandler() const {
  if (!toBoolean(entryOf(&outputsEnabled, capture_key::PrimaryScaler))) return nullptr;
  const Value* const handlers = entryOf(&outputHandlers, capture_key::PrimaryScaler);
  const Value* const handler = entryOf(handlers, capture_key::PixelBufferHandler);
  return handler == nullptr ? nullptr : std::dynamic_pointer_cast<PixelBufferHandler>(handler->object());
}

FrameInterval intervalFor(double framesPerSecond) {
  const double whole = std::round(framesPerSecond);
  if (whole > 0 && std::abs(framesPerSecond - whole) < 1e-6) return {1, static_cast<std::uint32_t>(whole)};
  return {1000, static_cast<std::uint32_t>(std::lround(framesPerSecond * 1000))};
}

bool LinuxCamera::open(const std::shared_ptr<V4l2Api>& kernel, const std::vector<V4l2DeviceInfo>& nodes,
                       DiagnosticErrorPtr* error) {
  settings_ = CameraSettings();
  node_ = openMatching(kernel, nodes, VideoNodeKind::kCamera, binding_.node, port(), error);
  if (node_ != nullptr && binding_.metadata.node) {
    metadataNode_ = openMatching(kernel, nodes, VideoNodeKind::kMetadata, *binding_.metadata.node, port(), error);
    if (metadataNode_ == nullptr) node_.reset();
  }
  const bool opened = node_ != nullptr && prepare(error);
  if (!opened) close();
  return opened;
}

bool LinuxCamera::prepare(DiagnosticErrorPtr* error) {
  const bool prepared = node_->lockExclusive(error) &&
                        (!binding_.projector || node_->set(binding_.projector->off, error)) &&
                        node_->set(binding_.controls, error);
  if (prepared) settings_.autoExposure = exposesAutomatically();
  return prepared;
}

bool LinuxCamera::exposesAutomatically() const {
  const VideoControl* const control = node_->controlOfId(V4L2_CID_EXPOSURE_AUTO);
  if (control == nullptr) return false;
  return node_->read(*control, nullptr).value_or(V4L2_EXPOSURE_MANUAL) != V4L2_EXPOSURE_MANUAL;
}

void LinuxCamera::close() {
  node_.reset();
  metadataNode_.reset();
}

bool LinuxCamera::setFormatIndex(const Value& index, DiagnosticErrorPtr* error) {
  if (!applyFormat(index, error)) return false;
  settings_.formatIndex = index;
  return true;
}

bool LinuxCamera::applyFormat(const Value& index, DiagnosticErrorPtr* error) {
  return node_->setFormat(static_cast<std::uint32_t>(toUnsigned(&index)), binding_.width, binding_.height, error);
}

bool LinuxCamera::setRates(const std::optional<Value>& minimum, const std::optional<Value>& maximum,
                           DiagnosticErrorPtr* error) {
  const bool agree = minimum && maximum && toDouble(&*minimum) <= toDouble(&*maximum);
  if (agree && !applyRates(minimum, maximum, error)) return false;
  settings_.minimumRate = minimum;
  settings_.maximumRate = maximum;
  return true;
}

// Without any rate, the driver keeps its own, which it may be unable to tell.
std::optional<FrameInterval> LinuxCamera::applyRates(const std::optional<Value>& minimum,
                                                     const std::optional<Value>& maximum, DiagnosticErrorPtr* error) {
  if (!minimum && !maximum) return node_->interval(nullptr).value_or(FrameInterval());
  const double lowest = toDouble(pointerTo(minimum));
  const double highest = maximum ? toDouble(&*maximum) : HUGE_VAL;
  const FrameInterval wanted = intervalFor(maximum ? highest : lowest);
  const std::optional<FrameInterval> given = node_->setInterval(wanted, error);
  if (!given) return std::nullopt;
  const double rate = given->numerator == 0 ? 0 : given->framesPerSecond();
  const bool fits = rate > 0 && rate >= lowest * (1 - kRateTolerance) && rate <= highest * (1 + kRateTolerance);
  if (fits) return given;
  refuseLinux(error, LinuxErrorCode::kNotSupported,
              "%@: %@ does not take %@ between frames in this format; its driver gives %@ instead, which is %@ frames "
              "per second.",
              port(), node_->path(), textOf(wanted), textOf(*given), rate);
  return std::nullopt;
}

bool LinuxCamera::setAutoExposure(const Value& enabled, DiagnosticErrorPtr* error) {
  const VideoControl* const control = node_->controlOfId(V4L2_CID_EXPOSURE_AUTO);
  if (control == nullptr && *enabled.boolean()) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ has no automatic exposure.", port(),
                       node_->path());
  }
  if (control != nullptr) {
    // Of the automatic ways, cameras have this or that; the driver's default is one that it has.
    constexpr std::int64_t kManual = V4L2_EXPOSURE_MANUAL;
    constexpr std::int64_t kAutomatic = V4L2_EXPOSURE_AUTO;
    const std::int64_t automatic = control->usual == kManual ? kAutomatic : control->usual;
    if (!node_->set(*control, *enabled.boolean() ? automatic : kManual, error)) return false;
  }
  settings_.autoExposure = enabled;
  return true;
}

bool LinuxCamera::setLightSource(const Value& configuration, DiagnosticErrorPtr* error) {
  if (!binding_.projector) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@ has no projector, so no %@.", port(),
                       capture_key::InfraredLightSourceConfiguration);
  }
  for (const ControlSetting& setting : lightOf(configuration)) {
    const VideoControl* const control = node_->control(setting.control, error);
    if (control == nullptr) return false;
    if (!takes(*control, setting.value)) {
      return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: the control \"%@\" takes %@ to %@, not %@.", port(),
                         control->name, control->lowest, control->highest, setting.value);
    }
  }
  settings_.lightSource = configuration;
  return true;
}

// What lights the projector; nothing in mode 0, which keeps it dark. What is switched on comes last.
std::vector<ControlSetting> LinuxCamera::lightOf(const Value& configuration) const {
  std::vector<ControlSetting> settings;
  if (!binding_.projector || !toBoolean(entryOf(&configuration, capture_key::Mode))) return settings;
  const ProjectorBinding& projector = *binding_.projector;
  const auto add = [&](const std::optional<std::string>& control, std::string_view key) {
    if (control) settings.push_back({*control, toSigned(entryOf(&configuration, key))});
  };
  add(projector.modeControl, capture_key::Mode);
  add(projector.patternControl, capture_key::StructuredLightPattern);
  add(projector.currentControl, capture_key::StructuredLightCurrent);
  settings.insert(settings.end(), projector.on.begin(), projector.on.end());
  return settings;
}

std::shared_ptr<CameraRun> LinuxCamera::begin(std::shared_ptr<DeliveredFrames> delivered, DiagnosticErrorPtr* error) {
  if (!applyFormat(settings_.formatIndex, error)) return nullptr;
  const std::optional<FrameInterval> interval = applyRates(settings_.minimumRate, settings_.maximumRate, error);
  if (!interval) return nullptr;
  CameraRunPlan plan;
  plan.camera = binding_;
  plan.interval = *interval;
  plan.handler = settings_.frameHandler();
  plan.light = lightOf(settings_.lightSource);
  plan.node = node_;
  plan.metadataNode = metadataNode_;
  auto begun = std::make_shared<CameraRun>(std::move(plan), std::move(delivered));
  return begun->begin(error) ? begun : nullptr;
}

}  // namespace quazor
