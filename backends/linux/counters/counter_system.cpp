#include "backends/linux/counters/counter_system.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/perf_event.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <memory>
#include <string_view>

namespace quazor {
namespace {

constexpr std::size_t kMaxFileLength = std::size_t{1024} * 1024;
constexpr std::size_t kChunk = 4096;  // the maximum size of most kernel files

EntryKind kindOf(unsigned char type) {
  switch (type) {
    case DT_REG: return EntryKind::kFile;
    case DT_DIR: return EntryKind::kDirectory;
    default: return EntryKind::kOther;
  }
}

class RunningSystem final : public CounterSystem {
 public:
  RunningSystem(const std::filesystem::path& root, PerfEventOpen perfEventOpen)
      : root_(root), perfEventOpen_(perfEventOpen) {}

  int list(const std::string& directory, std::vector<DirectoryEntry>* entries) override {
    const std::unique_ptr<DIR, int (*)(DIR*)> open(::opendir((root_ + directory).c_str()), ::closedir);
    if (open == nullptr) return errno;
    for (;;) {
      errno = 0;  // tells the end from an error of readdir()
      const dirent* const entry = ::readdir(open.get());
      if (entry == nullptr) return errno;
      const std::string_view name = entry->d_name;
      if (name != "." && name != "..") entries->push_back({std::string(name), kindOf(entry->d_type)});
    }
  }

  int find(const std::string& file) override {
    struct stat status {};
    if (::stat((root_ + file).c_str(), &status) != 0) return errno;
    return S_ISREG(status.st_mode) ? 0 : ENOENT;
  }

  int read(const std::string& file, std::string* content) override {
    const std::string path = root_ + file;
    const FileDescriptor open(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    if (!open) return openFailure(path, errno);
    content->clear();
    for (;;) {
      const std::size_t before = content->size();
      if (before > kMaxFileLength) return EFBIG;
      content->resize(before + kChunk);
      const ssize_t got = ::read(open.get(), content->data() + before, kChunk);
      const int failure = errno;
      content->resize(before + (got > 0 ? static_cast<std::size_t>(got) : 0));
      if (got == 0) return 0;
      if (got < 0) return failure;
    }
  }

  int openTracepoint(std::uint64_t id, int processor, FileDescriptor* counter) override {
    perf_event_attr attributes{};
    attributes.type = PERF_TYPE_TRACEPOINT;
    attributes.size = sizeof(attributes);
    attributes.config = id;
    const int everyProcess = -1;
    const int noGroup = -1;
    *counter = FileDescriptor(perfEventOpen_(&attributes, everyProcess, processor, noGroup, PERF_FLAG_FD_CLOEXEC));
    return *counter ? 0 : errno;
  }

 private:
  static int openFailure(const std::string& path, int number) {
    struct stat status {};
    const bool isForNobody =
        number == EACCES && ::stat(path.c_str(), &status) == 0 && (status.st_mode & (S_IRUSR | S_IRGRP | S_IROTH)) == 0;
    return isForNobody ? EINVAL : number;
  }

  const std::string root_;
  const PerfEventOpen perfEventOpen_;
};

}  // namespace

int systemPerfEventOpen(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags) {
  return static_cast<int>(::syscall(SYS_perf_event_open, attributes, process, processor, group, flags));
}

std::shared_ptr<CounterSystem> systemCounters(const std::filesystem::path& root, PerfEventOpen perfEventOpen) {
  return std::make_shared<RunningSystem>(root, perfEventOpen);
}

}  // namespace quazor
