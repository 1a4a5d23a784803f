// MediaPipeline: the path of a camera's frames through its media controller.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/media/media_device.h"
#include "backends/linux/media/subdevice.h"
#include "contract/diagnostic_error.h"

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Thread: one at a time.
class MediaPipeline final {
 public:
  // Opens the media controller and prepares the path to `node`, the camera's video node. Returns null and an error on
  // failure; links that were changed until then are set back. Messages begin with `port`.
  static std::unique_ptr<MediaPipeline> open(MediaDevices& devices, const MediaBinding& binding,
                                             const std::string& port, const std::filesystem::path& node,
                                             DiagnosticErrorPtr* error);

  // Sets links and pads as the binding says, where they differ: another process may have changed them.
  bool prepare(DiagnosticErrorPtr* error);
  // Those whose controls the camera has: those on its path, from the video node to the sensor, those that belong to
  // them, and those that the binding names.
  const std::vector<std::shared_ptr<Subdevice>>& subdevices() const { return subdevices_; }

 private:
  MediaPipeline(std::shared_ptr<V4l2Api> kernel, MediaBinding binding, std::string port,
                std::shared_ptr<MediaDevice> device);
  std::shared_ptr<Subdevice> subdevice(const MediaEntity& entity, DiagnosticErrorPtr* error);
  bool findSubdevices(const std::filesystem::path& node, DiagnosticErrorPtr* error);

  const std::shared_ptr<V4l2Api> kernel_;
  const MediaBinding binding_;
  const std::string port_;
  const std::shared_ptr<MediaDevice> device_;
  std::vector<std::shared_ptr<Subdevice>> opened_;
  std::vector<std::shared_ptr<Subdevice>> subdevices_;
};

}  // namespace quazor
