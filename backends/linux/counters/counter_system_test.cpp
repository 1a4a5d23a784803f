#include "backends/linux/counters/counter_system.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/perf_event.h>
#include <sys/stat.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>

namespace quazor {
namespace {

namespace fs = std::filesystem;

class CounterSystemTest : public ::testing::Test {
 protected:
  CounterSystemTest()
      : root_(fs::path(::testing::TempDir()) /
              ("quazor-counters-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()))),
        system_(systemCounters(root_)) {
    fs::create_directories(root_ / "a/inner");
    write("a/file", "12\n");
  }
  ~CounterSystemTest() override { fs::remove_all(root_); }

  void write(const std::string& name, const std::string& text) const { std::ofstream(root_ / name) << text; }

  const fs::path root_;
  const std::shared_ptr<CounterSystem> system_;
};

TEST_F(CounterSystemTest, ListsDirectories) {
  fs::create_symlink("file", root_ / "a/link");
  std::vector<DirectoryEntry> entries;
  ASSERT_EQ(system_->list("/a", &entries), 0);
  const auto isEntry = [](const char* name, EntryKind kind) {
    return ::testing::AllOf(::testing::Field(&DirectoryEntry::name, name),
                            ::testing::Field(&DirectoryEntry::kind, kind));
  };
  EXPECT_THAT(entries, ::testing::UnorderedElementsAre(isEntry("file", EntryKind::kFile),
                                                       isEntry("inner", EntryKind::kDirectory),
                                                       isEntry("link", EntryKind::kOther)));
  EXPECT_EQ(system_->list("/b", &entries), ENOENT);
  EXPECT_EQ(system_->list("/a/file", &entries), ENOTDIR);
}

TEST_F(CounterSystemTest, FindsFilesOnly) {
  EXPECT_EQ(system_->find("/a/file"), 0);
  EXPECT_EQ(system_->find("/a/inner"), ENOENT);
  EXPECT_EQ(system_->find("/a/none"), ENOENT);
}

TEST_F(CounterSystemTest, TellsOfLinksThatLeadToThemselves) {
  fs::create_symlink("loop", root_ / "a/loop");
  std::vector<DirectoryEntry> entries;
  std::string content;
  EXPECT_EQ(system_->find("/a/loop"), ELOOP);
  EXPECT_EQ(system_->list("/a/loop", &entries), ELOOP);
  EXPECT_EQ(system_->read("/a/loop", &content), ELOOP);
}

TEST_F(CounterSystemTest, ReadsFilesOfAnyLength) {
  std::string content = "before";
  EXPECT_EQ(system_->read("/a/file", &content), 0);
  EXPECT_EQ(content, "12\n");
  write("empty", "");
  EXPECT_EQ(system_->read("/empty", &content), 0);
  EXPECT_EQ(content, "");
  for (const std::size_t length : {std::size_t{4096}, std::size_t{4097}, std::size_t{1024 * 1024}}) {
    write("long", std::string(length, 'x'));
    EXPECT_EQ(system_->read("/long", &content), 0);
    EXPECT_EQ(content.size(), length);
  }
  write("long", std::string(1024 * 1024 + 4097, 'x'));
  EXPECT_EQ(system_->read("/long", &content), EFBIG);
}

TEST_F(CounterSystemTest, TellsWhyAFileCannotBeRead) {
  std::string content;
  EXPECT_EQ(system_->read("/none", &content), ENOENT);
  EXPECT_EQ(system_->read("/a", &content), EISDIR);
}

TEST_F(CounterSystemTest, DoesNotWaitForAWriter) {
  ASSERT_EQ(::mkfifo((root_ / "pipe").c_str(), 0600), 0);
  std::string content;
  EXPECT_EQ(system_->read("/pipe", &content), 0);
  EXPECT_EQ(content, "");
}

TEST_F(CounterSystemTest, TellsFilesForNobodyFromThoseForOthers) {
  if (::geteuid() == 0) GTEST_SKIP() << "root may read everything";
  std::string content;
  fs::permissions(root_ / "a/file", fs::perms::owner_write);
  EXPECT_EQ(system_->read("/a/file", &content), EINVAL);
  fs::permissions(root_ / "a/file", fs::perms::group_read);
  EXPECT_EQ(system_->read("/a/file", &content), EACCES);
}

perf_event_attr lastAttributes;
int lastProcessor = 0;

int openRecorded(perf_event_attr* attributes, int process, int processor, int group, unsigned long flags) {
  lastAttributes = *attributes;
  lastProcessor = processor;
  EXPECT_EQ(process, -1);
  EXPECT_EQ(group, -1);
  EXPECT_EQ(flags, static_cast<unsigned long>(PERF_FLAG_FD_CLOEXEC));
  return ::open("/dev/null", O_RDONLY | O_CLOEXEC);
}

int openRefused(perf_event_attr* /*attributes*/, int /*process*/, int /*processor*/, int /*group*/,
                unsigned long /*flags*/) {
  errno = EACCES;
  return -1;
}

TEST(SystemCounters, CountTracepointsOfAllProcesses) {
  FileDescriptor counter;
  EXPECT_EQ(systemCounters({}, openRecorded)->openTracepoint(1234, 3, &counter), 0);
  EXPECT_TRUE(counter);
  EXPECT_EQ(lastAttributes.type, static_cast<std::uint32_t>(PERF_TYPE_TRACEPOINT));
  EXPECT_EQ(lastAttributes.size, sizeof(perf_event_attr));
  EXPECT_EQ(lastAttributes.config, 1234U);
  EXPECT_EQ(lastAttributes.disabled, 0U);
  EXPECT_EQ(lastProcessor, 3);
  EXPECT_EQ(systemCounters({}, openRefused)->openTracepoint(1234, 3, &counter), EACCES);
  EXPECT_FALSE(counter);
}

TEST(SystemCounters, AskTheKernelItself) {
  // The error depends on permissions and on tracefs, but there must be no counter.
  FileDescriptor counter;
  EXPECT_NE(systemCounters()->openTracepoint(0xFFFFFFFFFFFF, 0, &counter), 0);
  EXPECT_FALSE(counter);
}

}  // namespace
}  // namespace quazor
