// HidrawCalls: the system calls for one hidraw device, replaceable in tests.
#pragma once

#include "backends/linux/system/file_descriptor.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <span>

namespace quazor {

// Thread: any, several at once.
class HidrawCalls {
 public:
  HidrawCalls() = default;
  HidrawCalls(const HidrawCalls&) = delete;
  HidrawCalls& operator=(const HidrawCalls&) = delete;
  virtual ~HidrawCalls() = default;

  // open(2) for reading and writing, with non-blocking reads. No descriptor and errno on failure.
  virtual FileDescriptor open(const std::filesystem::path& path) = 0;
  // read(2): one report, truncated to the size of `room`. Negative and errno on failure: EAGAIN if there is none.
  virtual long read(int descriptor, std::span<std::uint8_t> room) = 0;
  // HIDIOCSFEATURE (<linux/hidraw.h>): the first byte is the report ID, 0 if reports have none. Negative and errno on
  // failure.
  virtual int setFeature(int descriptor, std::span<const std::uint8_t> report) = 0;
  // A monotonic time.
  virtual std::chrono::nanoseconds now() = 0;
};

}  // namespace quazor
