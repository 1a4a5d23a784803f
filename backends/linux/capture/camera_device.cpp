#include "backends/linux/capture/camera_device.h"

#include "backends/linux/system/linux_error.h"
#include "contract/log_channel.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <cmath>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>

namespace quazor {
namespace {

std::shared_ptr<V4l2Device> openMatching(const std::shared_ptr<V4l2Api>& kernel,
                                         const std::vector<V4l2DeviceInfo>& nodes, VideoNodeKind kind,
                                         const VideoNodeMatch& match, const std::string& port,
                                         DiagnosticErrorPtr* error) {
  const std::optional<V4l2DeviceInfo> node = findVideoNode(nodes, kind, match, port, error);
  return node ? V4l2Device::open(kernel, *node, error) : nullptr;
}

CameraInfo infoOf(const CameraBinding& binding) {
  CameraInfo info;
  info.name = binding.port;
  info.port = binding.port;
  info.description = "stream of " + binding.port;
  info.hasProjector = binding.projector.has_value();
  return info;
}

// A lower rate cannot be expressed as an interval.
constexpr double kMinRate = 0.01;

}  // namespace

LinuxCamera::LinuxCamera(CameraBinding binding, std::shared_ptr<LinuxCameras> cameras)
    : binding_(std::move(binding)), info_(infoOf(binding_)), cameras_(std::move(cameras)) {}

bool LinuxCamera::open(CameraSettings& settings, DiagnosticErrorPtr* error) {
  const bool opened = openNodes(error) && node_->lockExclusive(error) && openControls(error) &&
                      (!binding_.projector || controls_->set(binding_.projector->off, error)) &&
                      controls_->set(binding_.controls, error);
  if (opened) settings.autoExposure = exposesAutomatically();
  if (!opened) close();
  return opened;
}

std::optional<std::string> LinuxCamera::cameraName() const {
  if (node_ == nullptr) return std::nullopt;
  const v4l2_capability& capability = node_->capability();
  const std::string bus = fixedText(capability.bus_info);
  return fixedText(capability.card) + (bus.empty() ? "" : " (" + bus + ")");
}

bool LinuxCamera::openNodes(DiagnosticErrorPtr* error) {
  const auto& [kernel, nodes] = std::tie(cameras_->kernel, cameras_->nodes);
  node_ = openMatching(kernel, nodes, VideoNodeKind::kCamera, binding_.node, port(), error);
  if (node_ == nullptr || !binding_.metadata.node) return node_ != nullptr;
  metadataNode_ = openMatching(kernel, nodes, VideoNodeKind::kMetadata, *binding_.metadata.node, port(), error);
  return metadataNode_ != nullptr && checkMetadata(*metadataNode_, error);
}

bool LinuxCamera::openControls(DiagnosticErrorPtr* error) {
  if (binding_.media) {
    pipeline_ = MediaPipeline::open(cameras_->media, *binding_.media, port(), node_->path(), error);
    if (pipeline_ == nullptr) return false;
  }
  using Subdevices = std::vector<std::shared_ptr<Subdevice>>;
  controls_ = std::make_shared<CameraControls>(node_, pipeline_ ? pipeline_->subdevices() : Subdevices());
  if (!controls_->undescribedControls().empty()) {
    logDefault("%@: the driver of %@ does not describe the controls %@; they cannot be used.", port(), node_->path(),
               controls_->undescribedControls());
  }
  return true;
}

// The fields must fit the format of the metadata node. A driver that does not report its format is believed.
bool LinuxCamera::checkMetadata(const V4l2Device& node, DiagnosticErrorPtr* error) const {
  const MetadataBinding& metadata = binding_.metadata;
  const std::optional<MetadataFormat> format = node.metadataFormat();
  if (metadata.format && (!format || format->fourcc != *metadata.format)) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported,
                       "%@: the binding's fields are those of the metadata format %@, but %@ has the format %@.",
                       port(), *metadata.format, node.path(), format ? format->fourcc : "that it does not report");
  }
  for (const MetadataField& field : metadata.fields) {
    const std::uint64_t end = std::uint64_t{field.offset} + field.bytes;
    if (!format || format->bytes == 0 || end <= format->bytes) continue;
    return refuseLinux(error, LinuxErrorCode::kNotSupported,
                       "%@: the metadata field \"%@\" ends at byte %@, but the buffers of %@ (format %@) have %@.",
                       port(), field.key, end, node.path(), format->fourcc, format->bytes);
  }
  return true;
}

