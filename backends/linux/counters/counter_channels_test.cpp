#include "backends/linux/counters/counter_channels.h"

#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/system/linux_error.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

CounterFilesBinding files(std::string path, std::optional<std::string> group, std::optional<std::string> subgroup,
                          std::optional<std::string> name, std::optional<std::string> key = std::nullopt) {
  return {std::move(path), std::move(group), std::move(subgroup), std::move(name), std::move(key)};
}

// "GROUP|SUBGROUP|NAME FILE KEY ID" for each channel.
std::vector<std::string> channelsOf(const Binding& binding, CounterSystem& system) {
  DiagnosticErrorPtr error;
  const std::optional<std::vector<CounterChannel>> channels = counterChannels(binding, system, &error);
  if (!channels) return {error->localizedDescription()};
  std::vector<std::string> texts;
  for (const CounterChannel& one : *channels) {
    texts.push_back(one.description.groupName + "|" + one.description.subGroupName + "|" + one.description.name + " " +
                    one.file + (one.key.empty() ? "" : " " + one.key) +
                    (one.tracepoint ? " " + std::to_string(*one.tracepoint) : ""));
  }
  return texts;
}

TEST(CounterChannels, AreTheFilesThatThePathMatches) {
  FakeCounters system;
  for (const char* file :
       {"/c/K42ISP/K42ISP Events/Number ZE FAULT_B/cpu.stat", "/c/K42ISP/K42ISP Events/Number ZE FAULT_A/cpu.stat",
        "/c/K42ISP/K42ISP Events/cpu.stat", "/c/K42ISP/K42ISP Events/empty/other", "/c/K42ISP/Other/n/cpu.stat",
        "/c/K42ISP/Other/n/deeper/cpu.stat", "/c/file"}) {
    system.files[file] = "usage_usec 1\n";
  }
  Binding binding;
  binding.counterFiles = {
      files("/c/{group}/{subgroup}/{name}/cpu.stat", std::nullopt, std::nullopt, std::nullopt, "usage_usec")};
  EXPECT_THAT(
      channelsOf(binding, system),
      ElementsAre(
          "K42ISP|K42ISP Events|Number ZE FAULT_A /c/K42ISP/K42ISP Events/Number ZE FAULT_A/cpu.stat usage_usec",
          "K42ISP|K42ISP Events|Number ZE FAULT_B /c/K42ISP/K42ISP Events/Number ZE FAULT_B/cpu.stat usage_usec",
          "K42ISP|Other|n /c/K42ISP/Other/n/cpu.stat usage_usec"));
}

TEST(CounterChannels, TakeNamesFromTheBindingWhereThePathHasNone) {
  FakeCounters system;
  system.files = {{"/a/x1/n_y", "1"}, {"/a/x1/m_z", "1"}, {"/b", "1"}};
  Binding binding;
  binding.counterFiles = {files("/a/x{subgroup}/{name}_*", "g", std::nullopt, std::nullopt), files("/b", "G", "S", "N"),
                          files("/missing", "G", "S", "M"), files("/missing/{name}", "G", "S", std::nullopt)};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("g|1|m /a/x1/m_z", "g|1|n /a/x1/n_y", "G|S|N /b"));
}

TEST(CounterChannels, MatchInTheRootItself) {
  FakeCounters system;
  system.files = {{"/b1", "1"}, {"/c", "1"}};
  Binding binding;
  binding.counterFiles = {files("/b{name}", "g", "s", std::nullopt)};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("g|s|1 /b1"));
}

TEST(CounterChannels, AreTheLinesOfAFileThatAreCounters) {
  FakeCounters system;
  system.files["/proc/vmstat"] = "nr_free_pages 5\npgfault 7\n\nno number\n spaces 3\nalone\npgmajfault\t8";
  Binding binding;
  binding.counterFiles = {files("/proc/vmstat", "kernel", "vm", std::nullopt, "{name}"),
                          files("/gone", "kernel", "vm", std::nullopt, "{name}")};
  EXPECT_THAT(channelsOf(binding, system),
              ElementsAre("kernel|vm|pgfault /proc/vmstat pgfault", "kernel|vm|pgmajfault /proc/vmstat pgmajfault"));
}

TEST(CounterChannels, AreOneForAllLinesOfOneKey) {
  FakeCounters system;
  system.files["/stat"] = "a 1\nb x\na 2\nb 3\n";
  Binding binding;
  binding.counterFiles = {files("/stat", "g", "s", std::nullopt, "{name}")};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("g|s|a /stat a"));  // the first line of key b is not a count
}

