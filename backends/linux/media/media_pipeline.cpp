#include "backends/linux/media/media_pipeline.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <utility>

namespace quazor {

std::unique_ptr<MediaPipeline> MediaPipeline::open(MediaDevices& devices, const MediaBinding& binding,
                                                   const std::string& port, const std::filesystem::path& node,
                                                   DiagnosticErrorPtr* error) {
  std::shared_ptr<MediaDevice> device = devices.open(binding.device, port, error);
  if (device == nullptr) return nullptr;
  std::unique_ptr<MediaPipeline> pipeline(new MediaPipeline(devices.kernel(), binding, port, std::move(device)));
  return pipeline->prepare(error) && pipeline->findSubdevices(node, error) ? std::move(pipeline) : nullptr;
}

MediaPipeline::MediaPipeline(std::shared_ptr<V4l2Api> kernel, MediaBinding binding, std::string port,
                             std::shared_ptr<MediaDevice> device)
    : kernel_(std::move(kernel)), binding_(std::move(binding)), port_(std::move(port)), device_(std::move(device)) {}

bool MediaPipeline::prepare(DiagnosticErrorPtr* error) {
  if (!device_->readGraph(error)) return false;
  const auto setLink = [&](const LinkBinding& link) { return device_->setLink(link, port_, error); };
  const auto setPad = [&](const PadBinding& pad) {
    const MediaEntity* const entity = device_->entity(pad.pad.entity, port_, error);
    const auto opened = entity == nullptr ? nullptr : subdevice(*entity, error);
    return opened != nullptr && opened->apply(pad, port_, error);
  };
  return std::ranges::all_of(binding_.links, setLink) && std::ranges::all_of(binding_.pads, setPad);
}

std::shared_ptr<Subdevice> MediaPipeline::subdevice(const MediaEntity& entity, DiagnosticErrorPtr* error) {
  const auto known = std::ranges::find(opened_, entity.id, [](const auto& one) { return one->entity().id; });
  if (known != opened_.end()) return *known;
  std::shared_ptr<Subdevice> opened = Subdevice::open(kernel_, entity, port_, error);
  // Before anything is set: its number may have become that of another device.
  if (opened == nullptr || !device_->hasStill(entity, error)) return nullptr;
  opened_.push_back(opened);
  return opened;
}

bool MediaPipeline::findSubdevices(const std::filesystem::path& node, DiagnosticErrorPtr* error) {
  const MediaEntity* const camera = device_->graph().entityOfNode(node);
  if (camera == nullptr) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ is not an entity of %@.", port_, node.string(),
                       device_->path().string());
  }
  const auto add = [&](const MediaEntity& entity) {
    std::shared_ptr<Subdevice> opened = subdevice(entity, error);
    if (opened == nullptr) return false;
    if (std::ranges::find(subdevices_, opened) == subdevices_.end()) subdevices_.push_back(std::move(opened));
    return true;
  };
  for (const MediaEntity* entity : device_->graph().upstreamOf(*camera)) {
    if (entity->isSubdevice && !add(*entity)) return false;
  }
  return std::ranges::all_of(binding_.subdevices, [&](const std::string& name) {
    const MediaEntity* const entity = device_->entity(name, port_, error);
    return entity != nullptr && add(*entity);
  });
}

}  // namespace quazor
