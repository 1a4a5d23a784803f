#include "backends/counters/counters_conformance.h"
#include "backends/counters/passing_counters_conformance.h"
#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/counters/linux_reports.h"

#include <cerrno>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Uses one file per channel.
class LinuxCountersUnderTest {
 public:
  void make(std::vector<ConformanceChannel> channels) {
    channels_ = std::move(channels);
    Binding binding;
    system_->files.clear();
    for (std::size_t i = 0; i < channels_.size(); ++i) {
      binding.counterFiles.push_back(
          {file(i), channels_[i].group, channels_[i].subGroup, channels_[i].name, std::nullopt});
      system_->files[file(i)] = contentOf(channels_[i].before);
    }
    facility_ = makeLinuxReports(binding, system_);
  }
  std::shared_ptr<ReportFacility> facility() { return facility_; }
  void advance() {
    for (std::size_t i = 0; i < channels_.size(); ++i) {
      const bool goes = channels_[i].before && !channels_[i].after;
      if (goes) {
        system_->files.erase(file(i));
      } else {
        system_->files[file(i)] = contentOf(channels_[i].after);
      }
    }
  }
  void failEnumeration() { system_->failures[file(0)] = EACCES; }
  void failSnapshot() { system_->failures[file(0)] = EACCES; }
  void recover() { system_->failures.clear(); }

 private:
  static std::string file(std::size_t index) { return "/counters/" + std::to_string(index); }
  static std::string contentOf(std::optional<std::uint64_t> count) {
    return count ? std::to_string(*count) + "\n" : "not counted yet\n";
  }

  const std::shared_ptr<FakeCounters> system_ = std::make_shared<FakeCounters>();
  std::vector<ConformanceChannel> channels_;
  std::shared_ptr<ReportFacility> facility_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CountersConformance, LinuxCountersUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, PassingCountersConformance, LinuxCountersUnderTest);

}  // namespace
}  // namespace quazor
