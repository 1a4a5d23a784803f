// The simulated capture service, its plug-in and its device.
#pragma once

#include "backends/simulated/capture/simulated_group.h"

#include <memory>
#include <span>
#include <string>
#include <vector>

namespace quazor {

// One user's device. Its streams and groups are made with it and are the same objects on every path that leads to
// them. What the user controls is free again when the device, its groups and its streams are gone.
// Thread: any.
class SimulatedDevice final : public CaptureDevice {
 public:
  explicit SimulatedDevice(std::shared_ptr<SimulatedCaptureClient> user);

  std::string description() const override;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override;
  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override;
  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override;
  // Refused for a stream that runs or is not under this user's control; then none is given back.
  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override;
  bool invalidate(DiagnosticErrorPtr* error) override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;

 private:
  bool changeControl(const CaptureStreams& streams, bool request, DiagnosticErrorPtr* error);
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool readGroups(const Value& value, std::vector<std::size_t>* groups, DiagnosticErrorPtr* error) const;
  bool checkGroup(const GroupState& group, DiagnosticErrorPtr* error) const;

  const std::shared_ptr<SimulatedCaptureClient> user_;
  std::vector<std::shared_ptr<SimulatedStream>> streams_;  // by the camera's index
  std::vector<std::shared_ptr<SimulatedGroup>> groups_;    // by the group's index
};

// Each call of device() makes a device of its own: another user of the same cameras.
// Thread: any.
class SimulatedPlugIn final : public CapturePlugIn {
 public:
  SimulatedPlugIn(std::shared_ptr<CaptureHardware> hardware, std::shared_ptr<CallInterceptor> calls);

  std::string description() const override;
  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override;

 private:
  const std::shared_ptr<CaptureHardware> hardware_;
  const std::shared_ptr<CallInterceptor> calls_;
};

// Thread: any.
class SimulatedCaptureService final : public CaptureService {
 public:
  SimulatedCaptureService(std::shared_ptr<CaptureHardware> hardware, std::shared_ptr<CallInterceptor> calls);

  std::shared_ptr<CapturePlugIn> createPlugIn() override;
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override;

 private:
  const std::shared_ptr<CaptureHardware> hardware_;
  const std::shared_ptr<CallInterceptor> calls_;
  const std::shared_ptr<SimulatedPlugIn> defaultPlugIn_;
};

}  // namespace quazor
