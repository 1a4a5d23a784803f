// FakeCounters: fake files and tracepoints.
#pragma once

#include "backends/linux/counters/counter_system.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

class FakeCounters final : public CounterSystem {
 public:
  std::map<std::string, std::string> files;
  std::map<std::string, int> failures;  // of files and directories: the error number that every call returns
  std::map<std::pair<std::uint64_t, int>, int> tracepointFailures;  // by ID and processor
  // The successive counts of a tracepoint on a processor; reads fail after the last one.
  std::map<std::pair<std::uint64_t, int>, std::vector<std::uint64_t>> tracepointCounts;
  int opened = 0;  // the number of tracepoint counters opened
  int reads = 0;

  int list(const std::string& directory, std::vector<DirectoryEntry>* entries) override {
    if (const int failure = failureOf(directory)) return failure;
    const std::string prefix = directory == "/" ? directory : directory + "/";
    std::map<std::string, EntryKind> found;
    for (auto file = files.lower_bound(prefix); file != files.end() && file->first.starts_with(prefix); ++file) {
      const std::string rest = file->first.substr(prefix.size());
      const std::size_t slash = rest.find('/');
      found[rest.substr(0, slash)] = slash == std::string::npos ? EntryKind::kFile : EntryKind::kDirectory;
    }
    if (found.empty()) return files.contains(directory) ? ENOTDIR : ENOENT;
    // Not sorted by name.
    for (auto entry = found.rbegin(); entry != found.rend(); ++entry) entries->push_back({entry->first, entry->second});
    return 0;
  }
  int find(const std::string& file) override {
    if (const int failure = failureOf(file)) return failure;
    return files.contains(file) ? 0 : ENOENT;
  }
  int read(const std::string& file, std::string* content) override {
    ++reads;
    if (const int failure = failureOf(file)) return failure;
    const auto found = files.find(file);
    if (found == files.end()) return ENOENT;
    *content = found->second;
    return 0;
  }
  int openTracepoint(std::uint64_t id, int processor, FileDescriptor* counter) override {
    if (const auto failure = tracepointFailures.find({id, processor}); failure != tracepointFailures.end()) {
      return failure->second;
    }
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) return errno;
    *counter = FileDescriptor(ends[0]);
    const FileDescriptor filled(ends[1]);
    for (const std::uint64_t count : tracepointCounts[{id, processor}]) {
      if (::write(filled.get(), &count, sizeof count) != static_cast<ssize_t>(sizeof count)) return EIO;
    }
    ++opened;
    return 0;
  }

 private:
  int failureOf(const std::string& path) const {
    const auto failure = failures.find(path);
    return failure == failures.end() ? 0 : failure->second;
  }
};

}  // namespace quazor
