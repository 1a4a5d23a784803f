// SimulatedGroup: a group of cameras that can be synchronised, as one user has it.
#pragma once

#include "backends/simulated/capture/simulated_stream.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Properties and their types are those of platform/capture_keys.h. Settings need control of the active streams and are
// refused while a stream of the group runs.
// Thread: any.
class SimulatedGroup final : public SynchronizedStreamsGroup {
 public:
  // The group at `index`; `streams` are its user's streams of all cameras, by the camera's index.
  SimulatedGroup(std::shared_ptr<const SimulatedCaptureClient> user, std::size_t index,
                 const std::vector<std::shared_ptr<SimulatedStream>>& streams);

  std::string description() const override;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }

 private:
  GroupState& state() const { return user_->hardware().groups[index_]; }
  Value streamOf(std::size_t camera) const;
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool checkStopped(std::string_view key, DiagnosticErrorPtr* error) const;
  bool setActiveStreams(const Value& value, DiagnosticErrorPtr* error);
  bool setMasterConfiguration(const Value& value, DiagnosticErrorPtr* error);
  bool checkSlaves(const Value& value, DiagnosticErrorPtr* error) const;

  const std::shared_ptr<const SimulatedCaptureClient> user_;
  const std::size_t index_;
  const std::string id_;
  std::vector<std::shared_ptr<SimulatedStream>> streams_;  // in the group's order
};

}  // namespace quazor
