// Subdevice: an open sub-device of a media controller, such as a sensor, a scaler or a flash
// (https://docs.kernel.org/userspace-api/media/v4l/dev-subdev.html).
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/media/media_graph.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/diagnostic_error.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// Every failing call stores an error with the call, the entity and the pad.
//
// Thread: any.
class Subdevice final {
 public:
  // Returns null and an error if the entity has no device file, or it cannot be opened. Messages begin with `purpose`.
  static std::shared_ptr<Subdevice> open(std::shared_ptr<V4l2Api> kernel, const MediaEntity& entity,
                                         const std::string& purpose, DiagnosticErrorPtr* error);

  const MediaEntity& entity() const { return entity_; }
  // For its controls.
  const std::shared_ptr<V4l2Device>& device() const { return device_; }

  // Makes the settings of a pad that differ from what they are. Fails (kNotSupported) if there is no such pad, or if
  // the driver sets something else.
  bool apply(const PadBinding& wanted, const std::string& purpose, DiagnosticErrorPtr* error);
  // The present format of a pad; nothing and an error if it cannot be read.
  std::optional<PadFormat> format(std::uint32_t pad, DiagnosticErrorPtr* error) const;

  // What the driver would set, for this object only: nothing changes for others. Nothing if it fails.
  std::optional<PadFormat> tryFormat(std::uint32_t pad, const PadFormat& wanted) const;
  std::optional<PadFormat> triedFormat(std::uint32_t pad) const;
  // The format codes of a pad, in the driver's order; empty if it does not report them.
  std::vector<std::uint32_t> codes(std::uint32_t pad) const;

 private:
  Subdevice(MediaEntity entity, std::shared_ptr<V4l2Device> device);
  std::string callText(std::string_view call, std::uint32_t pad) const;
  bool setFormat(std::uint32_t pad, const PadFormat& wanted, const std::string& purpose, DiagnosticErrorPtr* error);
  bool setCrop(std::uint32_t pad, const FrameArea& wanted, const std::string& purpose, DiagnosticErrorPtr* error);
  bool setInterval(std::uint32_t pad, FrameInterval wanted, const std::string& purpose, DiagnosticErrorPtr* error);

  const MediaEntity entity_;
  const std::shared_ptr<V4l2Device> device_;
};

// "SBGGR8_1X8 of 640 x 480".
std::string textOf(const PadFormat& format);

}  // namespace quazor
