#include "backends/linux/counters/linux_reports.h"

#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <time.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <limits>

namespace quazor {
namespace {

using ::testing::ElementsAre;

Binding bindingOf(std::string path, std::optional<std::string> key = std::nullopt) {
  Binding binding;
  const bool keyIsName = key == "{name}";
  const bool named = path.find("{name}") == std::string::npos && !keyIsName;
  binding.counterFiles = {
      {std::move(path), "g", "s", named ? std::optional<std::string>("n") : std::nullopt, std::move(key)}};
  return binding;
}

// "NAME=COUNT" for each sample.
std::vector<std::string> textsOf(const std::shared_ptr<const ReportSnapshot>& snapshot) {
  std::vector<std::string> texts;
  if (snapshot == nullptr) return {"no snapshot"};
  for (const ReportSample& sample : snapshot->samples()) {
    const std::optional<Value>& count = sample.channel().count();
    texts.push_back(sample.channel().channelDescription().name + "=" + (count ? formatMessage("%@", *count) : "none"));
  }
  return texts;
}

class LinuxReportsTest : public ::testing::Test {
 protected:
  std::shared_ptr<const ReportChannelSet> setOf(const Binding& binding) {
    return makeLinuxReports(binding, system_)->reportWithOnlySimpleChannels(nullptr);
  }
  std::vector<std::string> snapshotOf(const std::shared_ptr<const ReportChannelSet>& set) {
    return textsOf(set->snapshot(&error_));
  }

