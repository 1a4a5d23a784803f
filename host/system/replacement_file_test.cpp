#include "host/system/replacement_file.h"

#include "host/testing/test_directory.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <set>
#include <string>
#include <system_error>

namespace quazor {
namespace {

namespace fs = std::filesystem;

class ReplacementFileTest : public testing::Test {
 protected:
  // The name of the file that a process with this ID writes.
  static std::string nameBy(pid_t process) { return ".out.quazor-" + std::to_string(process) + ".tmp"; }

  std::set<std::string> names() const {
    std::set<std::string> all;
    for (const auto& entry : fs::directory_iterator(directory_.path())) all.insert(entry.path().filename().string());
    return all;
  }

  const TestDirectory directory_;
  const fs::path target_ = directory_.path() / "out";
};

TEST_F(ReplacementFileTest, ReplacesItsTargetOrLeavesNothing) {
  {
    ReplacementFile file(target_);
    EXPECT_EQ(names(), std::set<std::string>{nameBy(::getpid())});
  }
  EXPECT_EQ(names(), std::set<std::string>{});
  {
    ReplacementFile file(target_);
    ASSERT_EQ(::write(file.descriptor(), "text", 4), 4);
    EXPECT_EQ(file.putInPlace(false), 0);
  }
  EXPECT_EQ(names(), std::set<std::string>{"out"});
  EXPECT_EQ(directory_.read("out"), "text");
  {
    ReplacementFile file(target_);
    EXPECT_EQ(file.putInPlace(false), EEXIST);
    EXPECT_EQ(directory_.read("out"), "text");
    EXPECT_EQ(file.putInPlace(true), 0);
  }
  EXPECT_EQ(directory_.read("out"), "");
}

TEST_F(ReplacementFileTest, RemovesWhatKilledProcessesLeftBehind) {
  directory_.write(nameBy(::getpid()), "a process with the same ID");
  directory_.write(nameBy(1), "another");
  for (const char* const other :
       {".out.quazor-.tmp", ".out.quazor-1x.tmp", ".out.quazor-1.tmp2", "out.1.tmp", ".outer.quazor-1.tmp"}) {
    directory_.write(other, "of the user");
  }
  {
    const ReplacementFile file(target_);
    EXPECT_EQ(directory_.read(nameBy(::getpid())), "");
  }
  EXPECT_EQ(names(), (std::set<std::string>{".out.quazor-.tmp", ".out.quazor-1x.tmp", ".out.quazor-1.tmp2", "out.1.tmp",
                                            ".outer.quazor-1.tmp"}));
}

TEST_F(ReplacementFileTest, LeavesTheFileOfALivingProcessAlone) {
  const fs::path other = directory_.write(nameBy(1), "being written");
  const int descriptor = ::open(other.c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(::flock(descriptor, LOCK_EX), 0);
  { const ReplacementFile file(target_); }
  EXPECT_EQ(directory_.read(nameBy(1)), "being written");
  ::close(descriptor);
}

TEST_F(ReplacementFileTest, FailsWhereALivingProcessHasItsName) {
  const fs::path other = directory_.write(nameBy(::getpid()), "being written");
  const int descriptor = ::open(other.c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(::flock(descriptor, LOCK_EX), 0);
  EXPECT_THROW(ReplacementFile file(target_), std::system_error);
  EXPECT_EQ(directory_.read(nameBy(::getpid())), "being written");
  ::close(descriptor);
}

TEST_F(ReplacementFileTest, DoesNotWriteThroughALinkThatSomebodyPlanted) {
  directory_.write("precious", "precious");
  fs::create_symlink("precious", directory_.path() / nameBy(::getpid()));
  {
    ReplacementFile file(target_);
    ASSERT_EQ(::write(file.descriptor(), "text", 4), 4);
    EXPECT_EQ(file.putInPlace(true), 0);
  }
  EXPECT_EQ(directory_.read("precious"), "precious");
  EXPECT_EQ(names(), (std::set<std::string>{"out", "precious"}));
}

TEST_F(ReplacementFileTest, IsLockedWhileItExists) {
  const ReplacementFile file(target_);
  const int other = ::open((directory_.path() / nameBy(::getpid())).c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_GE(other, 0);
  EXPECT_NE(::flock(other, LOCK_EX | LOCK_NB), 0);
  ::close(other);
}

TEST_F(ReplacementFileTest, InheritsOwnerGroupAndPermissions) {
  struct stat replaced {};
  ASSERT_EQ(::stat(directory_.write("old", "").c_str(), &replaced), 0);
  replaced.st_mode = S_IFREG | 0640;
  const bool isRoot = ::geteuid() == 0;
  if (isRoot) {
    replaced.st_uid = 54'321;
    replaced.st_gid = 54'322;
  }
  ReplacementFile file(target_);
  ASSERT_EQ(file.inherit(replaced), 0);
  ASSERT_EQ(file.putInPlace(true), 0);
  struct stat status {};
  ASSERT_EQ(::stat(target_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0640U);
  EXPECT_EQ(status.st_uid, replaced.st_uid);
  EXPECT_EQ(status.st_gid, replaced.st_gid);
}

TEST_F(ReplacementFileTest, TakesPermissionsFromAGroupThatItCannotGive) {
  if (::geteuid() == 0) {
    // Root may give a file to any group, so act as another user in a folder of theirs.
    ASSERT_EQ(::chmod(directory_.path().c_str(), 0777), 0);
    ASSERT_EQ(::seteuid(54'321), 0);
  }
  int failureOfGroup = -1;
  int failureOfOwner = -1;
  struct stat made {};
  {
    ReplacementFile file(target_);
    struct stat replaced {};
    if (::fstat(file.descriptor(), &replaced) == 0) {
      replaced.st_gid = 54'399;
      replaced.st_mode = S_IFREG | 0674;
      failureOfGroup = file.inherit(replaced);
      failureOfOwner = ::fstat(file.descriptor(), &made);
      replaced.st_uid = 54'398;
      failureOfOwner = file.inherit(replaced);
    }
  }
  if (::getuid() == 0) {
    ASSERT_EQ(::seteuid(0), 0);
  }
  EXPECT_EQ(failureOfGroup, 0);
  EXPECT_EQ(made.st_mode & 07777U, 0604U);
  EXPECT_EQ(failureOfOwner, EPERM);
}

TEST_F(ReplacementFileTest, ThrowsWhereItCannotBeCreated) {
  try {
    const ReplacementFile file(directory_.path() / "missing" / "out");
    FAIL() << "it was created";
  } catch (const std::system_error& problem) {
    EXPECT_EQ(problem.code().value(), ENOENT);
  }
}

}  // namespace
}  // namespace quazor
