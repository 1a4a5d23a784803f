// V4l2Device: one opened video device, with the calls of V4L2 that the capture service makes
// (https://docs.kernel.org/userspace-api/media/v4l/v4l2.html).
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "contract/diagnostic_error.h"

#include <linux/videodev2.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Every call that fails stores an error that names the call, the device and the system's error.
//
// Thread: any; its calls keep nothing but the list of controls, which opening reads.
class V4l2Device final {
 public:
  // Null, and an error, when the device cannot be opened or its driver does not answer.
  static std::shared_ptr<V4l2Device> open(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                          DiagnosticErrorPtr* error);
  V4l2Device(const V4l2Device&) = delete;
  V4l2Device& operator=(const V4l2Device&) = delete;
  ~V4l2Device();

  const std::string& path() const { return path_; }
  int descriptor() const { return descriptor_; }
  V4l2Api& kernel() const { return *kernel_; }
  const v4l2_capability& capability() const { return capability_; }
  // What this node can do, not its whole device: V4L2_CAP_...
  std::uint32_t capabilities() const;
  VideoNodeKind kind() const;

  // Takes the device for this descriptor alone, among all processes that ask for it in this way; refused (kBusy) while
  // another has it.
  bool lockExclusive(DiagnosticErrorPtr* error);

  // The formats, in the driver's order, with what is known of their sizes and intervals.
  std::vector<VideoFormat> formats() const;
  // The format of that index with that frame size. Refused (kNotSupported) when the driver would use another size, and
  // for an index that it does not have; nothing changes then.
  bool setFormat(std::uint32_t index, std::uint32_t width, std::uint32_t height, DiagnosticErrorPtr* error);
  // The time between frames that the driver is set to; nothing, and an error, when it cannot tell.
  std::optional<FrameInterval> interval(DiagnosticErrorPtr* error) const;
  // Asks for an interval; returns what the driver made of it, which may be another.
  std::optional<FrameInterval> setInterval(FrameInterval wanted, DiagnosticErrorPtr* error);

  const std::vector<VideoControl>& controls() const { return controls_; }
  // The control of that name; null, and an error (kNotSupported), when there is none.
  const VideoControl* control(std::string_view name, DiagnosticErrorPtr* error) const;
  const VideoControl* controlOfId(std::uint32_t id) const;
  std::optional<std::int64_t> read(const VideoControl& control, DiagnosticErrorPtr* error) const;
  // Refused (kBadValue) when the value is out of the control's range.
  bool set(const VideoControl& control, std::int64_t value, DiagnosticErrorPtr* error);
  // The controls by their names, in order, until one fails.
  bool set(const std::vector<ControlSetting>& settings, DiagnosticErrorPtr* error);

  // 0 or the error number.
  int call(unsigned long request, void* argument) const;
  // The same, and false with an error when it fails.
  bool call(unsigned long request, std::string_view name, void* argument, DiagnosticErrorPtr* error) const;

 private:
  V4l2Device(std::shared_ptr<V4l2Api> kernel, std::string path, int descriptor);

  void listControls();
  std::vector<FrameSize> sizesOf(std::uint32_t code) const;
  void listIntervals(std::uint32_t code, FrameSize& size) const;

  const std::shared_ptr<V4l2Api> kernel_;
  const std::string path_;
  const int descriptor_;
  v4l2_capability capability_{};
  std::vector<VideoControl> controls_;
};

// The text of a field of the kernel, which a null character ends only where it is shorter than the field.
template <class Character, std::size_t kSize>
std::string fixedText(const Character (&field)[kSize]) {
  const auto* const text = reinterpret_cast<const char*>(field);
  return std::string(text, std::find(text, text + kSize, '\0'));
}

// Whether the value is in the control's range; buttons and sets of bits have none.
bool takes(const VideoControl& control, std::int64_t value);
// A control and the value to set, for V4l2Api.
ControlValue valueFor(const VideoControl& control, std::int64_t value);

// "1/30 s".
std::string textOf(FrameInterval interval);

}  // namespace quazor
