// HidrawCalls: what is asked of the kernel for one hidraw device, so that a test can stand in for it.
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

  // open(2), for reading and writing, where a read never waits. None and errno on failure.
  virtual FileDescriptor open(const std::filesystem::path& path) = 0;
  // read(2): one report, cut off at the end of `room`. Below zero and errno on failure: EAGAIN when there is none.
  virtual long read(int descriptor, std::span<std::uint8_t> room) = 0;
  // HIDIOCSFEATURE (<linux/hidraw.h>): the byte of the report's ID comes first, 0 where reports have none. Below zero
  // and errno on failure.
  virtual int setFeature(int descriptor, std::span<const std::uint8_t> report) = 0;
  // Time since some moment; it never goes back.
  virtual std::chrono::nanoseconds now() = 0;
};

}  // namespace quazor
