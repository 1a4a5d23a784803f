#include "backends/hid/hid_conformance.h"
#include "backends/linux/hid/hidraw_for_tests.h"
#include "backends/linux/hid/linux_hid.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/threads/thread_concurrency.h"

#include <cerrno>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Sockets replace hidraw devices.
class LinuxHidUnderTest {
 public:
  void connect(const std::vector<ConformanceDevice>& devices, std::map<int, ConformanceEvent> events) {
    tree_.emplace();
    calls_ = std::make_shared<FakeHidrawCalls>();
    events_ = std::move(events);
    arrived_ = 0;
    for (std::size_t i = 0; i < devices.size(); ++i) {
      tree_->connect(node(i), sensorDescriptor(devices[i].page, static_cast<std::uint8_t>(devices[i].usage)));
    }
  }
  std::shared_ptr<HidManager> manager() { return makeLinuxHid(tree_->roots(), calls_)->createManager(); }
  void arrive(int count) {
    for (int i = 0; i < count; ++i) arriveNext();
  }
  RunLoops& runLoops() { return *loops_; }
  Concurrency& concurrency() { return concurrency_; }

 private:
  static std::string node(std::size_t index) { return "hidraw" + std::to_string(index); }

  void arriveNext() {
    const auto event = events_.find(++arrived_);
    if (event == events_.end()) {
      sendReport(calls_->device, {0x76, 0, 0, 0, static_cast<std::uint8_t>(arrived_), 0, 0, 0});
    } else if (event->second == ConformanceEvent::kError) {
      calls_->readErrors = {EFAULT};
      sendReport(calls_->device, {0x76});  // wakes the waiting loop; the read fails
    } else {
      calls_->device.reset();
      calls_->featureError = ENODEV;
      tree_->disconnect(node(0));
      calls_->openError = ENOENT;
    }
  }

  std::optional<HidrawTree> tree_;
  std::shared_ptr<FakeHidrawCalls> calls_;
  std::map<int, ConformanceEvent> events_;
  int arrived_ = 0;
  ThreadConcurrency concurrency_;
  const std::shared_ptr<RunLoops> loops_ = makeLinuxRunLoops();
};

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, HidConformance, LinuxHidUnderTest);

}  // namespace
}  // namespace quazor
