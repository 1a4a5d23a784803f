#include "backends/counters/counter_reports.h"

#include "backends/counters/counters_conformance.h"
#include "backends/counters/passing_counters_conformance.h"

#include <memory>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Channels with values set by a test.
class ScriptedChannels final : public CounterChannels {
 public:
  explicit ScriptedChannels(std::vector<ConformanceChannel> channels) : channels_(std::move(channels)) {
    for (const ConformanceChannel& channel : channels_) {
      descriptions_.push_back({channel.group, channel.subGroup, channel.name});
    }
  }
  std::size_t size() const override { return channels_.size(); }
  const ReportChannelDescription& description(std::size_t index) const override { return descriptions_[index]; }
  std::optional<CounterValues> read(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* error) override {
    if (failsToRead) {
      fail(error, "Scripted", 1, nullptr, "The counters cannot be read.");
      return std::nullopt;
    }
    CounterValues values;
    for (const std::size_t index : indexes)
      values.push_back(advanced ? channels_[index].after : channels_[index].before);
    return values;
  }
  void refuseBaseline(DiagnosticErrorPtr* error) const override {
    fail(error, "Scripted", 3, nullptr, "Another baseline, please.");
  }

  bool advanced = false;
  bool failsToRead = false;

 private:
  std::vector<ConformanceChannel> channels_;
  std::vector<ReportChannelDescription> descriptions_;
};

class ScriptedCountersUnderTest {
 public:
  void make(std::vector<ConformanceChannel> channels) {
    channels_ = std::make_shared<ScriptedChannels>(std::move(channels));
  }
  std::shared_ptr<ReportFacility> facility() {
    return makeCounterReports([this](DiagnosticErrorPtr* error) -> std::shared_ptr<CounterChannels> {
      if (!failsToFind_) return channels_;
      fail(error, "Scripted", 2, nullptr, "The counters cannot be found.");
      return nullptr;
    });
  }
  void advance() { channels_->advanced = true; }
  void failEnumeration() { failsToFind_ = true; }
  void failSnapshot() { channels_->failsToRead = true; }
  void recover() { failsToFind_ = channels_->failsToRead = false; }

 private:
  std::shared_ptr<ScriptedChannels> channels_;
  bool failsToFind_ = false;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Scripted, CountersConformance, ScriptedCountersUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Scripted, PassingCountersConformance, ScriptedCountersUnderTest);

TEST(CounterReportsTest, AForeignBaselineIsToldWithTheBackendsError) {
  ScriptedCountersUnderTest counters;
  counters.make({steadyChannel("a", 1)});
  const auto snapshot = counters.facility()->reportWithOnlySimpleChannels(nullptr)->snapshot(nullptr);
  DiagnosticErrorPtr error;
  EXPECT_EQ(snapshot->snapshotWithBaseline(ForeignSnapshot(), &error), nullptr);
  EXPECT_EQ(defaultText(error), "Scripted code 3: Another baseline, please.");
}

}  // namespace
}  // namespace quazor
