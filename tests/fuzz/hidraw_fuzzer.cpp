// A HID device with an arbitrary report descriptor and arbitrary input reports, as the kernel passes them on, mixed
// with errors, removals and feature reports: its user gets each report that was read once, in order and unchanged, and
// nothing after an error.
#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/hid/linux_hid.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "tests/fuzz/byte_input.h"
#include "tests/fuzz/fuzzing.h"

#include <fcntl.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <deque>
#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

namespace quazor {
namespace {

namespace fs = std::filesystem;

// The directories of one device, hidraw0, and of another one that can take its place.
class Machine {
 public:
  Machine() {
    std::string name = (fs::temp_directory_path() / "quazor-hidraw-XXXXXX").string();
    require(::mkdtemp(name.data()) != nullptr, "a directory for the device can be made");
    folder_ = name;
    for (const char* device : {"first", "second"}) fs::create_directories(deviceFolder(device));
    fs::create_directories(link().parent_path());
    fs::create_directories(roots().devices);
    std::ofstream(roots().devices / "hidraw0").flush();
  }
  Machine(const Machine&) = delete;
  Machine& operator=(const Machine&) = delete;
  ~Machine() { fs::remove_all(folder_); }

  HidrawRoots roots() const { return {folder_ / "sys", folder_ / "dev"}; }

  void connect(const char* device) const {
    disconnect();
    fs::create_directory_symlink(deviceFolder(device), link());
  }
  void disconnect() const { fs::remove(link()); }
  void describe(const Bytes& descriptor, const std::string& name) const {
    std::ofstream(deviceFolder("first") / "report_descriptor", std::ios::binary)
        .write(reinterpret_cast<const char*>(descriptor.data()), static_cast<std::streamsize>(descriptor.size()));
    std::ofstream(deviceFolder("first") / "uevent") << "HID_NAME=" << name << "\n";
  }

 private:
  fs::path deviceFolder(const char* device) const { return folder_ / "sys" / "devices" / device; }
  fs::path link() const { return folder_ / "sys" / "class" / "hidraw" / "hidraw0" / "device"; }

  fs::path folder_;
};

// What a read gives: a report or an error number, of which 0 is the end of the file.
struct Answer {
  Bytes report;
  int number = 0;
};

// The kernel's side of the device. Its descriptors are readable while something is queued.
class Kernel final : public HidrawCalls {
 public:
  FileDescriptor open(const fs::path&) override {
    if (openError != 0) {
      errno = openError;
      return {};
    }
    queue_.clear();
    answer.reset();
    hasEnded = false;
    FileDescriptor opened(::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC));
    require(static_cast<bool>(opened), "descriptors are released");
    event_ = FileDescriptor(::fcntl(opened.get(), F_DUPFD_CLOEXEC, 0));
    return opened;
  }

  long read(int descriptor, std::span<std::uint8_t> room) override {
    require(::fcntl(descriptor, F_GETFD) >= 0, "only an open descriptor is read");
    const bool isDiscarding = room.size() == 1;
    require(isDiscarding || !hasEnded, "nothing is read after an error");
    require(isDiscarding || !answer, "what was read is delivered before the next read");
    Answer next{{}, EAGAIN};
    if (!queue_.empty()) {
      next = std::move(queue_.front());
      queue_.pop_front();
      showQueue();
    }
    next.report.resize(std::min(next.report.size(), room.size()));
    std::ranges::copy(next.report, room.begin());
    const long result = next.number != 0 ? -1 : static_cast<long>(next.report.size());
    errno = next.number;
    if (isDiscarding || next.number == EINTR || next.number == EAGAIN) return result;
    hasEnded = result <= 0;
    if (isHeard) answer = std::move(next);
    return result;
  }

  int setFeature(int, std::span<const std::uint8_t> report) override {
    feature = Bytes(report.begin(), report.end());
    errno = featureError;
    return featureError == 0 ? static_cast<int>(report.size()) : -1;
  }

  std::chrono::nanoseconds now() override { return {}; }

  void queue(Answer next) {
    queue_.push_back(std::move(next));
    showQueue();
  }
  std::size_t queued() const { return queue_.size(); }

