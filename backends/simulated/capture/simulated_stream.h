// SimulatedStream: the stream of one camera, as one user has it.
#pragma once

#include "backends/simulated/capture/simulated_capture_client.h"
#include "platform/capture_service.h"

#include <cstddef>
#include <memory>
#include <string>

namespace quazor {

// Properties and their types are those of platform/capture_keys.h. Settings need control of the stream and are refused
// while it runs; so is a start with rates that contradict each other or the format, since rates are set one by one.
// Thread: any.
class SimulatedStream final : public CaptureStream {
 public:
  // The stream of the camera at `index`.
  SimulatedStream(std::shared_ptr<const SimulatedCaptureClient> user, std::size_t index);

  std::string description() const override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;
  bool start(DiagnosticErrorPtr* error) override;
  bool stop(DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }
  // The scenario's id of the camera.
  const std::string& id() const { return id_; }

 private:
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool checkStart(const CameraState& camera, DiagnosticErrorPtr* error) const;

  const std::shared_ptr<const SimulatedCaptureClient> user_;
  const std::size_t index_;
  const std::string id_;
  const std::string port_;
};

}  // namespace quazor
