// CounterSystem: what the report facility asks of the system, so that made-up files can stand in for it.
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
  kOther  // a link, or what the file system does not say
};

struct DirectoryEntry {
  std::string name;
  EntryKind kind = EntryKind::kOther;
};

// Every call gives 0 or the error number.
// Thread: any.
class CounterSystem {
 public:
  CounterSystem() = default;
  CounterSystem(const CounterSystem&) = delete;
  CounterSystem& operator=(const CounterSystem&) = delete;
  virtual ~CounterSystem() = default;

  // What the directory holds, without "." and "..", in no order.
  virtual int list(const std::string& directory, std::vector<DirectoryEntry>* entries) = 0;
  // Whether that is a file: ENOENT when it is none.
  virtual int find(const std::string& file) = 0;
  // The whole file. A file that nobody may read gives EINVAL, one longer than a mebibyte EFBIG.
  virtual int read(const std::string& file, std::string* content) = 0;
  // Begins to count a tracepoint on one processor, for all processes. What is read of the descriptor is the count, 8
  // bytes in the machine's order.
  virtual int openTracepoint(std::uint64_t id, int processor, FileDescriptor* counter) = 0;
};

// perf_event_open(2), as the system has it.
using PerfEventOpen = int (*)(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags);
int systemPerfEventOpen(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags);

// The running system's. `root` stands before every path.
std::shared_ptr<CounterSystem> systemCounters(const std::filesystem::path& root = {},
                                              PerfEventOpen perfEventOpen = systemPerfEventOpen);

}  // namespace quazor
