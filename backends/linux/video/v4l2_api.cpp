#include "backends/linux/video/v4l2_api.h"

#include "backends/linux/video/projector_guard.h"

#include <fcntl.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

namespace quazor {
namespace {

class SystemVideoKernel final : public V4l2Api {
 public:
  int open(const std::string& path) override {
    return uninterrupted([&] { return ::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC); });
  }

  int openForQueries(const std::string& path) override {
    return uninterrupted([&] { return ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC); });
  }

  void close(int descriptor) override { ::close(descriptor); }

  int lock(int descriptor) override {
    return uninterrupted([&] { return ::flock(descriptor, LOCK_EX | LOCK_NB); });
  }

  int ioctl(int descriptor, unsigned long request, void* argument) override {
    return uninterrupted([&] { return ::ioctl(descriptor, request, argument); });
  }

  int map(int descriptor, std::size_t length, std::int64_t offset, void** address) override {
    void* const mapped = ::mmap(nullptr, length, PROT_READ, MAP_SHARED, descriptor, offset);
    if (mapped == MAP_FAILED) return -errno;
    // A forked copy of this process would otherwise keep the device's buffers in use.
    ::madvise(mapped, length, MADV_DONTFORK);
    *address = mapped;
    return 0;
  }

  void unmap(void* address, std::size_t length) override { ::munmap(address, length); }

  int poll(std::span<pollfd> descriptors, std::chrono::nanoseconds timeout) override {
    timespec limit{};
    if (timeout.count() >= 0) {
      const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(timeout);
      limit = {seconds.count(), (timeout - seconds).count()};
    }
    const int ready = ::ppoll(descriptors.data(), descriptors.size(), timeout.count() < 0 ? nullptr : &limit, nullptr);
    if (ready >= 0) return ready;
    for (pollfd& one : descriptors) one.revents = 0;
    return errno == EINTR ? 0 : -errno;
  }

  int makeEvent() override {
    const int event = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    return event < 0 ? -errno : event;
  }

  void signalEvent(int event) override { ::eventfd_write(event, 1); }

  void clearEvent(int event) override {
    eventfd_t count = 0;
    ::eventfd_read(event, &count);
  }

  std::chrono::nanoseconds now() override {
    timespec time{};
    ::clock_gettime(CLOCK_MONOTONIC, &time);
    return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
  }

  std::unique_ptr<ControlGuard> guardControls(const std::string& path, int descriptor,
                                              const std::vector<ControlValue>& off, int* number) override {
    return startProjectorGuard({path, descriptor}, off, &setVideoControl, number);
  }
};

}  // namespace

std::shared_ptr<V4l2Api> systemVideoKernel() { return std::make_shared<SystemVideoKernel>(); }

}  // namespace quazor