  const std::shared_ptr<FakeCounters> system_ = std::make_shared<FakeCounters>();
  DiagnosticErrorPtr error_;
};

TEST_F(LinuxReportsTest, SamplesEveryChannelInOrder) {
  system_->files = {{"/c/b", "18446744073709551615\n"},
                    {"/c/a", "0"},
                    {"/c/text", "on\n"},
                    {"/c/wide", "18446744073709551616"},
                    {"/c/below", "-1"}};
  const auto set = setOf(bindingOf("/c/{name}"));
  EXPECT_THAT(snapshotOf(set), ElementsAre("a=0", "b=18446744073709551615", "below=none", "text=none", "wide=none"));
  const ReportChannelDescription& first = set->snapshot(nullptr)->samples()[0].channel().channelDescription();
  EXPECT_EQ(first.groupName, "g");
  EXPECT_EQ(first.subGroupName, "s");
}

TEST_F(LinuxReportsTest, FilteringLeavesTheSetAsItIs) {
  system_->files = {{"/c/a", "1"}, {"/c/b", "2"}, {"/c/c", "3"}};
  const auto set = setOf(bindingOf("/c/{name}"));
  const auto filtered = set->reportByFilteringChannels([](const auto& one) { return one.name != "b"; });
  EXPECT_THAT(snapshotOf(filtered), ElementsAre("a=1", "c=3"));
  EXPECT_THAT(snapshotOf(filtered->reportByFilteringChannels([](const auto& one) { return one.name == "c"; })),
              ElementsAre("c=3"));
  EXPECT_THAT(snapshotOf(filtered->reportByFilteringChannels([](const auto&) { return false; })), testing::IsEmpty());
  EXPECT_THAT(snapshotOf(set), ElementsAre("a=1", "b=2", "c=3"));
}

TEST_F(LinuxReportsTest, ChannelsAreThoseOfTheMomentOfTheCall) {
  system_->files = {{"/c/a", "1"}};
  const auto facility = makeLinuxReports(bindingOf("/c/{name}"), system_);
  const auto before = facility->reportWithOnlySimpleChannels(nullptr);
  system_->files["/c/b"] = "2";
  EXPECT_THAT(snapshotOf(before), ElementsAre("a=1"));
  EXPECT_THAT(snapshotOf(facility->reportWithOnlySimpleChannels(nullptr)), ElementsAre("a=1", "b=2"));
  EXPECT_THAT(snapshotOf(setOf(Binding())), testing::IsEmpty());
}

TEST_F(LinuxReportsTest, ReadsAFileOfManyChannelsOnce) {
  system_->files = {{"/stat", "one 1\ntwo 2\nthree 3\n"}, {"/stat2", "one 11\n"}};
  Binding binding = bindingOf("/stat", "{name}");
  binding.counterFiles.push_back({"/stat2", "g", "s", "n", "one"});
  binding.counterFiles.push_back({"/stat2", "g", "s", "m", "none"});
  const auto set = setOf(binding);
  system_->reads = 0;
  EXPECT_THAT(snapshotOf(set), ElementsAre("one=1", "two=2", "three=3", "n=11", "m=none"));
  EXPECT_EQ(system_->reads, 2);
  system_->files["/stat"] = "two x\nthree 4\n";
  EXPECT_THAT(snapshotOf(set), ElementsAre("one=none", "two=none", "three=4", "n=11", "m=none"));
}

TEST_F(LinuxReportsTest, ReadsAFileAsOneNumberAndAsLines) {
  system_->files = {{"/stat", "one 1\n"}};
  Binding binding = bindingOf("/stat");
  binding.counterFiles.push_back({"/stat", "g", "s", "m", "one"});
  binding.counterFiles.push_back({"/stat", "g", "s", "l", std::nullopt});
  EXPECT_THAT(snapshotOf(setOf(binding)), ElementsAre("n=none", "m=1", "l=none"));
}

TEST_F(LinuxReportsTest, ACounterThatVanishesHasNoCount) {
  system_->files = {{"/c/a", "1"}, {"/c/b", "2"}, {"/c/k", "x 3"}};
  Binding binding = bindingOf("/c/{name}");
  binding.counterFiles.push_back({"/c/k", "g", "s", "key", "x"});
  const auto set = setOf(binding)->reportByFilteringChannels([](const auto& one) { return one.name != "k"; });
  const auto baseline = set->snapshot(nullptr);
  system_->files = {{"/c/a", "4"}};
  EXPECT_THAT(snapshotOf(set), ElementsAre("a=4", "b=none", "key=none"));
  EXPECT_THAT(textsOf(set->snapshot(nullptr)->snapshotWithBaseline(*baseline, nullptr)),
              ElementsAre("a=3", "b=none", "key=none"));
}

TEST_F(LinuxReportsTest, DeltasAreExact) {
  const struct {
    const char* what;
    const char* before;
    const char* after;
    const char* delta;
  } kRows[] = {
      {"no step", "5", "5", "n=0"},
      {"up", "5", "9", "n=4"},
      {"all 64 bits", "0", "18446744073709551615", "n=18446744073709551615"},
      {"above what a double holds", "9007199254740993", "9007199254740996", "n=3"},
      {"down", "9", "5", "n=-4"},
      {"down by half of the numbers", "9223372036854775808", "0", "n=-9223372036854775808"},
      {"round the end", "18446744073709551615", "4", "n=5"},
      {"none before", "x", "4", "n=none"},
      {"none after", "4", "x", "n=none"},
  };
  for (const auto& row : kRows) {
    system_->files = {{"/n", row.before}};
    const auto set = setOf(bindingOf("/n"));
    const auto baseline = set->snapshot(nullptr);
    system_->files = {{"/n", row.after}};
    EXPECT_THAT(textsOf(set->snapshot(nullptr)->snapshotWithBaseline(*baseline, nullptr)), ElementsAre(row.delta))
        << row.what;
  }
}

TEST_F(LinuxReportsTest, ADeltaNeedsABaselineOfTheSameChannels) {
  system_->files = {{"/c/a", "1"}, {"/c/b", "2"}};
  const auto set = setOf(bindingOf("/c/{name}"));
  const auto onlyA = [](const auto& one) { return one.name == "a"; };
  const auto later = set->reportByFilteringChannels(onlyA)->snapshot(nullptr);
  EXPECT_THAT(textsOf(later->snapshotWithBaseline(*set->reportByFilteringChannels(onlyA)->snapshot(nullptr), &error_)),
              ElementsAre("a=0"));
  EXPECT_EQ(later->snapshotWithBaseline(*set->snapshot(nullptr), &error_), nullptr);
  ASSERT_NE(error_, nullptr);
  EXPECT_EQ(error_->domain(), LinuxErrorDomain);
  EXPECT_EQ(error_->code(), static_cast<std::int64_t>(LinuxErrorCode::kBadValue));
  EXPECT_EQ(later->snapshotWithBaseline(*setOf(bindingOf("/c/{name}"))->snapshot(nullptr), nullptr), nullptr);
}

TEST_F(LinuxReportsTest, FailsWhereOneMayNotLook) {
  system_->files = {{"/c/a", "1"}, {"/c/b", "2"}};
  const auto facility = makeLinuxReports(bindingOf("/c/{name}"), system_);
  const auto set = facility->reportWithOnlySimpleChannels(nullptr);
  system_->failures["/c"] = EACCES;
  EXPECT_EQ(facility->reportWithOnlySimpleChannels(&error_), nullptr);
  EXPECT_EQ(error_->localizedDescription(), "opendir on /c failed: Permission denied (EACCES)");
  system_->failures = {{"/c/b", EPERM}};
  EXPECT_EQ(set->snapshot(&error_), nullptr);
  EXPECT_EQ(error_->localizedDescription(), "open on /c/b failed: Operation not permitted (EPERM)");
  EXPECT_EQ(error_->code(), static_cast<std::int64_t>(LinuxErrorCode::kNoAccess));
}

class TracepointReportsTest : public LinuxReportsTest {
 protected:
  TracepointReportsTest() {
    system_->files = {{"/sys/kernel/tracing/events/v4l2/in/id", "7\n"},
                      {"/sys/kernel/tracing/events/v4l2/out/id", "8\n"},
                      {"/sys/devices/system/cpu/online", "0-1\n"}};
    binding_.tracepoints = {{"v4l2", "*", std::nullopt, std::nullopt, std::nullopt}};
  }

