#include "backends/linux/hid/linux_hid.h"

#include "backends/hid/hid_matching.h"
#include "backends/linux/hid/hidraw_input.h"
#include "backends/linux/system/linux_error.h"

#include <fcntl.h>
#include <linux/hidraw.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cerrno>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

class KernelCalls final : public HidrawCalls {
 public:
  FileDescriptor open(const std::filesystem::path& path) override {
    return FileDescriptor(::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
  }
  long read(int descriptor, std::span<std::uint8_t> room) override {
    return ::read(descriptor, room.data(), room.size());
  }
  int setFeature(int descriptor, std::span<const std::uint8_t> report) override {
    // The request number contains the length. The kernel may modify the bytes, so it gets a copy.
    std::vector<std::uint8_t> bytes(report.begin(), report.end());
    return ::ioctl(descriptor, HIDIOCSFEATURE(bytes.size()), bytes.data());
  }
  std::chrono::nanoseconds now() override { return std::chrono::steady_clock::now().time_since_epoch(); }
};

// The request number has a limited number of bits for the length.
constexpr std::size_t kMaxFeatureLength = (std::size_t{1} << _IOC_SIZEBITS) - 1;

std::optional<HidUsage> primaryUsage(const HidrawNode& node) {
  const std::vector<HidUsage>& usages = node.descriptor.topLevel;
  return usages.empty() ? std::nullopt : std::optional(usages.front());
}

class LinuxHidDevice final : public HidDevice {
 public:
  LinuxHidDevice(HidrawNode node, HidrawRoots roots, std::shared_ptr<HidrawCalls> calls)
      : node_(std::move(node)),
        roots_(std::move(roots)),
        calls_(std::move(calls)),
        input_(std::make_shared<HidrawInput>(calls_, name(), node_.descriptor.numbered)) {}
  ~LinuxHidDevice() override { input_->retire(); }

  std::string description() const override { return "HID device " + name() + " \"" + node_.name + "\""; }
  std::string ownName() const { return node_.name.empty() ? name() : node_.name; }

  bool open(DiagnosticErrorPtr* error) override {
    if (input_->descriptor() != nullptr) return refuse(error, LinuxErrorCode::kWrongState, "is already open");
    FileDescriptor descriptor = calls_->open(node_.path);
    if (!descriptor) {
      const int number = errno;
      if (number == ENOENT) return refuse(error, LinuxErrorCode::kDeviceGone, "has been removed");
      failSystemCall(error, "open", name(), number);
      return false;
    }
    // The path may belong to another device by now.
    const std::filesystem::path opened = hidrawDevice(roots_, node_.path);
    if (opened.empty()) return refuse(error, LinuxErrorCode::kDeviceGone, "has been removed");
    if (opened != node_.device) {
      return refuse(error, LinuxErrorCode::kDeviceGone, "has been removed, and another device has its place");
    }
    input_->open(std::make_shared<const FileDescriptor>(std::move(descriptor)));
    return true;
  }

  void setInputReportCallback(InputReportCallback callback) override { input_->setReceiver(std::move(callback)); }

  bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                              DiagnosticErrorPtr* error) override {
    const std::shared_ptr<const FileDescriptor> descriptor = input_->descriptor();
    if (descriptor == nullptr) return refuse(error, LinuxErrorCode::kWrongState, "is not open");
    if (payload.empty() || payload.front() != reportID || payload.size() > kMaxFeatureLength) {
      return refuse(error, LinuxErrorCode::kBadValue,
                    "accepts feature reports that begin with their ID and have at most " +
                        std::to_string(kMaxFeatureLength) + " bytes");
    }
    const std::chrono::nanoseconds begin = calls_->now();
    int sent = -1;
    do {
      sent = calls_->setFeature(descriptor->get(), payload);
    } while (sent < 0 && errno == EINTR);  // a signal does not end the request
    if (sent >= 0) return true;
    tellFailedFeature(reportID, errno, calls_->now() - begin, error);
    return false;
  }

  void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) override { input_->schedule(runLoop, mode); }
  void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) override { input_->unschedule(runLoop, mode); }
  void close(std::uint32_t /*options*/) override { input_->close(); }

 private:
  std::string name() const { return node_.path.string(); }

  bool refuse(DiagnosticErrorPtr* error, LinuxErrorCode code, const std::string& what) const {
    failLinux(error, code, name() + ' ' + what + '.');
    return false;
  }

  // EIO means that the device refused or, after several seconds, that it did not respond.
  void tellFailedFeature(std::uint8_t reportID, int number, std::chrono::nanoseconds time,
                         DiagnosticErrorPtr* error) const {
    const std::string call = "HIDIOCSFEATURE of report " + std::to_string(reportID);
    if (number != ETIMEDOUT && (number != EIO || time < kHidAnswerTime)) {
      failSystemCall(error, call, name(), number);
      return;
    }
    const auto waited = std::chrono::floor<std::chrono::milliseconds>(time).count();
    failLinux(error, LinuxErrorCode::kNoAnswer,
              call + " on " + name() + " failed: the device did not respond for " + std::to_string(waited) + " ms.");
  }

  const HidrawNode node_;
  const HidrawRoots roots_;
  const std::shared_ptr<HidrawCalls> calls_;
  const std::shared_ptr<HidrawInput> input_;
};

class LinuxHidManager final : public HidManager {
 public:
  LinuxHidManager(HidrawRoots roots, std::shared_ptr<HidrawCalls> calls)
      : roots_(std::move(roots)), calls_(std::move(calls)) {}

  std::string description() const override { return "HID manager of " + roots_.devices.string() + "/hidraw*"; }

  void enumerateDevicesMatching(const std::vector<Dictionary>& matching) override {
    found_.clear();
    for (HidrawNode& node : hidrawNodes(roots_)) {
      if (!matchesHidDevice(matching, primaryUsage(node))) continue;
      found_.push_back(std::make_shared<LinuxHidDevice>(std::move(node), roots_, calls_));
    }
  }

  std::vector<std::shared_ptr<HidDevice>> devices() override { return found_; }

 private:
  const HidrawRoots roots_;
  const std::shared_ptr<HidrawCalls> calls_;
  std::vector<std::shared_ptr<HidDevice>> found_;
};

class LinuxHidService final : public HidService {
 public:
  LinuxHidService(HidrawRoots roots, std::shared_ptr<HidrawCalls> calls)
      : roots_(std::move(roots)), calls_(std::move(calls)) {}

  std::shared_ptr<HidManager> createManager() override {
    if (!hasHidraw(roots_)) return nullptr;
    return std::make_shared<LinuxHidManager>(roots_, calls_);
  }

 private:
  const HidrawRoots roots_;
  const std::shared_ptr<HidrawCalls> calls_;
};

}  // namespace

std::string linuxHidName(const HidDevice& device) {
  const auto* const own = dynamic_cast<const LinuxHidDevice*>(&device);
  return own == nullptr ? std::string() : own->ownName();
}

std::shared_ptr<HidrawCalls> makeHidrawCalls() { return std::make_shared<KernelCalls>(); }

std::shared_ptr<HidService> makeLinuxHid() { return makeLinuxHid({}, makeHidrawCalls()); }

std::shared_ptr<HidService> makeLinuxHid(HidrawRoots roots, std::shared_ptr<HidrawCalls> calls) {
  return std::make_shared<LinuxHidService>(std::move(roots), std::move(calls));
}

}  // namespace quazor
