// V4l2Device: an open video device and the V4L2 calls of the capture service
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

// The format of a metadata node.
struct MetadataFormat {
  std::string fourcc;
  std::uint32_t bytes = 0;  // the size of its buffers
};

// What to set with V4l2Device::setFormat().
struct VideoMode {
  std::uint32_t index = 0;            // the FormatIndex, for messages; the driver's own index if there is no code
  std::optional<std::string> fourcc;  // the code of a format, as in VideoFormat
  std::uint32_t width = 0;
  std::uint32_t height = 0;
};

// Every failing call stores an error with the call, the device and the system's error.
//
// Thread: any; the only state is the list of controls, which open() reads.
class V4l2Device final {
 public:
  // Returns null and an error if the device cannot be opened or its driver does not respond.
  static std::shared_ptr<V4l2Device> open(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                          DiagnosticErrorPtr* error);
  // The same for the node that was found as `info`. Fails (kDeviceGone) if its path now belongs to another device.
  static std::shared_ptr<V4l2Device> open(std::shared_ptr<V4l2Api> kernel, const V4l2DeviceInfo& info,
                                          DiagnosticErrorPtr* error);
  // Opens a sub-device of a media controller, which has controls and no buffers.
  static std::shared_ptr<V4l2Device> openSubdevice(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                                   DiagnosticErrorPtr* error);
  // Opens the device only for queries, without a list of its controls.
  static std::shared_ptr<V4l2Device> inspect(std::shared_ptr<V4l2Api> kernel, const std::string& path,
                                             DiagnosticErrorPtr* error);
  V4l2Device(const V4l2Device&) = delete;
  V4l2Device& operator=(const V4l2Device&) = delete;
  ~V4l2Device();

  const std::string& path() const { return path_; }
  int descriptor() const { return descriptor_; }
  V4l2Api& kernel() const { return *kernel_; }
  const v4l2_capability& capability() const { return capability_; }
  // The capabilities of this node, not of the whole device: V4L2_CAP_...
  std::uint32_t capabilities() const;
  VideoNodeKind kind() const;
  // Of its buffers and formats: V4L2_BUF_TYPE_...
  std::uint32_t bufferType() const;
  // True if a buffer has several planes, each in memory of its own.
  bool isMultiplanar() const { return bufferType() == V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE; }

  // Locks the device for this descriptor, among all processes that use this lock; fails (kBusy) while another one holds
  // it.
  bool lockExclusive(DiagnosticErrorPtr* error);

  // The formats in the driver's order, with their known sizes and intervals. With the code of a media bus format, only
  // those that frames of it can have.
  std::vector<VideoFormat> formats(std::uint32_t mediaBusCode = 0) const;
  // Sets the format and frame size. Fails (kNotSupported), without changing anything, if the driver has no such format
  // or would use another size.
  bool setFormat(const VideoMode& mode, DiagnosticErrorPtr* error);
  // The format of a metadata node; nothing if the driver does not report it.
  std::optional<MetadataFormat> metadataFormat() const;
  // The current time between frames; nothing and an error if the driver cannot report it.
  std::optional<FrameInterval> interval(DiagnosticErrorPtr* error) const;
  // Requests an interval and changes it to the one that the driver has set. Returns 0 or the error number, which is
  // ENOTTY for a driver that sets no intervals.
  int setInterval(FrameInterval* interval);

  const std::vector<VideoControl>& controls() const { return controls_; }
  // The control with that name; null if there is none.
  const VideoControl* findControl(std::string_view name) const;
  // The same, with an error (kNotSupported) if there is none.
  const VideoControl* control(std::string_view name, DiagnosticErrorPtr* error) const;
  const VideoControl* controlOfId(std::uint32_t id) const;
  // The present description of a control: some ranges change with the format. Nothing and an error if there is none.
  std::optional<VideoControl> describe(std::uint32_t id, DiagnosticErrorPtr* error) const;
  // The controls that the driver failed to describe: "0x00980901 (EPIPE)"; empty if there is none.
  std::string undescribedControls() const;
  // False if the camera certainly lacks the control; true also for one that the driver failed to describe.
  bool mayHaveControl(std::uint32_t id) const;
  std::optional<std::int64_t> read(const VideoControl& control, DiagnosticErrorPtr* error) const;
  // Fails (kBadValue) if the value is out of the control's range, or if the driver sets another one.
  bool set(const VideoControl& control, std::int64_t value, DiagnosticErrorPtr* error);
  // Sets the controls in order until one fails.
  bool set(const std::vector<ControlSetting>& settings, DiagnosticErrorPtr* error);

  // 0 or the error number.
  int call(unsigned long request, void* argument) const;
  // The same, but returns false and an error on failure.
  bool call(unsigned long request, std::string_view name, void* argument, DiagnosticErrorPtr* error) const;

 private:
  V4l2Device(std::shared_ptr<V4l2Api> kernel, std::string path, int descriptor);
  static std::shared_ptr<V4l2Device> made(std::shared_ptr<V4l2Api> kernel, const std::string& path, int descriptor,
                                          DiagnosticErrorPtr* error);
  static std::shared_ptr<V4l2Device> opened(std::shared_ptr<V4l2Api> kernel, const std::string& path, int descriptor,
                                            DiagnosticErrorPtr* error);
  std::string_view hintFor(int number) const;

  struct UndescribedControl {
    std::uint32_t id = 0;  // of the last control before the end of the list, if `endsList`
    int problem = 0;       // an error number
    bool endsList = false;
  };

  void listControls();
  int query(std::uint32_t id, v4l2_query_ext_ctrl* query) const;
  void add(const v4l2_query_ext_ctrl& query);
  bool hasNeededControlAfter(std::uint32_t last) const;
  std::optional<std::uint32_t> nextExistingControl(std::uint32_t last) const;
  std::optional<std::uint32_t> pixelFormatOf(const VideoMode& mode, DiagnosticErrorPtr* error) const;
  std::vector<FrameSize> sizesOf(std::uint32_t fourcc, std::uint32_t& left) const;
  void listIntervals(std::uint32_t fourcc, FrameSize& size, std::uint32_t& left) const;

  const std::shared_ptr<V4l2Api> kernel_;
  const std::string path_;
  const int descriptor_;
  v4l2_capability capability_{};
  std::vector<VideoControl> controls_;
  std::vector<UndescribedControl> undescribed_;
};

// The text of a fixed-size kernel field. Its last character is the null, even if a driver forgets it: a binding has
// room for no more.
template <class Character, std::size_t kSize>
std::string fixedText(const Character (&field)[kSize]) {
  const auto* const text = reinterpret_cast<const char*>(field);
  return std::string(text, std::find(text, text + kSize - 1, '\0'));
}

// True if the value is in the control's range; buttons and bit masks have none.
bool takes(const VideoControl& control, std::int64_t value);
// The control and value in the form of V4l2Api.
ControlValue valueFor(const VideoControl& control, std::int64_t value);

// "1/30 s".
std::string textOf(FrameInterval interval);

}  // namespace quazor
