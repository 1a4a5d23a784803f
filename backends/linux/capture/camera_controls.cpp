#include "backends/linux/capture/camera_controls.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <utility>

namespace quazor {

CameraControls::CameraControls(std::shared_ptr<V4l2Device> node, std::vector<std::shared_ptr<Subdevice>> subdevices)
    : node_(std::move(node)), subdevices_(std::move(subdevices)) {}

std::vector<std::shared_ptr<V4l2Device>> CameraControls::devices() const {
  std::vector<std::shared_ptr<V4l2Device>> devices{node_};
  for (const auto& subdevice : subdevices_) devices.push_back(subdevice->device());
  return devices;
}

std::optional<CameraControl> CameraControls::control(std::string_view name, DiagnosticErrorPtr* error) const {
  if (subdevices_.empty()) {
    const VideoControl* const found = node_->control(name, error);
    return found == nullptr ? std::nullopt : std::optional(CameraControl{node_, *found});
  }
  if (const VideoControl* const found = node_->findControl(name)) return CameraControl{node_, *found};
  std::vector<CameraControl> all;
  std::string entities;
  std::string having;
  for (const auto& subdevice : subdevices_) {
    const std::string& entity = subdevice->entity().name;
    const bool isOfEntity = name.size() > entity.size() && name.starts_with(entity) && name[entity.size()] == ':';
    const std::string_view own = isOfEntity ? name.substr(entity.size() + 1) : name;
    entities += (entities.empty() ? "\"" : ", \"") + entity + "\"";
    const VideoControl* const found = subdevice->device()->findControl(own);
    if (found == nullptr) continue;
    all.push_back({subdevice->device(), *found});
    having += (having.empty() ? "\"" : ", \"") + entity + ":" + found->name + "\"";
  }
  if (all.size() == 1) return all.front();
  if (!all.empty()) {
    refuseLinux(error, LinuxErrorCode::kAmbiguous,
                "the control \"%@\" belongs to several sub-devices of %@; name it as one of %@.", name, node_->path(),
                having);
    return std::nullopt;
  }
  const std::string undescribed = undescribedControls();
  refuseLinux(error, LinuxErrorCode::kNotSupported, "%@ and its sub-devices %@ have no control \"%@\"%@.",
              node_->path(), entities, name,
              undescribed.empty() ? "" : "; the drivers do not describe the controls " + undescribed);
  return std::nullopt;
}

std::optional<CameraControl> CameraControls::controlOfId(std::uint32_t id) const {
  const std::shared_ptr<V4l2Device> device = deviceWith({id});
  return device == nullptr ? std::nullopt : std::optional(CameraControl{device, *device->controlOfId(id)});
}

std::shared_ptr<V4l2Device> CameraControls::deviceWith(std::initializer_list<std::uint32_t> ids) const {
  for (std::shared_ptr<V4l2Device>& device : devices()) {
    const auto has = [&device](std::uint32_t id) { return device->controlOfId(id) != nullptr; };
    if (std::ranges::all_of(ids, has)) return std::move(device);
  }
  return nullptr;
}

const Subdevice* CameraControls::subdeviceOf(const V4l2Device& device) const {
  const auto found = std::ranges::find(subdevices_, &device, [](const auto& one) { return one->device().get(); });
  return found == subdevices_.end() ? nullptr : found->get();
}

bool CameraControls::set(const std::vector<ControlSetting>& settings, DiagnosticErrorPtr* error) const {
  return std::ranges::all_of(settings, [&](const ControlSetting& setting) {
    const std::optional<CameraControl> one = control(setting.control, error);
    return one && one->set(setting.value, error);
  });
}

std::string CameraControls::undescribedControls() const {
  std::string text;
  for (const auto& device : devices()) {
    const std::string own = device->undescribedControls();
    if (!own.empty()) text += (text.empty() ? "" : ", ") + own;
  }
  return text;
}

bool CameraControls::mayHaveControl(std::uint32_t id) const {
  return std::ranges::any_of(devices(), [id](const auto& device) { return device->mayHaveControl(id); });
}

}  // namespace quazor
