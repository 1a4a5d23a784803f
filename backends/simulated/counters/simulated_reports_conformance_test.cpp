#include "backends/counters/counters_conformance.h"
#include "backends/faults/operations.h"
#include "backends/simulated/errors/report_error.h"
#include "backends/simulated/phone_for_tests.h"

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

// The channels change once, after a stream has run for a millisecond.
class SimulatedCountersUnderTest {
 public:
  void make(const std::vector<ConformanceChannel>& channels) {
    Scenario scenario = smallScenario();
    for (const ConformanceChannel& channel : channels) {
      ReportChannelConfig config;
      config.group = channel.group;
      config.subGroup = channel.subGroup;
      config.name = channel.name;
      config.count = channel.before;
      if (channel.before && channel.after) {
        config.steps = {{std::chrono::milliseconds(1), *channel.after - *channel.before}};
      }
      scenario.reports.push_back(config);
    }
    user_.reset();
    phone_.emplace(scenario, PhoneTime::kVirtual, 1);
    user_.emplace(*phone_);
    EXPECT_TRUE(user_->control(user_->streams));
  }
  std::shared_ptr<ReportFacility> facility() { return phone_->platform().reports; }
  void advance() {
    EXPECT_TRUE(user_->wide().start(nullptr));
    phone_->platform().clock->sleep(std::chrono::milliseconds(2));
  }
  void failEnumeration() { failNext(report_operation::kSimpleChannels); }
  void failSnapshot() { failNext(report_operation::kSnapshot); }
  void recover() { EXPECT_EQ(phone_->faultStatus().back().fired, 1U); }

 private:
  void failNext(std::string_view operation) {
    Fault fault;
    fault.operation = operation;
    fault.occurrence = 1;
    phone_->addFault(fault);
  }

  std::optional<SimulatedPhone> phone_;
  std::optional<PhoneUser> user_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Simulated, CountersConformance, SimulatedCountersUnderTest);

}  // namespace
}  // namespace quazor
