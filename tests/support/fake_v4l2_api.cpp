#include "tests/support/fake_v4l2_api.h"

#include <stdlib.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iomanip>
#include <stdexcept>
#include <utility>

namespace quazor {
namespace {

template <class Field>
void copyText(Field& field, const std::string& text) {
  std::memcpy(field, text.data(), std::min(text.size(), sizeof field));
}

const FakeSize* sizeOf(const FakeNode& node, std::uint32_t fourcc, std::uint32_t width, std::uint32_t height) {
  for (const FakeFormat& format : node.formats) {
    if (format.fourcc != fourcc) continue;
    for (const FakeSize& size : format.sizes) {
      if (size.width == width && size.height == height) return &size;
    }
  }
  return nullptr;
}

}  // namespace

class FakeV4l2Api::Guard final : public ControlGuard {
 public:
  Guard(FakeV4l2Api& kernel, FakeNode& node, std::vector<ControlValue> off)
      : kernel_(kernel), node_(node), off_(std::move(off)) {}
  ~Guard() override {
    const std::lock_guard lock(kernel_.mutex_);
    --kernel_.guards_;
    for (FakeControl& control : node_.controls) {
      for (const ControlValue& value : off_) {
        if (value.control == control.id) control.value = value.value;
      }
    }
    node_.history.emplace_back("guard ended");
  }