  int openError = 0;
  int featureError = 0;
  bool isHeard = false;          // there is a receiver
  bool hasEnded = false;         // a read since the device was opened was no report
  std::optional<Answer> answer;  // of the last read, until the receiver is told
  std::optional<Bytes> feature;  // the last one that was sent

 private:
  void showQueue() const {
    eventfd_t ignored = 0;
    if (event_) queue_.empty() ? ::eventfd_read(event_.get(), &ignored) : ::eventfd_write(event_.get(), 1);
  }

  FileDescriptor event_;
  std::deque<Answer> queue_;
};

const Machine& machine() {
  static const Machine one;
  return one;
}

// A device and its user.
class Session {
 public:
  explicit Session(ByteInput& input) : input_(input) {
    const Bytes descriptor = input.bytes(input.number() % 1024);
    const std::optional<HidReportDescriptor> parsed = accepted([&] { return parseHidReportDescriptor(descriptor); });
    if (parsed) {
      numbered_ = parsed->numbered;
      for (const auto& [id, length] : parsed->inputReports) lengths_.emplace_back(id, length);
    }
    machine().describe(descriptor, input.text(input.byte() % 64U));
    machine().connect("first");
    manager_->enumerateDevicesMatching({Dictionary{}});
    require(manager_->devices().size() == 1, "a device is found whatever it reports of itself");
    device_ = manager_->devices().front();
    const bool hasUsage = parsed && !parsed->topLevel.empty();
    const HidUsage usage = hasUsage ? parsed->topLevel.front() : HidUsage{};
    manager_->enumerateDevicesMatching({Dictionary{{std::string(kHidPrimaryUsagePage), Value(usage.page)},
                                                   {std::string(kHidPrimaryUsage), Value(usage.usage)}}});
    require(manager_->devices().size() == (hasUsage ? 1 : 0), "a device has the usage of its first collection");
    receive(true);
  }
  Session(const Session&) = delete;
  Session& operator=(const Session&) = delete;
  ~Session() { device_->unscheduleFromRunLoop(loop_, kRunLoopDefaultMode); }

  void step() {
    switch (const std::uint8_t choice = input_.byte(); choice % 12) {
      case 0: open(); break;
      case 1: schedule(choice >= 0x40); break;
      case 2: close(); break;
      case 3: receive(choice >= 0x40); break;
      case 4: setFeature(); break;
      case 5: fail(); break;
      case 6: replace(); break;
      case 7: kernel_->openError = choice < 0xC0 ? 0 : kNumbers.at(choice % kNumbers.size()); break;
      case 8: run(); break;
      default: queueReports(1U + choice % 4U);
    }
  }

 private:
  static constexpr std::array kNumbers{EIO, ENODEV, EINTR, EAGAIN, 0, EACCES, ENOMEM, EINVAL};

  void open() {
    DiagnosticErrorPtr error;
    const bool isFree = !isOpen_ && kernel_->openError == 0 && isConnected_;
    const bool opened = device_->open(&error);
    require(opened == isFree, "a device opens if it is there and not open");
    require(opened == (error == nullptr), "a call that fails, and only that, has an error");
    isOpen_ = isOpen_ || opened;
  }

  void schedule(bool wanted) {
    isScheduled_ = wanted;
    wanted ? device_->scheduleWithRunLoop(loop_, kRunLoopDefaultMode)
           : device_->unscheduleFromRunLoop(loop_, kRunLoopDefaultMode);
  }

  void close() {
    device_->close(0);
    isOpen_ = false;
  }

  void receive(bool wanted) {
    kernel_->isHeard = wanted;
    if (!wanted) return device_->setInputReportCallback({});
    device_->setInputReportCallback([this](std::uint8_t id, std::span<const std::uint8_t> data, const auto& error) {
      take(id, data, error);
      use();
    });
  }

  void take(std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
    require(isOpen_ && isScheduled_ && kernel_->isHeard, "only a receiver that waits is called");
    require(kernel_->answer.has_value(), "what is delivered was read");
    const Answer told = std::move(*kernel_->answer);
    kernel_->answer.reset();
    const bool isEnd = told.number != 0 || told.report.empty();
    require(isEnd == (error != nullptr), "an error tells that the input has ended, and only that");
    if (isEnd) {
      require(id == 0 && data.empty() && !error->localizedDescription().empty(), "an error comes without a report");
      return;
    }
    Bytes expected = told.report;
    if (!numbered_) expected.insert(expected.begin(), 0);
    require(std::ranges::equal(data, expected), "a report is what the device has sent");
    require(id == expected.front(), "and has its own ID");
  }

