// ClientStream: one user's view of a camera's stream.
#pragma once

#include "backends/capture/capture_client.h"
#include "platform/capture_service.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Properties and their types are those of platform/capture_keys.h. Setting a property requires control of the stream
// and is refused while it runs. A start is refused if the rates contradict each other or the format, because rates are
// set one by one.
//
// Thread: any.
class ClientStream final : public CaptureStream {
 public:
  // The stream of the camera at `index`.
  ClientStream(std::shared_ptr<CaptureClient> client, std::size_t index);

  std::string description() const override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;
  bool start(DiagnosticErrorPtr* error) override;
  bool stop(DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }

 private:
  CameraSlot& slot() const { return client_->slots().cameras[index_]; }
  const std::string& name() const { return slot().info().name; }
  std::optional<Value> read(std::string_view key, const Refuser& refuse) const;
  std::optional<Value> readRate(std::string_view key, const std::optional<Value>& rate, const Refuser& refuse) const;
  bool set(const Value& value, std::string_view key, const Refuser& refuse);
  bool check(const Value& value, std::string_view key, const Refuser& refuse) const;

  const std::shared_ptr<CaptureClient> client_;
  const std::size_t index_;
};
using ClientStreams = std::vector<std::shared_ptr<ClientStream>>;

}  // namespace quazor
