#include "host/system/output_file.h"

#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <iterator>
#include <string>
#include <string_view>

namespace quazor {
namespace {

namespace fs = std::filesystem;

std::size_t entriesIn(const fs::path& directory) {
  return static_cast<std::size_t>(std::distance(fs::directory_iterator(directory), fs::directory_iterator()));
}

// The reason why the file cannot be written; empty if nothing was thrown.
template <class Call>
std::string problemOf(const fs::path& file, const Call& call) {
  const std::string beginning = "the output file '" + file.string() + "' cannot be written: ";
  try {
    call();
  } catch (const CommandError& problem) {
    const std::string text = problem.what();
    EXPECT_EQ(problem.code(), ExitCode::kCannotWrite);
    EXPECT_EQ(text.substr(0, beginning.size()), beginning);
    return text.substr(std::min(text.size(), beginning.size()));
  }
  return {};
}

std::string writingOf(const fs::path& file, std::string_view text) {
  return problemOf(file, [&] { writeOutputFile(file, text); });
}

std::string validationOf(const fs::path& file) {
  return problemOf(file, [&] { validateOutputFile(file); });
}

class OutputFileTest : public testing::Test {
 protected:
  TestDirectory directory_;
};

TEST_F(OutputFileTest, WritesANewFileAndNothingElse) {
  EXPECT_EQ(writingOf(directory_.path() / "out", "text"), "");
  EXPECT_EQ(directory_.read("out"), "text");
  EXPECT_EQ(entriesIn(directory_.path()), 1U);
}

TEST_F(OutputFileTest, ReplacesAFileAndKeepsItsPermissions) {
  const fs::path file = directory_.write("out", "a longer old text");
  fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
  EXPECT_EQ(writingOf(file, "new"), "");
  EXPECT_EQ(directory_.read("out"), "new");
  EXPECT_EQ(fs::status(file).permissions(), fs::perms::owner_read | fs::perms::owner_write);
  EXPECT_EQ(entriesIn(directory_.path()), 1U);
}

TEST_F(OutputFileTest, KeepsTheOwnerOfAFileThatItReplacesOrRefuses) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can make a file another's";
  constexpr uid_t kOther = 54'321;
  const fs::path file = directory_.write("out", "old");
  ASSERT_EQ(::chown(file.c_str(), kOther, kOther), 0);
  EXPECT_EQ(writingOf(file, "new"), "");
  struct stat status {};
  ASSERT_EQ(::stat(file.c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, kOther);
  EXPECT_EQ(status.st_gid, kOther);
  ASSERT_EQ(::chmod(directory_.path().c_str(), 0777), 0);
  ASSERT_EQ(::seteuid(kOther + 1), 0);
  const std::string validation = validationOf(file);
  const std::string writing = writingOf(file, "newer");
  ASSERT_EQ(::seteuid(0), 0);
  EXPECT_EQ(validation, "it belongs to another user; remove it first, or name another file");
  EXPECT_EQ(writing, validation);
  EXPECT_EQ(directory_.read("out"), "new");
}

TEST_F(OutputFileTest, WritesToADescriptorOfThisProcessAndDoesNotReplaceTheFileBehindIt) {
  const fs::path file = directory_.write("out", "before ");
  const int descriptor = ::open(file.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
  const fs::path name = "/dev/fd/" + std::to_string(descriptor);
  const fs::path link = directory_.path() / "link";
  fs::create_symlink(name, link);
  EXPECT_EQ(validationOf(name), "");
  EXPECT_EQ(writingOf(name, "one "), "");
  EXPECT_EQ(writingOf("/proc/self/fd/" + std::to_string(descriptor), "two "), "");
  EXPECT_EQ(writingOf(link, "three"), "");
  ASSERT_EQ(::write(descriptor, ".", 1), 1);
  EXPECT_EQ(directory_.read("out"), "before one two three.");
  ::close(descriptor);
  EXPECT_EQ(validationOf(name), "Bad file descriptor");
  EXPECT_EQ(writingOf(name, "four"), "Bad file descriptor");
}

TEST_F(OutputFileTest, RefusesADescriptorThatIsOnlyRead) {
  const int descriptor = ::open(directory_.write("out", "old").c_str(), O_RDONLY | O_CLOEXEC);
  const fs::path name = "/dev/fd/" + std::to_string(descriptor);
  EXPECT_EQ(validationOf(name), "Bad file descriptor");
  EXPECT_EQ(writingOf(name, "new"), "Bad file descriptor");
  ::close(descriptor);
  EXPECT_EQ(directory_.read("out"), "old");
}

TEST_F(OutputFileTest, FollowsALinkToAFile) {
  directory_.write("target", "old");
  fs::create_symlink("target", directory_.path() / "link");
  EXPECT_EQ(writingOf(directory_.path() / "link", "new"), "");
  EXPECT_EQ(directory_.read("target"), "new");
  EXPECT_TRUE(fs::is_symlink(directory_.path() / "link"));
}

TEST_F(OutputFileTest, WritesToWhatIsNoRegularFileAsItIs) {
  const fs::path pipe = directory_.path() / "pipe";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  const int reader = ::open(pipe.c_str(), O_RDONLY | O_NONBLOCK);
  ASSERT_GE(reader, 0);
  EXPECT_EQ(writingOf(pipe, "text"), "");
  char text[8] = {};
  EXPECT_EQ(::read(reader, text, sizeof text), 4);
  EXPECT_STREQ(text, "text");
  ::close(reader);
  EXPECT_TRUE(fs::is_fifo(pipe));
}

TEST_F(OutputFileTest, LeavesTheOldContentAndNothingElseWhenWritingFails) {
  const fs::path file = directory_.write("out", "old");
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
  const auto handler = std::signal(SIGXFSZ, SIG_IGN);
  const rlimit small{4, before.rlim_max};  // maximum file size in bytes
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  const std::string problem = writingOf(file, "longer than that");
  setrlimit(RLIMIT_FSIZE, &before);
  std::signal(SIGXFSZ, handler);
  EXPECT_EQ(problem, "File too large");
  EXPECT_EQ(directory_.read("out"), "old");
  EXPECT_EQ(entriesIn(directory_.path()), 1U);
}

TEST_F(OutputFileTest, TellsWhyItFailed) {
  EXPECT_EQ(writingOf(directory_.path() / "nowhere" / "out", "text"), "No such file or directory");
  EXPECT_EQ(writingOf(directory_.path(), "text"), "it is a directory");
  EXPECT_EQ(writingOf("/dev/full", "text"), "No space left on device");
  EXPECT_EQ(writingOf(directory_.write("file", "") / "out", "text"), "Not a directory");
}

TEST_F(OutputFileTest, SaysBeforehandWhatSpeaksAgainstAFile) {
  EXPECT_EQ(validationOf(directory_.path() / "out"), "");
  EXPECT_EQ(validationOf(directory_.write("file", "old")), "");
  EXPECT_EQ(validationOf("relative"), "");
  EXPECT_EQ(validationOf("/dev/null"), "");
  EXPECT_EQ(validationOf(directory_.path()), "it is a directory");
  EXPECT_EQ(validationOf(directory_.path() / "nowhere" / "out"), "No such file or directory");
  EXPECT_EQ(validationOf(directory_.path() / "file" / "out"), "Not a directory");
  fs::create_symlink("file", directory_.path() / "link");
  EXPECT_EQ(validationOf(directory_.path() / "link"), "");
  fs::create_symlink("itself", directory_.path() / "itself");
  EXPECT_EQ(validationOf(directory_.path() / "itself" / "out"), "Too many levels of symbolic links");
  EXPECT_EQ(directory_.read("file"), "old");
  EXPECT_EQ(entriesIn(directory_.path()), 3U);
}

}  // namespace
}  // namespace quazor
