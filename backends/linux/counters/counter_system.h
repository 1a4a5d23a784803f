// CounterSystem: the system calls of the report facility, replaceable in tests.
#pragma once

#include "backends/linux/system/file_descriptor.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

struct perf_event_attr;

namespace quazor {

enum class EntryKind {
  kFile,
  kDirectory,
  kOther  // a link, or unknown to the file system
};

struct DirectoryEntry {
  std::string name;
  EntryKind kind = EntryKind::kOther;
};

// Every call returns 0 or an error number.
// Thread: any.
class CounterSystem {
 public:
  CounterSystem() = default;
  CounterSystem(const CounterSystem&) = delete;
  CounterSystem& operator=(const CounterSystem&) = delete;
  virtual ~CounterSystem() = default;

  // The entries of the directory, without "." and "..", unsorted.
  virtual int list(const std::string& directory, std::vector<DirectoryEntry>* entries) = 0;
  // Checks that the path is a file; returns ENOENT if it is not.
  virtual int find(const std::string& file) = 0;
  // Reads the whole file. Returns EINVAL if the file is not readable, EFBIG if it exceeds one mebibyte.
  virtual int read(const std::string& file, std::string* content) = 0;
  // Starts to count a tracepoint on one processor, for all processes. Reading the descriptor returns the count as 8
  // bytes in native byte order.
  virtual int openTracepoint(std::uint64_t id, int processor, FileDescriptor* counter) = 0;
};

// The signature of perf_event_open(2).
using PerfEventOpen = int (*)(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags);
int systemPerfEventOpen(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags);

// The running system. `root` is prepended to every path.
std::shared_ptr<CounterSystem> systemCounters(const std::filesystem::path& root = {},
                                              PerfEventOpen perfEventOpen = systemPerfEventOpen);

}  // namespace quazor