  Binding binding_;
};

TEST_F(TracepointReportsTest, CountsOnAllProcessorsFromTheFirstSnapshotOn) {
  system_->tracepointCounts = {{{7, 0}, {0, 100}}, {{7, 1}, {1, 23}}, {{8, 0}, {5, 5}}, {{8, 1}, {0, 0}}};
  const auto set = setOf(binding_);
  EXPECT_EQ(system_->opened, 0);
  const auto baseline = set->snapshot(nullptr);
  EXPECT_THAT(textsOf(baseline), ElementsAre("in=1", "out=5"));
  EXPECT_EQ(system_->opened, 4);
  EXPECT_THAT(textsOf(set->snapshot(nullptr)->snapshotWithBaseline(*baseline, nullptr)),
              ElementsAre("in=122", "out=0"));
  EXPECT_EQ(system_->opened, 4);
  EXPECT_THAT(snapshotOf(set), ElementsAre("in=none", "out=none"));  // there are no more values to read
}

TEST_F(TracepointReportsTest, CountsOnlyWhatTheSetHolds) {
  system_->tracepointCounts = {{{7, 0}, {0}}, {{7, 1}, {0}}};
  const auto set = setOf(binding_)->reportByFilteringChannels([](const auto& one) { return one.name == "in"; });
  EXPECT_THAT(snapshotOf(set), ElementsAre("in=0"));
  EXPECT_EQ(system_->opened, 2);
}

TEST_F(TracepointReportsTest, PassesOverProcessorsThatAreOffAndTracepointsThatHaveGone) {
  system_->tracepointFailures = {{{7, 1}, ENODEV}, {{8, 0}, ENOENT}};
  system_->tracepointCounts = {{{7, 0}, {3}}};
  EXPECT_THAT(snapshotOf(setOf(binding_)), ElementsAre("in=3", "out=none"));
}

TEST_F(TracepointReportsTest, HasNoCountWhereNoProcessorCounts) {
  system_->tracepointFailures = {{{7, 0}, ENODEV}, {{7, 1}, ENODEV}};
  system_->tracepointCounts = {{{8, 0}, {3}}, {{8, 1}, {3}}};
  EXPECT_THAT(snapshotOf(setOf(binding_)), ElementsAre("in=none", "out=6"));
}

TEST_F(TracepointReportsTest, CountsOnTheFirstProcessorWhereNothingSaysWhichThereAre) {
  system_->files.erase("/sys/devices/system/cpu/online");
  system_->tracepointCounts = {{{7, 0}, {3}}, {{8, 0}, {4}}};
  EXPECT_THAT(snapshotOf(setOf(binding_)), ElementsAre("in=3", "out=4"));
  system_->files["/sys/devices/system/cpu/online"] = "\n";
  EXPECT_THAT(snapshotOf(setOf(binding_)), ElementsAre("in=3", "out=4"));
}

TEST_F(TracepointReportsTest, LetsGoOfAllWhereOneCannotBeOpened) {
  system_->tracepointFailures = {{{8, 1}, EMFILE}};
  const auto set = setOf(binding_);
  EXPECT_EQ(set->snapshot(&error_), nullptr);
  EXPECT_EQ(system_->opened, 3);
  system_->tracepointFailures.clear();
  system_->tracepointCounts = {{{7, 0}, {0}}, {{7, 1}, {0}}, {{8, 0}, {0}}, {{8, 1}, {0}}};
  EXPECT_THAT(snapshotOf(set), ElementsAre("in=0", "out=0"));
  EXPECT_EQ(system_->opened, 7);
}

TEST_F(TracepointReportsTest, FailsWithoutTheRightToCount) {
  system_->tracepointFailures = {{{7, 0}, EACCES}};
  const auto set = setOf(binding_);
  EXPECT_EQ(set->snapshot(&error_), nullptr);
  ASSERT_NE(error_, nullptr);
  EXPECT_EQ(error_->localizedDescription(),
            "perf_event_open on the tracepoint v4l2:in failed: Permission denied (EACCES)");
  EXPECT_EQ(error_->code(), static_cast<std::int64_t>(LinuxErrorCode::kNoAccess));
}

// A tree with a thousand files per directory, generated on access.
class ManyCounters final : public CounterSystem {
 public:
  explicit ManyCounters(int thousands) : thousands_(thousands) {}
  int list(const std::string& directory, std::vector<DirectoryEntry>* entries) override {
    const bool isTop = directory == "/many";
    for (int i = 0; i < (isTop ? thousands_ : 1000); ++i) {
      entries->push_back({"Number " + std::to_string(i), isTop ? EntryKind::kDirectory : EntryKind::kFile});
    }
    return 0;
  }
  int find(const std::string& /*file*/) override { return ENOENT; }
  int read(const std::string& /*file*/, std::string* content) override {
    *content = "12345\n";
    return 0;
  }
  int openTracepoint(std::uint64_t /*id*/, int /*processor*/, FileDescriptor* /*counter*/) override { return ENOENT; }

