// ClientGroup: one user's view of cameras that can be synchronised.
#pragma once

#include "backends/capture/client_stream.h"

#include <cstddef>
#include <memory>
#include <string>

namespace quazor {

// Properties and their types are those of platform/capture_keys.h. Setting a property requires control of the active
// streams, and is refused while a stream of the group runs.
//
// Thread: any.
class ClientGroup final : public SynchronizedStreamsGroup {
 public:
  // The group at `index`; `streams` are the user's streams of all cameras, by index of the camera.
  ClientGroup(std::shared_ptr<CaptureClient> client, std::size_t index, const ClientStreams& streams);

  std::string description() const override;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }

 private:
  CaptureGroupSlot& slot() const { return client_->slots().groups[index_]; }
  const std::string& name() const { return slot().info.name; }
  Value streamOf(std::size_t camera) const;
  std::optional<Value> read(std::string_view key, const Refuser& refuse) const;
  bool set(const Value& value, std::string_view key, const Refuser& refuse);
  bool setActiveStreams(const Value& value, const Refuser& refuse);
  bool setMasterConfiguration(const Value& value, const Refuser& refuse);
  bool checkSlaves(const Value& value, const Refuser& refuse) const;

  const std::shared_ptr<CaptureClient> client_;
  const std::size_t index_;
  ClientStreams streams_;  // in the group's order
};

}  // namespace quazor
