#include "backends/linux/media/subdevice.h"

#include "backends/linux/binding/media_bus_codes.h"
#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"

#include <linux/v4l2-subdev.h>

#include <algorithm>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

PadFormat formatIn(const v4l2_subdev_format& answer) {
  return {answer.format.code, answer.format.width, answer.format.height};
}

void put(const PadFormat& format, v4l2_subdev_format& question) {
  question.format.code = format.code;
  question.format.width = format.width;
  question.format.height = format.height;
  question.format.field = V4L2_FIELD_NONE;
}

FrameArea areaIn(const v4l2_rect& rectangle) {
  const auto unsignedOf = [](std::int32_t side) { return static_cast<std::uint32_t>(std::max(side, 0)); };
  return {unsignedOf(rectangle.left), unsignedOf(rectangle.top), rectangle.width, rectangle.height};
}

std::string textOf(const FrameArea& area) {
  return formatMessage("%@ x %@ at (%@, %@)", area.width, area.height, area.left, area.top);
}

bool isSameTime(FrameInterval one, FrameInterval other) {
  return std::uint64_t{one.numerator} * other.denominator == std::uint64_t{other.numerator} * one.denominator;
}

}  // namespace

std::string textOf(const PadFormat& format) {
  return formatMessage("%@ of %@ x %@", mediaBusCodeText(format.code), format.width, format.height);
}

std::shared_ptr<Subdevice> Subdevice::open(std::shared_ptr<V4l2Api> kernel, const MediaEntity& entity,
                                           const std::string& purpose, DiagnosticErrorPtr* error) {
  if (!entity.isSubdevice) {
    refuseLinux(error, LinuxErrorCode::kNotSupported,
                "%@: the entity \"%@\" is no sub-device with a device file, so it has nothing to set.", purpose,
                entity.name);
    return nullptr;
  }
  DiagnosticErrorPtr problem;
  auto device = V4l2Device::openSubdevice(std::move(kernel), entity.node.string(), &problem);
  if (device != nullptr) return std::shared_ptr<Subdevice>(new Subdevice(entity, std::move(device)));
  failLinux(error, static_cast<LinuxErrorCode>(problem->code()),
            purpose + ": \"" + entity.name + "\": " + problem->localizedDescription());
  return nullptr;
}

Subdevice::Subdevice(MediaEntity entity, std::shared_ptr<V4l2Device> device)
    : entity_(std::move(entity)), device_(std::move(device)) {}

std::string Subdevice::callText(std::string_view call, std::uint32_t pad) const {
  return std::string(call) + " of \"" + textOf(PadName{entity_.name, pad}) + "\"";
}

bool Subdevice::apply(const PadBinding& wanted, const std::string& purpose, DiagnosticErrorPtr* error) {
  const std::uint32_t pad = wanted.pad.pad;
  const auto found = std::ranges::find(entity_.pads, pad, &MediaPad::index);
  if (found == entity_.pads.end()) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: the entity \"%@\" has no pad %@; it has %@ pads.",
                       purpose, entity_.name, pad, entity_.pads.size());
  }
  const auto format = [&] { return !wanted.format || setFormat(pad, *wanted.format, purpose, error); };
  const auto crop = [&] { return !wanted.crop || setCrop(pad, *wanted.crop, purpose, error); };
  // A sink is cropped to a part of its format; what a source sends has the size of its crop.
  return (found->isSource ? crop() && format() : format() && crop()) &&
         (!wanted.interval || setInterval(pad, *wanted.interval, purpose, error));
}

std::optional<PadFormat> Subdevice::format(std::uint32_t pad, DiagnosticErrorPtr* error) const {
  v4l2_subdev_format answer{};
  answer.which = V4L2_SUBDEV_FORMAT_ACTIVE;
  answer.pad = pad;
  const std::string call = callText("VIDIOC_SUBDEV_G_FMT", pad);
  if (!device_->call(VIDIOC_SUBDEV_G_FMT, call, &answer, error)) return std::nullopt;
  return formatIn(answer);
}