TEST(CounterChannels, LeaveOutWhatIsKnownToGoDown) {
  FakeCounters system;
  system.files = {{"/sys/class/net/lo/mtu", "1"}, {"/sys/class/net/lo/carrier_changes", "1"}};
  Binding binding;
  binding.counterFiles = {files("/sys/class/net/{subgroup}/{name}", "net", std::nullopt, std::nullopt)};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("net|lo|carrier_changes /sys/class/net/lo/carrier_changes"));
}

TEST(CounterChannels, AreTracepointsInEitherPlace) {
  FakeCounters system;
  system.files = {{"/sys/kernel/debug/tracing/events/v4l2/v4l2_dqbuf/id", "1234\n"},
                  {"/sys/kernel/debug/tracing/events/v4l2/v4l2_qbuf/id", "1235\n"},
                  {"/sys/kernel/debug/tracing/events/v4l2/v4l2_qbuf/format", "1"},
                  {"/sys/kernel/debug/tracing/events/v4l2/bad/id", "none\n"},
                  {"/sys/kernel/debug/tracing/events/vb2/vb2_qbuf/id", "7\n"}};
  Binding binding;
  binding.tracepoints = {{"v*", "*", std::nullopt, std::nullopt, std::nullopt},
                         {"vb2", "vb2_qbuf", "g", "s", "n"},
                         {"none", "none", "g", "s", "n"}};
  EXPECT_THAT(
      channelsOf(binding, system),
      ElementsAre("tracepoints|v4l2|v4l2_dqbuf v4l2:v4l2_dqbuf 1234", "tracepoints|v4l2|v4l2_qbuf v4l2:v4l2_qbuf 1235",
                  "tracepoints|vb2|vb2_qbuf vb2:vb2_qbuf 7", "g|s|n vb2:vb2_qbuf 7"));
  system.files["/sys/kernel/tracing/events/vb2/vb2_qbuf/id"] = "8\n";
  binding.tracepoints = {{"vb2", "vb2_qbuf", "g", "s", "n"}};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("g|s|n vb2:vb2_qbuf 8"));
}

TEST(CounterChannels, AreTracepointsOfTheFirstPlaceThatThereIs) {
  // If tracefs is mounted for this user, a missing event must not lead to a directory that only root may read.
  FakeCounters system;
  system.files["/sys/kernel/tracing/events/vb2/vb2_qbuf/id"] = "8\n";
  system.failures["/sys/kernel/debug/tracing/events"] = EACCES;
  system.failures["/sys/kernel/debug/tracing/events/none"] = EACCES;
  Binding binding;
  binding.tracepoints = {{"none", "*", std::nullopt, std::nullopt, std::nullopt}};
  EXPECT_THAT(channelsOf(binding, system), IsEmpty());
}

TEST(CounterChannels, AreRefusedWhereATracepointMayNotBeRead) {
  const char* const file = "/sys/kernel/tracing/events/vb2/vb2_qbuf/id";
  class Unreadable final : public CounterSystem {
   public:
    int list(const std::string&, std::vector<DirectoryEntry>*) override { return 0; }
    int find(const std::string&) override { return 0; }
    int read(const std::string&, std::string*) override { return EACCES; }
    int openTracepoint(std::uint64_t, int, FileDescriptor*) override { return ENOENT; }
  } system;
  Binding binding;
  binding.tracepoints = {{"vb2", "vb2_qbuf", std::nullopt, std::nullopt, std::nullopt}};
  EXPECT_THAT(channelsOf(binding, system),
              ElementsAre(std::string("open on ") + file + " failed: Permission denied (EACCES)"));
}

TEST(CounterChannels, AreRefusedWhereOneMayNotLook) {
  Binding directories;
  directories.counterFiles = {files("/a/{name}", "g", "s", std::nullopt)};
  Binding one;
  one.counterFiles = {files("/a/b", "g", "s", "n")};
  Binding lines;
  lines.counterFiles = {files("/a/b", "g", "s", std::nullopt, "{name}")};
  Binding deeper;
  deeper.counterFiles = {files("/{group}/{name}", std::nullopt, "s", std::nullopt)};
  Binding tracepoints;
  tracepoints.tracepoints = {{"v4l2", "*", std::nullopt, std::nullopt, std::nullopt}};
  const struct {
    const Binding& binding;
    const char* path;
    const char* problem;
  } kRows[] = {
      {directories, "/a", "opendir on /a failed: Permission denied (EACCES)"},
      {deeper, "/a", "opendir on /a failed: Permission denied (EACCES)"},
      {deeper, "/", "opendir on / failed: Permission denied (EACCES)"},
      {one, "/a/b", "stat on /a/b failed: Permission denied (EACCES)"},
      {tracepoints, "/sys/kernel/tracing/events/v4l2",
       "opendir on /sys/kernel/tracing/events/v4l2 failed: Permission denied (EACCES)"},
  };
  for (const auto& row : kRows) {
    FakeCounters system;
    system.files["/a/b"] = "x 1\n";
    system.files["/sys/kernel/tracing/events/vb2/vb2_qbuf/id"] = "1\n";
    system.failures[row.path] = EACCES;
    EXPECT_THAT(channelsOf(row.binding, system), ElementsAre(row.problem)) << row.path;
    DiagnosticErrorPtr error;
    EXPECT_FALSE(counterChannels(row.binding, system, &error));
    EXPECT_EQ(error->code(), static_cast<std::int64_t>(LinuxErrorCode::kNoAccess));
  }
  class Unreadable final : public CounterSystem {
   public:
    int list(const std::string&, std::vector<DirectoryEntry>*) override { return ENOENT; }
    int find(const std::string&) override { return 0; }
    int read(const std::string&, std::string*) override { return failure; }
    int openTracepoint(std::uint64_t, int, FileDescriptor*) override { return ENOENT; }
    int failure = EPERM;
  } system;
  EXPECT_THAT(channelsOf(lines, system), ElementsAre("open on /a/b failed: Operation not permitted (EPERM)"));
  system.failure = EINVAL;
  EXPECT_THAT(channelsOf(lines, system), IsEmpty());
}

