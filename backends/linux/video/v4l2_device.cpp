#include "backends/linux/video/v4l2_device.h"

#include "backends/linux/system/linux_error.h"
#include "backends/linux/video/control_names.h"
#include "base/text/hexadecimal.h"
#include "contract/message_format.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <utility>

namespace quazor {
namespace {

// Drivers list some hundreds of controls or formats at most; the limit stops one that never ends its list.
constexpr std::uint32_t kMaxItems = 4096;
// The same for the sizes and intervals of all formats.
constexpr std::uint32_t kMaxModes = 65536;

// The four characters of a pixel format, and "-BE" for a big-endian one.
std::string fourccText(std::uint32_t fourcc) {
  constexpr std::uint32_t kBigEndian = 1U << 31;
  std::string text;
  for (int shift = 0; shift < 32; shift += 8) text += static_cast<char>(fourcc >> shift & 0x7f);
  return (fourcc & kBigEndian) == 0 ? text : text + "-BE";
}

// The part of a picture's format that single- and multi-planar nodes share.
struct PictureFormat {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t fourcc = 0;

  friend bool operator==(const PictureFormat&, const PictureFormat&) = default;
};

v4l2_format formatOf(const PictureFormat& picture, std::uint32_t type) {
  v4l2_format format{};
  format.type = type;
  const auto fill = [&picture](auto& pixels) {
    pixels.width = picture.width;
    pixels.height = picture.height;
    pixels.pixelformat = picture.fourcc;
    pixels.field = V4L2_FIELD_ANY;
  };
  type == V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE ? fill(format.fmt.pix_mp) : fill(format.fmt.pix);
  return format;
}

PictureFormat pictureOf(const v4l2_format& format) {
  const auto read = [](const auto& pixels) { return PictureFormat{pixels.width, pixels.height, pixels.pixelformat}; };
  return format.type == V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE ? read(format.fmt.pix_mp) : read(format.fmt.pix);
}

FrameInterval intervalOf(const v4l2_fract& fraction) { return {fraction.numerator, fraction.denominator}; }

v4l2_ext_controls listOfOne(v4l2_ext_control& control) {
  v4l2_ext_controls list{};
  list.which = V4L2_CTRL_WHICH_CUR_VAL;
  list.count = 1;
  list.controls = &control;
  return list;
}

bool is64Bit(const VideoControl& control) { return control.type == V4L2_CTRL_TYPE_INTEGER64; }

// Buttons have no value, and volatile controls may change at any time.
bool keepsItsValue(const VideoControl& control) {
  constexpr std::uint32_t kChanging = V4L2_CTRL_FLAG_VOLATILE | V4L2_CTRL_FLAG_WRITE_ONLY;
  return control.type != V4L2_CTRL_TYPE_BUTTON && (control.flags & kChanging) == 0;
}

VideoControl controlOf(const v4l2_query_ext_ctrl& query) {
  return {query.id,   query.type, fixedText(query.name), query.minimum, query.maximum, query.default_value,
          query.step, query.flags};
}

}  // namespace

std::string textOf(FrameInterval interval) {
  return formatMessage("%@/%@ s", interval.numerator, interval.denominator);
}

bool takes(const VideoControl& control, std::int64_t value) {
  const bool hasRange = control.type != V4L2_CTRL_TYPE_BUTTON && control.type != V4L2_CTRL_TYPE_BITMASK;
  return !hasRange || (value >= control.minimum && value <= control.maximum);
}

ControlValue valueFor(const VideoControl& control, std::int64_t value) { return {control.id, value, is64Bit(control)}; }

std::shared_ptr<V4l2Device> V4l2Device::made(std::shared_ptr<V4l2Api> kernel, const std::string& path, int descriptor,
                                             DiagnosticErrorPtr* error) {
  if (descriptor >= 0) return std::shared_ptr<V4l2Device>(new V4l2Device(std::move(kernel), path, descriptor));
  failSystemCall(error, "open", path, -descriptor);
  return nullptr;
}

std::shared_ptr<V4l2Device> V4l2Device::opened(std::shared_ptr<V4l2Api> kernel, const std::string& path, int descriptor,
                                               DiagnosticErrorPtr* error) {
  std::shared_ptr<V4l2Device> node = made(std::move(kernel), path, descriptor, error);
  return node != nullptr && node->call(VIDIOC_QUERYCAP, "VIDIOC_QUERYCAP", &node->capability_, error) ? node : nullptr;
}

std::shared_ptr<V4l2Device> V4l2Device::open(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                             DiagnosticErrorPtr* error) {
  const int descriptor = kernel->open(path);
  std::shared_ptr<V4l2Device> node = opened(std::move(kernel), path, descriptor, error);
  if (node != nullptr) node->listControls();
  return node;
}

std::shared_ptr<V4l2Device> V4l2Device::open(std::shared_ptr<V4l2Api> kernel, const V4l2DeviceInfo& info,
                                             DiagnosticErrorPtr* error) {
  std::shared_ptr<V4l2Device> node = open(std::move(kernel), info.path.string(), error);
  if (node == nullptr) return node;
  const v4l2_capability& found = node->capability_;
  const bool isAlike = fixedText(found.driver) == info.driver && fixedText(found.card) == info.card &&
                       fixedText(found.bus_info) == info.busInfo;
  const bool isSame = isAlike ? isStillThere(info.identity, textOf(info), error) : refuseReplaced(textOf(info), error);
  return isSame ? node : nullptr;
}

std::shared_ptr<V4l2Device> V4l2Device::openSubdevice(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                                      DiagnosticErrorPtr* error) {
  const int descriptor = kernel->open(path);
  std::shared_ptr<V4l2Device> subdevice = made(std::move(kernel), path, descriptor, error);
  if (subdevice != nullptr) subdevice->listControls();
  return subdevice;
}

std::shared_ptr<V4l2Device> V4l2Device::inspect(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                                DiagnosticErrorPtr* error) {
  const int descriptor = kernel->openForQueries(path);
  return opened(std::move(kernel), path, descriptor, error);
}

V4l2Device::V4l2Device(std::shared_ptr<V4l2Api> kernel, std::string path, int descriptor)
    : kernel_(std::move(kernel)), path_(std::move(path)), descriptor_(descriptor) {}

V4l2Device::~V4l2Device() { kernel_->close(descriptor_); }

std::uint32_t V4l2Device::capabilities() const {
  const bool own = (capability_.capabilities & V4L2_CAP_DEVICE_CAPS) != 0;
  return own ? capability_.device_caps : capability_.capabilities;
}

VideoNodeKind V4l2Device::kind() const {
  const std::uint32_t capabilities = this->capabilities();
  if ((capabilities & V4L2_CAP_STREAMING) == 0) return VideoNodeKind::kOther;
  if ((capabilities & (V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_VIDEO_CAPTURE_MPLANE)) != 0) return VideoNodeKind::kCamera;
  return (capabilities & V4L2_CAP_META_CAPTURE) != 0 ? VideoNodeKind::kMetadata : VideoNodeKind::kOther;
}

std::uint32_t V4l2Device::bufferType() const {
  if (kind() == VideoNodeKind::kMetadata) return V4L2_BUF_TYPE_META_CAPTURE;
  const bool isSinglePlanar = (capabilities() & V4L2_CAP_VIDEO_CAPTURE) != 0;
  return isSinglePlanar ? V4L2_BUF_TYPE_VIDEO_CAPTURE : V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE;
}

bool V4l2Device::lockExclusive(DiagnosticErrorPtr* error) {
  const int result = kernel_->lock(descriptor_);
  if (result >= 0) return true;
  if (result == -EWOULDBLOCK) {
    failLinux(error, LinuxErrorCode::kBusy, path_ + " is in use by another quazor process.");
  } else {
    failSystemCall(error, "flock", path_, -result);
  }
  return false;
}

std::vector<VideoFormat> V4l2Device::formats(std::uint32_t mediaBusCode) const {
  std::vector<VideoFormat> formats;
  const bool isCamera = kind() == VideoNodeKind::kCamera;
  std::uint32_t left = kMaxModes;
  for (std::uint32_t index = 0; index < kMaxItems; ++index) {
    v4l2_fmtdesc description{};
    description.index = index;
    description.type = bufferType();
    description.mbus_code = mediaBusCode;
    if (call(VIDIOC_ENUM_FMT, &description) != 0) break;
    VideoFormat format{index, fourccText(description.pixelformat), fixedText(description.description), {}};
    if (isCamera) format.sizes = sizesOf(description.pixelformat, left);
    formats.push_back(std::move(format));
  }
  return formats;
}

std::vector<FrameSize> V4l2Device::sizesOf(std::uint32_t fourcc, std::uint32_t& left) const {
  std::vector<FrameSize> sizes;
  for (std::uint32_t index = 0; left > 0; ++index, --left) {
    v4l2_frmsizeenum entry{};
    entry.index = index;
    entry.pixel_format = fourcc;
    if (call(VIDIOC_ENUM_FRAMESIZES, &entry) != 0) break;
    const bool discrete = entry.type == V4L2_FRMSIZE_TYPE_DISCRETE;
    FrameSize size;
    size.width = discrete ? entry.discrete.width : entry.stepwise.min_width;
    size.height = discrete ? entry.discrete.height : entry.stepwise.min_height;
    size.maximumWidth = discrete ? size.width : entry.stepwise.max_width;
    size.maximumHeight = discrete ? size.height : entry.stepwise.max_height;
    listIntervals(fourcc, size, left);
    sizes.push_back(std::move(size));
    if (!discrete || left == 0) break;  // a range is the only entry
  }
  return sizes;
}

// For a range of sizes, lists the intervals of the smallest size.
void V4l2Device::listIntervals(std::uint32_t fourcc, FrameSize& size, std::uint32_t& left) const {
  for (std::uint32_t index = 0; left > 0; ++index, --left) {
    v4l2_frmivalenum entry{};
    entry.index = index;
    entry.pixel_format = fourcc;
    entry.width = size.width;
    entry.height = size.height;
    if (call(VIDIOC_ENUM_FRAMEINTERVALS, &entry) != 0) return;
    if (entry.type == V4L2_FRMIVAL_TYPE_DISCRETE) {
      size.intervals.push_back(intervalOf(entry.discrete));
      continue;
    }
    size.intervals = {intervalOf(entry.stepwise.min), intervalOf(entry.stepwise.max)};
    size.anyIntervalBetween = true;
    return;
  }
}

// The driver's number for the format; nothing and an error if it has no such format.
std::optional<std::uint32_t> V4l2Device::pixelFormatOf(const VideoMode& mode, DiagnosticErrorPtr* error) const {
  std::string offered;
  for (std::uint32_t index = 0; index < kMaxItems; ++index) {
    v4l2_fmtdesc description{};
    description.index = index;
    description.type = bufferType();
    const int result = call(VIDIOC_ENUM_FMT, &description);
    if (result == EINVAL) break;
    if (result != 0) {
      failSystemCall(error, "VIDIOC_ENUM_FMT", path_, result);
      return std::nullopt;
    }
    const std::string fourcc = fourccText(description.pixelformat);
    if (mode.fourcc ? *mode.fourcc == fourcc : mode.index == index) return description.pixelformat;
    offered += (offered.empty() ? "" : ", ") + fourcc;
  }
  if (offered.empty()) offered = "none";
  if (mode.fourcc) {
    refuseLinux(error, LinuxErrorCode::kNotSupported,
                "%@ has no format \"%@\", to which the binding maps format index %@; its formats are %@.", path_,
                *mode.fourcc, mode.index, offered);
  } else {
    refuseLinux(error, LinuxErrorCode::kNotSupported,
                "%@ has no format with index %@; the binding can map the index to one of its formats: %@.", path_,
                mode.index, offered);
  }
  return std::nullopt;
}

bool V4l2Device::setFormat(const VideoMode& mode, DiagnosticErrorPtr* error) {
  const std::optional<std::uint32_t> fourcc = pixelFormatOf(mode, error);
  if (!fourcc) return false;
  const PictureFormat picture{mode.width, mode.height, *fourcc};
  v4l2_format wanted = formatOf(picture, bufferType());
  // VIDIOC_S_FMT may return another format than VIDIOC_TRY_FMT if other settings of the device changed in between.
  const auto isGranted = [&](const v4l2_format& format) {
    const PictureFormat given = pictureOf(format);
    if (given == picture) return true;
    return refuseLinux(error, LinuxErrorCode::kNotSupported,
                       "%@: format %@ (%@) of %@ x %@ is not available; the driver offers %@ of %@ x %@.", path_,
                       mode.index, fourccText(*fourcc), mode.width, mode.height, fourccText(given.fourcc), given.width,
                       given.height);
  };
  v4l2_format offered = wanted;
  return call(VIDIOC_TRY_FMT, "VIDIOC_TRY_FMT", &offered, error) && isGranted(offered) &&
         call(VIDIOC_S_FMT, "VIDIOC_S_FMT", &wanted, error) && isGranted(wanted);
}

std::optional<MetadataFormat> V4l2Device::metadataFormat() const {
  v4l2_format format{};
  format.type = V4L2_BUF_TYPE_META_CAPTURE;
  if (call(VIDIOC_G_FMT, &format) != 0) return std::nullopt;
  return MetadataFormat{fourccText(format.fmt.meta.dataformat), format.fmt.meta.buffersize};
}

std::optional<FrameInterval> V4l2Device::interval(DiagnosticErrorPtr* error) const {
  v4l2_streamparm parameters{};
  parameters.type = bufferType();
  if (!call(VIDIOC_G_PARM, "VIDIOC_G_PARM", &parameters, error)) return std::nullopt;
  return intervalOf(parameters.parm.capture.timeperframe);
}

int V4l2Device::setInterval(FrameInterval* interval) {
  v4l2_streamparm parameters{};
  parameters.type = bufferType();
  parameters.parm.capture.timeperframe = {interval->numerator, interval->denominator};
  const int result = call(VIDIOC_S_PARM, &parameters);
  if (result == 0) *interval = intervalOf(parameters.parm.capture.timeperframe);
  return result;
}

int V4l2Device::query(std::uint32_t id, v4l2_query_ext_ctrl* query) const {
  *query = {};
  query->id = id;
  return call(VIDIOC_QUERY_EXT_CTRL, query);
}

void V4l2Device::add(const v4l2_query_ext_ctrl& query) {
  const bool isHeading = query.type == V4L2_CTRL_TYPE_CTRL_CLASS;
  if (!isHeading && (query.flags & V4L2_CTRL_FLAG_DISABLED) == 0) controls_.push_back(controlOf(query));
}

// Only EINVAL ends the list, and not even that if a control that this backend needs comes later. Any other error
// concerns one control, whose id the driver then does not report.
void V4l2Device::listControls() {
  std::uint32_t last = 0;
  for (std::uint32_t i = 0; i < kMaxItems; ++i) {
    v4l2_query_ext_ctrl found{};
    const int result = query(last | V4L2_CTRL_FLAG_NEXT_CTRL, &found);
    if (result == ENOTTY || (result == EINVAL && !hasNeededControlAfter(last))) return;
    if (result == EINVAL) undescribed_.push_back({last, result, true});
    if (result == 0) {
      if (found.id <= last) return;  // the driver would repeat its list
      add(found);
      last = found.id;
      continue;
    }
    const std::optional<std::uint32_t> next = nextExistingControl(last);
    if (!next) {
      if (result != EINVAL) undescribed_.push_back({last, result, true});
      return;
    }
    const int problem = query(*next, &found);
    if (problem == 0) {
      add(found);
    } else {
      undescribed_.push_back({*next, problem});
    }
    last = *next;
  }
}

bool V4l2Device::hasNeededControlAfter(std::uint32_t last) const {
  constexpr std::array kNeeded{V4L2_CID_EXPOSURE_AUTO, V4L2_CID_EXPOSURE_ABSOLUTE, V4L2_CID_VBLANK, V4L2_CID_HBLANK,
                               V4L2_CID_PIXEL_RATE};
  return std::ranges::any_of(kNeeded, [&](std::uint32_t id) {
    v4l2_query_ext_ctrl found{};
    return id > last && query(id, &found) != EINVAL;
  });
}

// The first control after `last`, found by asking for each id of the known classes: a control that exists but cannot be
// described fails with another error than EINVAL.
std::optional<std::uint32_t> V4l2Device::nextExistingControl(std::uint32_t last) const {
  constexpr std::uint32_t kFirstClass = V4L2_CTRL_CLASS_USER;
  constexpr std::uint32_t kLastClass = V4L2_CTRL_CLASS_USER + 0x1f0000;  // there are 14 classes in Linux 6.1
  constexpr std::uint32_t kFirstOfClass = 0x900;
  constexpr std::uint32_t kLastOfClass = 0x1fff;  // drivers have their own controls from 0x1000 on
  for (std::uint32_t group = kFirstClass; group <= kLastClass; group += 0x10000) {
    for (std::uint32_t id = std::max(group + kFirstOfClass, last + 1); id <= group + kLastOfClass; ++id) {
      v4l2_query_ext_ctrl found{};
      const int result = query(id, &found);
      if (result == ENODEV) return std::nullopt;
      if (result != EINVAL) return id;
    }
  }
  return std::nullopt;
}

std::string V4l2Device::undescribedControls() const {
  std::string text;
  for (const UndescribedControl& one : undescribed_) {
    text += (text.empty() ? "" : ", ") + std::string(one.endsList ? "after " : "") + hexadecimalNumber(one.id, 8) +
            " (" + errorName(one.problem) + ")";
  }
  return text;
}

bool V4l2Device::mayHaveControl(std::uint32_t id) const {
  return controlOfId(id) != nullptr || std::ranges::any_of(undescribed_, [id](const UndescribedControl& one) {
           return one.endsList ? one.id < id : one.id == id;
         });
}

std::optional<VideoControl> V4l2Device::describe(std::uint32_t id, DiagnosticErrorPtr* error) const {
  v4l2_query_ext_ctrl found{};
  const int result = query(id, &found);
  if (result == 0) return controlOf(found);
  failSystemCall(error, "VIDIOC_QUERY_EXT_CTRL of " + hexadecimalNumber(id, 8), path_, result);
  return std::nullopt;
}

const VideoControl* V4l2Device::findControl(std::string_view name) const {
  const auto found = std::ranges::find(controls_, name, &VideoControl::name);
  if (found != controls_.end()) return &*found;
  const std::optional<std::uint32_t> id = controlIdOf(name);
  return id ? controlOfId(*id) : nullptr;
}

const VideoControl* V4l2Device::control(std::string_view name, DiagnosticErrorPtr* error) const {
  if (const VideoControl* const found = findControl(name)) return found;
  const std::string undescribed = undescribedControls();
  refuseLinux(error, LinuxErrorCode::kNotSupported, "%@ has no control \"%@\"%@.", path_, name,
              undescribed.empty() ? "" : "; its driver does not describe the controls " + undescribed);
  return nullptr;
}

const VideoControl* V4l2Device::controlOfId(std::uint32_t id) const {
  const auto found = std::ranges::find(controls_, id, &VideoControl::id);
  return found == controls_.end() ? nullptr : &*found;
}

std::optional<std::int64_t> V4l2Device::read(const VideoControl& control, DiagnosticErrorPtr* error) const {
  v4l2_ext_control entry{};
  entry.id = control.id;
  v4l2_ext_controls list = listOfOne(entry);
  const int result = call(VIDIOC_G_EXT_CTRLS, &list);
  if (result != 0) {
    failSystemCall(error, "VIDIOC_G_EXT_CTRLS of \"" + control.name + "\"", path_, result);
    return std::nullopt;
  }
  return is64Bit(control) ? std::int64_t{entry.value64} : std::int64_t{entry.value};
}

bool V4l2Device::set(const VideoControl& control, std::int64_t value, DiagnosticErrorPtr* error) {
  if (!takes(control, value)) {
    failLinux(error, LinuxErrorCode::kBadValue,
              formatMessage("%@: the control \"%@\" accepts %@ to %@, not %@.", path_, control.name, control.minimum,
                            control.maximum, value));
    return false;
  }
  v4l2_ext_control entry{};
  entry.id = control.id;
  if (is64Bit(control)) {
    entry.value64 = value;
  } else {
    entry.value = static_cast<std::int32_t>(value);
  }
  v4l2_ext_controls list = listOfOne(entry);
  const int result = call(VIDIOC_S_EXT_CTRLS, &list);
  if (result != 0) {
    failSystemCall(error, "VIDIOC_S_EXT_CTRLS of \"" + control.name + "\"", path_, result);
    return false;
  }
  const std::int64_t made = is64Bit(control) ? std::int64_t{entry.value64} : std::int64_t{entry.value};
  if (made == value || !keepsItsValue(control)) return true;
  return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: the driver set the control \"%@\" to %@ instead of %@.",
                     path_, control.name, made, value);
}