// Keeps what the binding does not say, such as the colour space.
bool Subdevice::setFormat(std::uint32_t pad, const PadFormat& wanted, const std::string& purpose,
                          DiagnosticErrorPtr* error) {
  v4l2_subdev_format format{};
  format.which = V4L2_SUBDEV_FORMAT_ACTIVE;
  format.pad = pad;
  if (!device_->call(VIDIOC_SUBDEV_G_FMT, callText("VIDIOC_SUBDEV_G_FMT", pad), &format, error)) return false;
  if (formatIn(format) == wanted) return true;
  put(wanted, format);
  if (!device_->call(VIDIOC_SUBDEV_S_FMT, callText("VIDIOC_SUBDEV_S_FMT", pad), &format, error)) return false;
  if (formatIn(format) == wanted) return true;
  return refuseLinux(error, LinuxErrorCode::kNotSupported,
                     "%@: the pad \"%@\" does not take the format %@; its driver has set %@.", purpose,
                     textOf(PadName{entity_.name, pad}), textOf(wanted), textOf(formatIn(format)));
}

bool Subdevice::setCrop(std::uint32_t pad, const FrameArea& wanted, const std::string& purpose,
                        DiagnosticErrorPtr* error) {
  v4l2_subdev_selection selection{};
  selection.which = V4L2_SUBDEV_FORMAT_ACTIVE;
  selection.pad = pad;
  selection.target = V4L2_SEL_TGT_CROP;
  const std::string reading = callText("VIDIOC_SUBDEV_G_SELECTION", pad);
  if (!device_->call(VIDIOC_SUBDEV_G_SELECTION, reading, &selection, error)) return false;
  if (areaIn(selection.r) == wanted) return true;
  selection.r = {static_cast<std::int32_t>(wanted.left), static_cast<std::int32_t>(wanted.top), wanted.width,
                 wanted.height};
  const std::string setting = callText("VIDIOC_SUBDEV_S_SELECTION", pad);
  if (!device_->call(VIDIOC_SUBDEV_S_SELECTION, setting, &selection, error)) return false;
  if (areaIn(selection.r) == wanted) return true;
  return refuseLinux(error, LinuxErrorCode::kNotSupported,
                     "%@: the pad \"%@\" cannot be cropped to %@; its driver has set %@.", purpose,
                     textOf(PadName{entity_.name, pad}), textOf(wanted), textOf(areaIn(selection.r)));
}

bool Subdevice::setInterval(std::uint32_t pad, FrameInterval wanted, const std::string& purpose,
                            DiagnosticErrorPtr* error) {
  v4l2_subdev_frame_interval request{};
  request.pad = pad;
  request.interval = {wanted.numerator, wanted.denominator};
  const std::string setting = callText("VIDIOC_SUBDEV_S_FRAME_INTERVAL", pad);
  if (!device_->call(VIDIOC_SUBDEV_S_FRAME_INTERVAL, setting, &request, error)) return false;
  const FrameInterval given{request.interval.numerator, request.interval.denominator};
  if (isSameTime(given, wanted)) return true;
  return refuseLinux(error, LinuxErrorCode::kNotSupported,
                     "%@: the pad \"%@\" does not take the interval %@; its driver has set %@.", purpose,
                     textOf(PadName{entity_.name, pad}), textOf(wanted), textOf(given));
}

std::optional<PadFormat> Subdevice::tryFormat(std::uint32_t pad, const PadFormat& wanted) const {
  v4l2_subdev_format format{};
  format.which = V4L2_SUBDEV_FORMAT_TRY;
  format.pad = pad;
  put(wanted, format);
  if (device_->call(VIDIOC_SUBDEV_S_FMT, &format) != 0) return std::nullopt;
  return formatIn(format);
}

std::optional<PadFormat> Subdevice::triedFormat(std::uint32_t pad) const {
  v4l2_subdev_format format{};
  format.which = V4L2_SUBDEV_FORMAT_TRY;
  format.pad = pad;
  if (device_->call(VIDIOC_SUBDEV_G_FMT, &format) != 0) return std::nullopt;
  return formatIn(format);
}

std::vector<std::uint32_t> Subdevice::codes(std::uint32_t pad) const {
  constexpr std::uint32_t kMaxCodes = 1024;
  std::vector<std::uint32_t> codes;
  for (std::uint32_t index = 0; index < kMaxCodes; ++index) {
    v4l2_subdev_mbus_code_enum entry{};
    entry.pad = pad;
    entry.index = index;
    entry.which = V4L2_SUBDEV_FORMAT_TRY;
    if (device_->call(VIDIOC_SUBDEV_ENUM_MBUS_CODE, &entry) != 0) break;
    codes.push_back(entry.code);
  }
  return codes;
}

}  // namespace quazor