TEST(CounterChannels, FollowLinksToFilesAndDirectories) {
  class Links final : public CounterSystem {
   public:
    int list(const std::string& directory, std::vector<DirectoryEntry>* entries) override {
      if (directory != "/net" && directory != "/net/lo") return ENOTDIR;
      const std::string name = directory == "/net" ? "lo" : "link";
      *entries = {{name, EntryKind::kOther}, {"directory", EntryKind::kDirectory}, {"broken", EntryKind::kOther}};
      return 0;
    }
    int find(const std::string& file) override { return file == "/net/lo/link" ? 0 : ENOENT; }
    int read(const std::string&, std::string*) override { return ENOENT; }
    int openTracepoint(std::uint64_t, int, FileDescriptor*) override { return ENOENT; }
  } system;
  Binding binding;
  binding.counterFiles = {files("/net/{subgroup}/{name}", "g", std::nullopt, std::nullopt)};
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("g|lo|link /net/lo/link"));
}

TEST(CounterChannels, PassOverLinksThatLeadNowhereButNotOverThoseThatMayNotBeFollowed) {
  class Links final : public CounterSystem {
   public:
    int list(const std::string& directory, std::vector<DirectoryEntry>* entries) override {
      if (directory != "/a") return ELOOP;
      *entries = {{"link", EntryKind::kOther}};
      return 0;
    }
    int find(const std::string&) override { return failure; }
    int read(const std::string&, std::string*) override { return ENOENT; }
    int openTracepoint(std::uint64_t, int, FileDescriptor*) override { return ENOENT; }
    int failure = ELOOP;
  } system;
  Binding binding;
  binding.counterFiles = {files("/a/{name}", "g", "s", std::nullopt), files("/a/{subgroup}/{name}", "g", {}, {}),
                          files("/loop", "g", "s", "n")};
  EXPECT_THAT(channelsOf(binding, system), IsEmpty());
  system.failure = EACCES;
  EXPECT_THAT(channelsOf(binding, system), ElementsAre("stat on /a/link failed: Permission denied (EACCES)"));
}

TEST(CountIn, IsAWholeNumberOf64BitsAndNothingElse) {
  EXPECT_EQ(countIn("0\n"), 0U);
  EXPECT_EQ(countIn(" \t42\n\n"), 42U);
  EXPECT_EQ(countIn("18446744073709551615"), std::numeric_limits<std::uint64_t>::max());
  for (const char* text :
       {"", "\n", "-1", "+1", "1.5", "1 2", "0x10", "one", "18446744073709551616", "7 kB", "7\r\n"}) {
    EXPECT_EQ(countIn(text), std::nullopt) << text;
  }
  EXPECT_EQ(countIn(std::string_view("7\0\n", 3)), std::nullopt);
}

TEST(ProcessorsIn, AreThoseOfAList) {
  EXPECT_THAT(processorsIn("0-2,5\n"), ElementsAre(0, 1, 2, 5));
  EXPECT_THAT(processorsIn("3"), ElementsAre(3));
  EXPECT_THAT(processorsIn("0,2-3"), ElementsAre(0, 2, 3));
  EXPECT_THAT(processorsIn(""), IsEmpty());
  EXPECT_THAT(processorsIn("\n"), IsEmpty());
  EXPECT_THAT(processorsIn("-1"), IsEmpty());
  EXPECT_EQ(processorsIn("0-2000000000").size(), 65537U);
}

}  // namespace
}  // namespace quazor