  // What a receiver does in its call.
  void use() {
    switch (input_.byte()) {
      case 1: close(); break;
      case 2: schedule(false); break;
      case 3: receive(false); break;
      case 4: receive(true); break;
      case 5: runOnce(); break;
      default: break;
    }
  }

  void runOnce() {
    if (depth_ == 3) return;
    ++depth_;
    loop_.runInMode(kRunLoopDefaultMode, {}, false);
    --depth_;
    require(!kernel_->answer, "what was read is delivered");
  }

  void run() {
    for (std::size_t i = kernel_->queued() + 2; i > 0; --i) runOnce();
    const bool isWaiting = isOpen_ && isScheduled_ && kernel_->isHeard && !kernel_->hasEnded;
    require(!isWaiting || kernel_->queued() == 0, "a receiver that waits gets all reports");
  }

  void setFeature() {
    const std::uint8_t id = input_.byte();
    Bytes payload = input_.bytes(input_.byte());
    if (input_.byte() % 4 == 3) payload.resize(payload.size() + 16300);
    if (!payload.empty() && input_.byte() % 4 != 3) payload.front() = id;
    const std::uint8_t choice = input_.byte();
    kernel_->featureError = choice < 0x80 ? 0 : kNumbers.at(choice % kNumbers.size());
    if (kernel_->featureError == EINTR) kernel_->featureError = EPIPE;  // which would never end
    kernel_->feature.reset();
    DiagnosticErrorPtr error;
    const bool done = device_->setFeatureReportWithID(id, payload, &error);
    const bool fits = !payload.empty() && payload.front() == id && payload.size() <= kMaxFeature;
    require(kernel_->feature.has_value() == (isOpen_ && fits), "a report is sent if it fits");
    require(!kernel_->feature || *kernel_->feature == payload, "and as it is");
    require(done == (kernel_->feature && kernel_->featureError == 0), "a call succeeds if the device takes the report");
    require(done == (error == nullptr), "a call that fails, and only that, has an error");
  }

  void fail() {
    if (isOpen_) kernel_->queue({{}, kNumbers.at(input_.byte() % kNumbers.size())});
  }

  void replace() {
    const std::uint8_t choice = input_.byte() % 4;
    isConnected_ = choice > 1;
    if (choice == 0) return machine().disconnect();
    machine().connect(choice == 1 ? "second" : "first");
  }

  // Most are of a length that the descriptor tells.
  void queueReports(std::size_t count) {
    for (; isOpen_ && count > 0; --count) {
      std::size_t length = input_.number() % 17000;
      std::uint8_t id = input_.byte();
      if (const std::uint8_t choice = input_.byte(); !lengths_.empty() && choice < 0xC0) {
        std::tie(id, length) = lengths_.at(choice % lengths_.size());
      }
      Bytes report = input_.bytes(std::min<std::size_t>(length, input_.byte()));
      report.resize(std::max<std::size_t>(length, 1), 0x5A);
      report.front() = id;
      kernel_->queue({std::move(report), 0});
    }
  }

  static constexpr std::size_t kMaxFeature = 16383;  // the length has 14 bits in the number of the request

  ByteInput& input_;
  RunLoop& loop_ = *makeLinuxRunLoops()->currentRunLoop();
  const std::shared_ptr<Kernel> kernel_ = std::make_shared<Kernel>();
  const std::shared_ptr<HidManager> manager_ = makeLinuxHid(machine().roots(), kernel_)->createManager();
  std::shared_ptr<HidDevice> device_;
  bool numbered_ = false;
  std::vector<std::pair<std::uint8_t, std::size_t>> lengths_;  // of the input reports, by their IDs
  bool isConnected_ = true;
  bool isOpen_ = false;
  bool isScheduled_ = false;
  int depth_ = 0;  // of runs
};

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  ByteInput input(data, size);
  Session session(input);
  while (!input.empty()) session.step();
  return 0;
}