 private:
  const int thousands_;
};

std::chrono::nanoseconds processorTime() {
  timespec time{};
  EXPECT_EQ(::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time), 0);
  return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

// The processor time of this thread for enumerating, filtering and comparing that many thousands of channels. Other
// processes do not affect it.
std::chrono::nanoseconds timeOf(int thousands) {
  Binding binding;
  binding.counterFiles = {{"/many/{subgroup}/{name}", "g", std::nullopt, std::nullopt, std::nullopt}};
  const std::chrono::nanoseconds begin = processorTime();
  const auto set = makeLinuxReports(binding, std::make_shared<ManyCounters>(thousands))
                       ->reportWithOnlySimpleChannels(nullptr)
                       ->reportByFilteringChannels([](const auto&) { return true; });
  const auto baseline = set->snapshot(nullptr);
  const auto delta = set->snapshot(nullptr)->snapshotWithBaseline(*baseline, nullptr);
  EXPECT_EQ(delta->samples().size(), static_cast<std::size_t>(thousands) * 1000);
  EXPECT_EQ(delta->samples().back().channel().count(), Value(std::uint64_t{0}));
  return processorTime() - begin;
}

#ifdef NDEBUG
constexpr int kManyThousands = 1000;
#else
constexpr int kManyThousands = 100;  // unoptimised code takes many times as long
#endif

TEST(LinuxReports, TakeTimeThatIsLinearInTheChannels) {
  const std::chrono::nanoseconds small = timeOf(kManyThousands / 10);
  const std::chrono::nanoseconds large = timeOf(kManyThousands);
  EXPECT_LT(large, small * 30);  // ten times as many channels; quadratic time would be a factor of a hundred
}

TEST(LinuxReports, ReadRealFiles) {
  namespace fs = std::filesystem;
  const fs::path root =
      fs::path(::testing::TempDir()) /
      ("quazor-reports-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()));
  constexpr int kFiles = 3000;
  for (int i = 0; i < kFiles; ++i) {
    const fs::path directory = root / "cgroup/K42ISP/K42ISP Events" / ("Number " + std::to_string(i));
    fs::create_directories(directory);
    std::ofstream(directory / "cpu.stat") << "usage_usec " << i << "\nuser_usec 0\n";
  }
  Binding binding;
  binding.counterFiles = {
      {"/cgroup/{group}/{subgroup}/{name}/cpu.stat", std::nullopt, std::nullopt, std::nullopt, "usage_usec"}};
  const auto set = makeLinuxReports(binding, systemCounters(root))->reportWithOnlySimpleChannels(nullptr);
  const auto snapshot = set->snapshot(nullptr);
  ASSERT_EQ(snapshot->samples().size(), static_cast<std::size_t>(kFiles));
  for (const ReportSample& sample : snapshot->samples()) {
    EXPECT_EQ(formatMessage("Number %@", *sample.channel().count()), sample.channel().channelDescription().name);
  }
  fs::remove_all(root);
}

TEST(LinuxReports, OfTheRunningSystemCanBeAsked) {
  Binding binding;
  binding.counterFiles = {{"/sys/class/net/lo/statistics/{name}", "net", "lo", std::nullopt, std::nullopt}};
  const auto set = makeLinuxReports(binding)->reportWithOnlySimpleChannels(nullptr);
  ASSERT_NE(set, nullptr);
  EXPECT_NE(set->snapshot(nullptr), nullptr);
}

}  // namespace
}  // namespace quazor
