// MediaDevice: an open media controller (https://docs.kernel.org/userspace-api/media/mediactl/media-controller.html).
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/media/media_graph.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "contract/diagnostic_error.h"

#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct MediaDeviceInfo {
  std::filesystem::path path;  // for example /dev/media0
  NodeIdentity identity{};
  // The members below are empty if the device cannot be opened; `problem` then gives the reason.
  std::string driver;
  std::string model;
  std::string busInfo;
  DiagnosticErrorPtr problem;
};

// All media controllers, sorted by number; empty if the machine has none.
std::vector<MediaDeviceInfo> mediaDevices(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots);

// True if the binding selects the device; one that cannot be opened never matches.
bool matches(const MediaDeviceInfo& device, const MediaDeviceMatch& match);

// A user-readable line: "/dev/media0 (driver vimc, model VIMC MDEV, bus platform:vimc)".
std::string textOf(const MediaDeviceInfo& device);

// Every failing call stores an error that names the device and the entities.
//
// Thread: one at a time.
class MediaDevice final {
 public:
  // Returns null and an error if the device cannot be opened or does not tell its topology.
  static std::shared_ptr<MediaDevice> open(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                           const std::filesystem::path& path, DiagnosticErrorPtr* error);
  // The same, only for queries.
  static std::shared_ptr<MediaDevice> inspect(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                              const std::filesystem::path& path, DiagnosticErrorPtr* error);
  MediaDevice(const MediaDevice&) = delete;
  MediaDevice& operator=(const MediaDevice&) = delete;
  // Sets each link that setLink() has changed back to what it was, the last one first.
  ~MediaDevice();

  const std::filesystem::path& path() const { return path_; }
  // The topology when it was last read.
  const MediaGraph& graph() const { return graph_; }
  bool readGraph(DiagnosticErrorPtr* error);
  // True if the controller, asked again, has the entity with the same device file. graph() stays.
  bool hasStill(const MediaEntity& entity, DiagnosticErrorPtr* error) const;
  // The only entity with that name; null and an error (kNotSupported, kAmbiguous) otherwise. Messages begin with
  // `purpose`.
  const MediaEntity* entity(const std::string& name, const std::string& purpose, DiagnosticErrorPtr* error) const;
  // Changes nothing if the link is as wanted. Fails (kNotSupported) if there is no such link, or if it cannot be
  // changed.
  bool setLink(const LinkBinding& wanted, const std::string& purpose, DiagnosticErrorPtr* error);

 private:
  struct ChangedLink {
    MediaLink before;
    std::string name;
  };

  MediaDevice(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots, std::filesystem::path path, int descriptor);
  static std::shared_ptr<MediaDevice> opened(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                             const std::filesystem::path& path, int descriptor,
                                             DiagnosticErrorPtr* error);
  std::optional<MediaGraph> graphNow(DiagnosticErrorPtr* error) const;
  std::optional<MediaTopology> topology(DiagnosticErrorPtr* error) const;
  int setFlags(const MediaLink& link, std::uint32_t flags) const;
  const MediaLink* findLink(const LinkBinding& wanted, const std::string& purpose, DiagnosticErrorPtr* error) const;

  const std::shared_ptr<V4l2Api> kernel_;
  const DeviceRoots roots_;
  const std::filesystem::path path_;
  const int descriptor_;
  MediaGraph graph_;
  std::vector<ChangedLink> changed_;
};

// The media controllers that the cameras of a machine use. Cameras of one controller share its MediaDevice, so links
// are set back when the last of these cameras is released.
//
// Thread: one at a time.
class MediaDevices final {
 public:
  MediaDevices(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots)
      : kernel_(std::move(kernel)), roots_(std::move(roots)) {}

  const std::shared_ptr<V4l2Api>& kernel() const { return kernel_; }
  // The only device that the binding selects. Returns null and an error that lists the devices if none matches
  // (kNoDevice, or kNoAccess if one lacks permission) or several do (kAmbiguous).
  std::shared_ptr<MediaDevice> open(const MediaDeviceMatch& match, const std::string& purpose,
                                    DiagnosticErrorPtr* error);

 private:
  const std::shared_ptr<V4l2Api> kernel_;
  const DeviceRoots roots_;
  std::map<std::filesystem::path, std::weak_ptr<MediaDevice>> opened_;
};

}  // namespace quazor
