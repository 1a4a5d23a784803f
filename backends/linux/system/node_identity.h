// NodeIdentity: tells a device from another one that took its place.
#pragma once

#include "contract/diagnostic_error.h"

#include <cstdint>
#include <filesystem>
#include <string>

namespace quazor {

// The entry of a device in sysfs and the kernel's number of it. A device that is connected again gets a new entry, with
// another number, even if the name is the same. The time is when the kernel put the entry into memory, which it may do
// several times.
struct NodeIdentity {
  std::filesystem::path entry;
  std::uint64_t number = 0;
  std::int64_t time = 0;  // in nanoseconds

  // Of what the entry is now; number and time are 0 if there is none.
  static NodeIdentity of(const std::filesystem::path& entry);

  friend bool operator==(const NodeIdentity&, const NodeIdentity&) = default;
};

// Asked after a device was opened by its path: true if the entry has still the same number. Else stores an error that
// says that `device`, a text for the user, was replaced.
bool isStillThere(const NodeIdentity& identity, const std::string& device, DiagnosticErrorPtr* error);

// Stores that error. Returns false.
bool refuseReplaced(const std::string& device, DiagnosticErrorPtr* error);

}  // namespace quazor
