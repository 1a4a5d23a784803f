// LinuxStream: the stream of one camera, as one user has it.
#pragma once

#include "backends/linux/capture/linux_capture_client.h"
#include "platform/capture_service.h"

#include <cstddef>
#include <memory>
#include <string>

namespace quazor {

// Properties are those of platform/capture_keys.h. Setting one needs control of the stream and is refused while it
// runs.
// Thread: any.
class LinuxStream final : public CaptureStream {
 public:
  // The stream of the camera at `index`.
  LinuxStream(std::shared_ptr<LinuxCaptureClient> user, std::size_t index);

  std::string description() const override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;
  bool start(DiagnosticErrorPtr* error) override;
  bool stop(DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }

 private:
  LinuxCamera& camera() const { return *user_->cameras().cameras[index_]; }
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool setOutput(const Value& value, std::string_view key, DiagnosticErrorPtr* error);

  const std::shared_ptr<LinuxCaptureClient> user_;
  const std::size_t index_;
  const std::string port_;
};

}  // namespace quazor