// A control that cannot be read is taken for automatic: nothing shows that it is off.
bool LinuxCamera::exposesAutomatically() const {
  const std::optional<CameraControl> control = controls_->controlOfId(V4L2_CID_EXPOSURE_AUTO);
  if (!control) return controls_->mayHaveControl(V4L2_CID_EXPOSURE_AUTO);
  return control->read(nullptr).value_or(V4L2_EXPOSURE_AUTO) != V4L2_EXPOSURE_MANUAL;
}

void LinuxCamera::close() {
  controls_.reset();
  pipeline_.reset();
  metadataNode_.reset();
  node_.reset();
}

// The entry of the binding for the format index; null if the index is the driver's own.
const FormatBinding* LinuxCamera::formatOf(const CameraSettings& settings) const {
  const auto index = static_cast<std::uint32_t>(toUnsigned(&settings.formatIndex));
  const auto found = std::ranges::find(binding_.formats, index, &FormatBinding::index);
  return found == binding_.formats.end() ? nullptr : &*found;
}

VideoMode LinuxCamera::modeOf(const CameraSettings& settings) const {
  const FormatBinding* const bound = formatOf(settings);
  if (bound != nullptr) return {bound->index, bound->fourcc, bound->width, bound->height};
  return {static_cast<std::uint32_t>(toUnsigned(&settings.formatIndex)), {}, binding_.width, binding_.height};
}

bool LinuxCamera::applyFormat(const CameraSettings& wanted, DiagnosticErrorPtr* error) {
  return node_->setFormat(modeOf(wanted), error);
}

bool LinuxCamera::applyRates(const CameraSettings& wanted, DiagnosticErrorPtr* error) {
  for (const std::optional<Value>& rate : {wanted.minimumRate, wanted.maximumRate}) {
    if (!rate || toDouble(&*rate) >= kMinRate) continue;
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: no driver supports less than %@ frames per second.",
                       port(), kMinRate);
  }
  const bool agree =
      wanted.minimumRate && wanted.maximumRate && toDouble(&*wanted.minimumRate) <= toDouble(&*wanted.maximumRate);
  return !agree || intervalOf(wanted, error);
}

// Sets the requested rates. Without a rate the interval of the binding is set, or the driver's own interval remains,
// which may be unknown.
std::optional<FrameInterval> LinuxCamera::intervalOf(const CameraSettings& settings, DiagnosticErrorPtr* error) {
  const auto& [minimum, maximum] = std::tie(settings.minimumRate, settings.maximumRate);
  const FormatBinding* const format = formatOf(settings);
  const std::optional<FrameInterval> bound = format == nullptr ? std::nullopt : format->interval;
  if (!minimum && !maximum && !bound) return node_->interval(nullptr).value_or(FrameInterval());
  const double lowest = toDouble(pointerTo(minimum));
  const double highest = maximum ? toDouble(&*maximum) : HUGE_VAL;
  const auto fits = [&](FrameInterval interval) {
    const double rate = interval.numerator == 0 ? 0 : interval.framesPerSecond();
    return rate > 0 && rate >= lowest * (1 - kRateTolerance) && rate <= highest * (1 + kRateTolerance);
  };
  const FrameInterval wanted = bound.value_or(intervalFor(maximum ? highest : lowest));
  if (bound && !fits(wanted)) {
    refuseLinux(error, LinuxErrorCode::kNotSupported,
                "%@: the binding gives format index %@ an interval of %@, which is %@ frames per second, and this rate "
                "was not requested. Change the interval or remove it.",
                port(), format->index, textOf(wanted), wanted.framesPerSecond());
    return std::nullopt;
  }
  const VideoMode mode = modeOf(settings);
  const RateRequest request{port(), mode.index, mode.width, mode.height, wanted, bound.has_value()};
  const std::optional<FrameInterval> given = setRate(*node_, *controls_, request, error);
  if (!given || fits(*given)) return given;
  refuseLinux(
      error, LinuxErrorCode::kNotSupported,
      "%@: %@ does not support %@ between frames in this format; its driver uses %@ instead, which is %@ frames "
      "per second.",
      port(), node_->path(), textOf(wanted), textOf(*given), given->numerator == 0 ? 0 : given->framesPerSecond());
  return std::nullopt;
}