 private:
  FakeV4l2Api& kernel_;
  FakeNode& node_;
  const std::vector<ControlValue> off_;
};

FakeV4l2Api::FakeV4l2Api() {
  std::string folder = (std::filesystem::temp_directory_path() / "fake-video-XXXXXX").string();
  if (::mkdtemp(folder.data()) == nullptr) throw std::runtime_error("no directory for the fake kernel");
  roots_ = {std::filesystem::path(folder) / "sys", std::filesystem::path(folder) / "dev"};
}

FakeV4l2Api::~FakeV4l2Api() { std::filesystem::remove_all(roots_.sysfs.parent_path()); }

std::string FakeV4l2Api::add(int number, FakeNode node) {
  const std::string name = "video" + std::to_string(number);
  const std::filesystem::path folder = roots_.sysfs / "class" / "video4linux" / name;
  std::filesystem::remove_all(folder);
  std::filesystem::create_directories(folder);
  std::ofstream(folder / "name") << node.card << " node\n";
  if (!node.device.empty()) {
    const std::filesystem::path device = roots_.sysfs / "devices" / node.device;
    std::filesystem::create_directories(device);
    if (node.usbInterface) {
      std::ofstream(device / "bInterfaceNumber")
          << std::hex << std::setfill('0') << std::setw(2) << *node.usbInterface << "\n";
    }
    std::filesystem::create_directory_symlink(device, folder / "device");
  }
  makeDeviceFile(name, static_cast<std::uint32_t>(number));
  node.path = (roots_.dev / name).string();
  const std::lock_guard lock(mutex_);
  return nodes_.insert_or_assign(node.path, node).first->first;
}

void FakeV4l2Api::failNext(const std::string& path, unsigned long request, int number, int times, int after) {
  const std::lock_guard lock(mutex_);
  faults_[{path, request}] = {number, times, after};
}

bool FakeV4l2Api::faulty(const FakeNode& node, unsigned long request, int& number) {
  const auto found = faults_.find({node.path, request});
  if (found == faults_.end()) return false;
  Fault& fault = found->second;
  if (fault.after > 0) {
    --fault.after;
    return false;
  }
  number = fault.number;
  return fault.times-- > 0;
}

void FakeV4l2Api::produceLocked(FakeNode& node, std::uint32_t flags) {
  const std::chrono::nanoseconds timestamp = now_ + node.stampedAhead;
  fill(node, timestamp, flags);
  if (!node.metadataNode.empty()) {
    FakeNode& metadata = nodes_.at(node.metadataNode);
    metadata.metadata = node.metadata;
    fill(metadata, timestamp + node.metadataStampedAhead, 0);
  }
  changed_.notify_all();
}

void FakeV4l2Api::produce(const std::string& path, std::uint32_t flags) {
  const std::lock_guard lock(mutex_);
  produceLocked(nodes_.at(path), flags);
}

void FakeV4l2Api::skip(const std::string& path, std::uint32_t frames) {
  const std::lock_guard lock(mutex_);
  nodes_.at(path).sequence += frames;
}

void FakeV4l2Api::disconnect(const std::string& path) {
  const std::lock_guard lock(mutex_);
  nodes_.at(path).gone = nodes_.at(path).opened > 0;
  changed_.notify_all();
}

void FakeV4l2Api::breakStream(const std::string& path) {
  const std::lock_guard lock(mutex_);
  nodes_.at(path).broken = true;
  changed_.notify_all();
}

void FakeV4l2Api::passTime(std::chrono::nanoseconds duration) {
  std::unique_lock lock(mutex_);
  const std::chrono::nanoseconds end = now_ + duration;
  for (;;) {
    FakeNode* next = nullptr;
    for (auto& [path, node] : nodes_) {
      const bool runs = node.streaming && node.delivers && !isMetadata(node) && node.nextFrame < end;
      if (runs && (next == nullptr || node.nextFrame < next->nextFrame)) next = &node;
    }
    if (next == nullptr) break;
    now_ = std::max(now_, next->nextFrame);
    next->nextFrame +=
        std::chrono::nanoseconds(std::int64_t{1'000'000'000} * next->interval.numerator / next->interval.denominator);
    produceLocked(*next, 0);
    if (!changed_.wait_for(lock, std::chrono::seconds(5), [this] { return isSettled(); })) return;
  }
  now_ = end;
  changed_.notify_all();
}

bool FakeV4l2Api::isSettled() {
  for (const auto& [path, node] : nodes_) {
    if (node.streaming && !node.gone && !node.filled.empty()) return false;
  }
  const bool isAwake = std::ranges::any_of(events_, [](const auto& event) { return event.second; });
  return !isAwake && polling_ == static_cast<int>(events_.size());
}

bool FakeV4l2Api::settle() {
  std::unique_lock lock(mutex_);
  return changed_.wait_for(lock, std::chrono::seconds(5), [this] { return isSettled(); });
}

bool FakeV4l2Api::isIdle() {
  const std::lock_guard lock(mutex_);
  const bool nodesAreIdle = std::ranges::all_of(nodes_, [](const auto& entry) {
    const FakeNode& node = entry.second;
    return node.owner < 0 && node.buffers == 0 && node.mapped == 0 && !node.streaming && node.opened == 0 &&
           node.lockedBy < 0;
  });
  return nodesAreIdle && guards_ == 0 && descriptors_.empty() && mappings_.empty() && events_.empty();
}

int FakeV4l2Api::guards() {
  const std::lock_guard lock(mutex_);
  return guards_;
}

int FakeV4l2Api::open(const std::string& path) {
  if (beforeOpen) beforeOpen(path);
  const std::lock_guard lock(mutex_);
  const auto found = nodes_.find(path);
  if (found == nodes_.end()) return -ENOENT;
  FakeNode& node = found->second;
  if (node.openProblem != 0) return -node.openProblem;
  if (node.gone) return -ENODEV;
  ++node.opened;
  descriptors_[++lastDescriptor_] = path;
  return lastDescriptor_;
}

int FakeV4l2Api::openForQueries(const std::string& path) {
  const int descriptor = open(path);
  const std::lock_guard lock(mutex_);
  if (descriptor >= 0) ++nodes_.at(path).queried;
  return descriptor;
}

void FakeV4l2Api::close(int descriptor) {
  const std::lock_guard lock(mutex_);
  if (events_.erase(descriptor) > 0) return;
  FakeNode& node = nodes_.at(descriptors_.at(descriptor));
  descriptors_.erase(descriptor);
  tried_.erase(descriptor);
  if (node.lockedBy == descriptor) node.lockedBy = -1;
  if (node.owner == descriptor) {  // like the kernel; mapped buffers remain in use
    node.owner = -1;
    node.streaming = false;
    if (node.mapped == 0) node.buffers = 0;
  }
  if (--node.opened == 0) node.gone = false;
  changed_.notify_all();
}

int FakeV4l2Api::lock(int descriptor) {
  const std::lock_guard guard(mutex_);
  FakeNode& node = nodes_.at(descriptors_.at(descriptor));
  int number = 0;
  if (faulty(node, 0, number)) return -number;
  if (node.lockedBy >= 0 && node.lockedBy != descriptor) return -EWOULDBLOCK;
  node.lockedBy = descriptor;
  return 0;
}

int FakeV4l2Api::ioctl(int descriptor, unsigned long request, void* argument) {
  if (beforeCall) beforeCall(request);
  const std::lock_guard lock(mutex_);
  FakeNode& node = nodes_.at(descriptors_.at(descriptor));
  if (node.gone) return -ENODEV;
  int number = 0;
  if (faulty(node, request, number)) return -number;
  const int result = call(node, descriptor, request, argument);
  if (result == 0 && afterCall) afterCall(request, argument);
  changed_.notify_all();
  return -result;
}

// Returns 0 or an error number.
int FakeV4l2Api::call(FakeNode& node, int descriptor, unsigned long request, void* argument) {
  if (node.media) return mediaCall(node, request, argument);
  switch (request) {
    case VIDIOC_QUERYCAP: {
      if (node.isSubdevice) return ENOTTY;
      auto& capability = *static_cast<v4l2_capability*>(argument);
      copyText(capability.driver, node.driver);
      copyText(capability.card, node.card);
      copyText(capability.bus_info, node.bus);
      capability.capabilities = node.capabilities | V4L2_CAP_DEVICE_CAPS | V4L2_CAP_VIDEO_OUTPUT;
      capability.device_caps = node.capabilities;
      return 0;
    }
    case VIDIOC_G_FMT:
      if (!isMetadata(node)) return ENOTTY;
      return format(node, false, *static_cast<v4l2_format*>(argument));
    case VIDIOC_TRY_FMT:
    case VIDIOC_S_FMT: return format(node, request == VIDIOC_S_FMT, *static_cast<v4l2_format*>(argument));
    case VIDIOC_G_PARM:
    case VIDIOC_S_PARM: {
      if (!node.hasIntervals) return ENOTTY;
      auto& parameters = *static_cast<v4l2_streamparm*>(argument);
      if (parameters.type != bufferTypeOf(node)) return EINVAL;
      v4l2_fract& fraction = parameters.parm.capture.timeperframe;
      const FakeSize* size = sizeOf(node, node.format.pixelformat, node.format.width, node.format.height);
      if (request == VIDIOC_S_PARM && size != nullptr) {
        const double wanted = static_cast<double>(fraction.denominator) / fraction.numerator;
        node.interval = *std::ranges::min_element(
            size->intervals, {}, [wanted](FrameInterval one) { return std::abs(one.framesPerSecond() - wanted); });
      }
      fraction = {node.interval.numerator, node.interval.denominator};
      return 0;
    }
    case VIDIOC_REQBUFS: return requestBuffers(node, descriptor, *static_cast<v4l2_requestbuffers*>(argument));
    case VIDIOC_QUERYBUF: return queryBuffer(node, *static_cast<v4l2_buffer*>(argument));
    case VIDIOC_QBUF: return queue(node, *static_cast<v4l2_buffer*>(argument));
    case VIDIOC_DQBUF: return dequeue(node, *static_cast<v4l2_buffer*>(argument));
    case VIDIOC_STREAMON:
      if (*static_cast<std::uint32_t*>(argument) != bufferTypeOf(node)) return EINVAL;
      if (const int problem = streamProblem(node)) return problem;
      node.streaming = true;
      node.sequence = node.firstSequence;
      node.nextFrame = now_;
      node.history.emplace_back("STREAMON");
      return 0;
    case VIDIOC_STREAMOFF:
      if (*static_cast<std::uint32_t*>(argument) != bufferTypeOf(node)) return EINVAL;
      node.streaming = node.broken = false;
      node.queued.clear();
      node.filled.clear();
      node.history.emplace_back("STREAMOFF");
      return 0;
    case VIDIOC_G_EXT_CTRLS:
    case VIDIOC_S_EXT_CTRLS:
      return control(node, request == VIDIOC_S_EXT_CTRLS, *static_cast<v4l2_ext_controls*>(argument));
    default:
      return node.isSubdevice && request != VIDIOC_QUERY_EXT_CTRL ? subdeviceCall(node, descriptor, request, argument)
                                                                  : enumerate(node, request, argument);
  }
}

int FakeV4l2Api::format(FakeNode& node, bool sets, v4l2_format& format) const {
  if (format.type != bufferTypeOf(node)) return EINVAL;
  if (isMetadata(node)) {
    format.fmt.meta = node.metadataFormat;
    return 0;
  }
  if (sets && node.buffers > 0) return EBUSY;
  const auto apply = [&](auto& wanted) {
    if (sizeOf(node, wanted.pixelformat, wanted.width, wanted.height) == nullptr) {
      wanted.width = node.formats.front().sizes.front().width;
      wanted.height = node.formats.front().sizes.front().height;
    }
    if (!sets) return;
    node.format.pixelformat = wanted.pixelformat;
    node.format.width = wanted.width;
    node.format.height = wanted.height;
  };
  isMultiplanar(node) ? apply(format.fmt.pix_mp) : apply(format.fmt.pix);
  return 0;
}

int FakeV4l2Api::enumerate(const FakeNode& node, unsigned long request, void* argument) const {
  if (request == VIDIOC_ENUM_FMT) {
    auto& description = *static_cast<v4l2_fmtdesc*>(argument);
    if (description.type != bufferTypeOf(node)) return EINVAL;
    std::uint32_t left = description.index;
    for (const FakeFormat& format : node.formats) {
      const bool isMeant = description.mbus_code == 0 || description.mbus_code == format.busCode;
      if (!isMeant || left-- > 0) continue;
      description.pixelformat = format.fourcc;
      copyText(description.description, format.description);
      return 0;
    }
    return EINVAL;
  }
  if (request == VIDIOC_ENUM_FRAMESIZES) {
    auto& entry = *static_cast<v4l2_frmsizeenum*>(argument);
    const auto format = std::ranges::find(node.formats, entry.pixel_format, &FakeFormat::fourcc);
    if (format == node.formats.end() || entry.index >= format->sizes.size()) return EINVAL;
    entry.type = V4L2_FRMSIZE_TYPE_DISCRETE;
    entry.discrete = {format->sizes[entry.index].width, format->sizes[entry.index].height};
    return 0;
  }
  if (request == VIDIOC_ENUM_FRAMEINTERVALS) {
    auto& entry = *static_cast<v4l2_frmivalenum*>(argument);
    const FakeSize* size = sizeOf(node, entry.pixel_format, entry.width, entry.height);
    if (size == nullptr || entry.index >= size->intervals.size()) return EINVAL;
    entry.type = V4L2_FRMIVAL_TYPE_DISCRETE;
    entry.discrete = {size->intervals[entry.index].numerator, size->intervals[entry.index].denominator};
    return 0;
  }
  if (request != VIDIOC_QUERY_EXT_CTRL) return ENOTTY;
  auto& query = *static_cast<v4l2_query_ext_ctrl*>(argument);
  const bool isNext = (query.id & V4L2_CTRL_FLAG_NEXT_CTRL) != 0;
  const std::uint32_t id = query.id & ~V4L2_CTRL_FLAG_NEXT_CTRL;
  const auto control =
      std::ranges::find_if(node.controls, [&](const FakeControl& one) { return isNext ? one.id > id : one.id == id; });
  if (control == node.controls.end()) return EINVAL;
  if (control->describeProblem != 0) return control->describeProblem;  // and the caller does not learn the id
  query = {};
  query.id = control->id;
  query.type = control->type;
  query.flags = control->flags;
  copyText(query.name, control->name);
  query.minimum = control->minimum;
  query.maximum = control->maximum;
  query.step = 1;
  query.default_value = control->value;
  return 0;
}

int FakeV4l2Api::control(FakeNode& node, bool sets, v4l2_ext_controls& list) {
  v4l2_ext_control& entry = list.controls[0];
  const auto control = std::ranges::find(node.controls, entry.id, &FakeControl::id);
  if (control == node.controls.end()) return EINVAL;
  const bool isWide = control->type == V4L2_CTRL_TYPE_INTEGER64;
  if (sets) {
    control->value = isWide ? std::int64_t{entry.value64} : std::int64_t{entry.value};
    if (control->stuck) control->value = *control->stuck;
    if (isWide) {
      entry.value64 = control->value;
    } else {
      entry.value = static_cast<std::int32_t>(control->value);
    }
    node.history.push_back(control->name + " = " + std::to_string(control->value));
  } else if (isWide) {
    entry.value64 = control->value;
  } else {
    entry.value = static_cast<std::int32_t>(control->value);
  }
  return 0;
}

std::unique_ptr<ControlGuard> FakeV4l2Api::guardControls(const std::string& path, int descriptor,
                                                         const std::vector<ControlValue>& off, int* number) {
  const std::lock_guard lock(mutex_);
  *number = descriptors_.at(descriptor) == path ? guardProblem : ENODEV;
  if (*number != 0) return nullptr;
  ++guards_;
  nodes_.at(path).history.emplace_back("guard began");
  return std::make_unique<Guard>(*this, nodes_.at(path), off);
}

FakeNode fakeCamera(const std::string& bus) {
  const std::vector<FakeSize> sizes{{640, 360, {{1, 5}, {1, 25}, {1, 30}, {1, 40}}}, {640, 480, {{1, 5}, {1, 25}}}};
  FakeNode node;
  node.bus = bus;
  node.formats = {{fakeCode('Y', 'U', 'Y', 'V'), "YUYV 4:2:2", sizes},
                  {fakeCode('G', 'R', 'E', 'Y'), "8-bit grey", sizes}};
  return node;
}

FakeNode fakeMultiplanarCamera(const std::string& bus) {
  FakeNode node = fakeCamera(bus);
  node.capabilities = V4L2_CAP_VIDEO_CAPTURE_MPLANE | V4L2_CAP_STREAMING;
  node.formats[0].fourcc = fakeCode('N', 'M', '1', '2');
  node.formats[1].fourcc = fakeCode('N', 'M', '1', '6');
  return node;
}

FakeNode fakeMetadata(const std::string& bus) {
  FakeNode node;
  node.bus = bus;
  node.capabilities = V4L2_CAP_META_CAPTURE | V4L2_CAP_STREAMING;
  return node;
}

}  // namespace quazor
