// CameraControls: the controls of a camera, which are those of its video node and of its sub-devices.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/media/subdevice.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/diagnostic_error.h"

#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A control and the device that has it.
struct CameraControl {
  std::shared_ptr<V4l2Device> device;
  VideoControl control;

  std::optional<std::int64_t> read(DiagnosticErrorPtr* error) const { return device->read(control, error); }
  bool set(std::int64_t value, DiagnosticErrorPtr* error) const { return device->set(control, value, error); }
};

// A control is named by its name or number, or after the name of its entity: "imx219 4-0010:Exposure". Without an
// entity, the video node comes first; of the sub-devices, only one may have it.
//
// Thread: any.
class CameraControls final {
 public:
  explicit CameraControls(std::shared_ptr<V4l2Device> node, std::vector<std::shared_ptr<Subdevice>> subdevices = {});

  // Nothing and an error if there is no such control (kNotSupported), or if several sub-devices have it (kAmbiguous).
  std::optional<CameraControl> control(std::string_view name, DiagnosticErrorPtr* error) const;
  // Of the first device that has it; nothing if there is none.
  std::optional<CameraControl> controlOfId(std::uint32_t id) const;
  // The first device that has all of these controls; null if there is none.
  std::shared_ptr<V4l2Device> deviceWith(std::initializer_list<std::uint32_t> ids) const;
  // The sub-device of that device; null if it is the video node.
  const Subdevice* subdeviceOf(const V4l2Device& device) const;
  // Sets the controls in order until one fails.
  bool set(const std::vector<ControlSetting>& settings, DiagnosticErrorPtr* error) const;

  // As V4l2Device has them, for all devices.
  std::string undescribedControls() const;
  bool mayHaveControl(std::uint32_t id) const;

 private:
  std::vector<std::shared_ptr<V4l2Device>> devices() const;

  const std::shared_ptr<V4l2Device> node_;
  const std::vector<std::shared_ptr<Subdevice>> subdevices_;
};

}  // namespace quazor
