// LinuxGroup: cameras that the binding lets run in lockstep, as one user has them.
#pragma once

#include "backends/linux/capture/linux_stream.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// V4L2 itself starts each camera when it is told to; whether they then run in step is the hardware's, and what
// MulticamSessionStatus shows. Configurations are checked and kept.
// Thread: any.
class LinuxGroup final : public SynchronizedStreamsGroup {
 public:
  // The group at `index`; `streams` are its user's streams of all cameras, by the camera's index.
  LinuxGroup(std::shared_ptr<LinuxCaptureClient> user, std::size_t index,
             const std::vector<std::shared_ptr<LinuxStream>>& streams);

  std::string description() const override;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override;
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override;
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override;

  std::size_t index() const { return index_; }

 private:
  LinuxGroupState& state() const { return user_->cameras().groups[index_]; }
  std::optional<Value> read(std::string_view key, DiagnosticErrorPtr* error) const;
  bool set(const Value& value, std::string_view key, DiagnosticErrorPtr* error);
  bool setActiveStreams(const Value& value, DiagnosticErrorPtr* error);
  bool setMasterConfiguration(const Value& value, DiagnosticErrorPtr* error);
  Value streamOf(std::size_t camera) const;

  const std::shared_ptr<LinuxCaptureClient> user_;
  const std::size_t index_;
  const std::string name_;
  std::vector<std::shared_ptr<LinuxStream>> streams_;  // in the group's order
};

}  // namespace quazor