bool LinuxCamera::applyAutoExposure(const CameraSettings& wanted, DiagnosticErrorPtr* error) {
  const bool isAutomatic = *wanted.autoExposure.boolean();
  const std::optional<CameraControl> control = controls_->controlOfId(V4L2_CID_EXPOSURE_AUTO);
  if (!control && controls_->mayHaveControl(V4L2_CID_EXPOSURE_AUTO)) {
    return refuseLinux(
        error, LinuxErrorCode::kNotSupported,
        "%@: automatic exposure of %@ cannot be set, because its driver does not describe the controls %@.", port(),
        node_->path(), controls_->undescribedControls());
  }
  if (!control && isAutomatic) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ has no automatic exposure.", port(),
                       node_->path());
  }
  if (control) {
    // Cameras support different automatic modes. The driver's default is one that this camera supports.
    constexpr std::int64_t kManual = V4L2_EXPOSURE_MANUAL;
    constexpr std::int64_t kAutomatic = V4L2_EXPOSURE_AUTO;
    const std::int64_t automatic =
        control->control.defaultValue == kManual ? kAutomatic : control->control.defaultValue;
    return control->set(isAutomatic ? automatic : kManual, error);
  }
  return true;
}

bool LinuxCamera::checkLightSource(const CameraSettings& wanted, DiagnosticErrorPtr* error) {
  for (const ControlSetting& setting : lightOf(wanted.lightSource)) {
    const std::optional<CameraControl> found = controls_->control(setting.control, error);
    if (!found) return false;
    const VideoControl& control = found->control;
    if (!takes(control, setting.value)) {
      return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: the control \"%@\" accepts %@ to %@, not %@.", port(),
                         control.name, control.minimum, control.maximum, setting.value);
    }
  }
  return true;
}

// The controls that switch the projector on, in order; empty for mode 0, in which it stays dark.
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

std::optional<Dictionary> LinuxCamera::errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const {
  if (run == nullptr) return errorCountersOf(binding_.errorCounters);
  return static_cast<const CameraRun*>(run)->errorCounters(error);
}

std::optional<SessionCount> LinuxCamera::sessionCount(const CaptureRun* run, const CaptureRun& master) const {
  const auto& first = static_cast<const CameraRun&>(master);
  const FrameCounts counts = run == nullptr ? FrameCounts() : static_cast<const CameraRun*>(run)->counts();
  const std::int64_t frames = counts.frames == 0 ? -1 : static_cast<std::int64_t>(counts.frames);
  return SessionCount{frameOffset(counts, first.counts(), first.interval()), frames};
}

std::shared_ptr<CameraRun> LinuxCamera::begin(const CameraSettings& settings, DiagnosticErrorPtr* error) {
  if (pipeline_ != nullptr && !pipeline_->prepare(error)) return nullptr;
  if (!applyFormat(settings, error)) return nullptr;
  const std::optional<FrameInterval> interval = intervalOf(settings, error);
  if (!interval) return nullptr;
  CameraRunPlan plan;
  plan.camera = binding_;
  plan.interval = *interval;
  plan.handler = settings.frameHandler();
  plan.light = lightOf(settings.lightSource);
  plan.node = node_;
  plan.metadataNode = metadataNode_;
  plan.controls = controls_;
  if (const auto found = cameras_->traced.find(port()); found != cameras_->traced.end()) plan.traced = found->second;
  auto begun = std::make_shared<CameraRun>(std::move(plan), cameras_->delivered);
  return begun->begin(error) ? begun : nullptr;
}

}  // namespace quazor