bool V4l2Device::set(const std::vector<ControlSetting>& settings, DiagnosticErrorPtr* error) {
  return std::ranges::all_of(settings, [&](const ControlSetting& setting) {
    const VideoControl* const one = control(setting.control, error);
    return one != nullptr && set(*one, setting.value, error);
  });
}

int V4l2Device::call(unsigned long request, void* argument) const {
  const int result = kernel_->ioctl(descriptor_, request, argument);
  return result < 0 ? -result : 0;
}

bool V4l2Device::call(unsigned long request, std::string_view name, void* argument, DiagnosticErrorPtr* error) const {
  const int result = call(request, argument);
  if (result != 0) failSystemCall(error, name, path_, result, hintFor(result));
  return result == 0;
}

// What an error number means that usually says something else.
std::string_view V4l2Device::hintFor(int number) const {
  const bool isUsb = fixedText(capability_.bus_info).starts_with("usb-");
  if (!isUsb && (number == EPIPE || number == ENOLINK)) {
    return "the links and pads on the camera's path do not fit together; \"media\" of the camera in the binding sets "
           "them.";
  }
  if (number != ENOSPC || !isUsb) return {};
  return "the USB bus has too little bandwidth left for this stream. Use a smaller size, a lower rate, a compressed "
         "format or another bus.";
}

}  // namespace quazor
