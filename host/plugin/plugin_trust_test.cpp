#include "host/plugin/plugin_trust.h"

#include "base/text/input_error.h"
#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"
#include "tests/support/thrown_text.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <string>

namespace quazor {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::StartsWith;

constexpr uid_t kStranger = 54'321;

// Changes the mode of a file as chmod(1) does.
void setMode(const fs::path& file, mode_t mode) { ASSERT_EQ(::chmod(file.c_str(), mode), 0) << file; }

class PluginTrustTest : public testing::Test {
 protected:
  PluginTrustTest() : file_(directory_.write("folder/plugin.so", "")), folder_(file_.parent_path()) {
    setMode(directory_.path(), 0755);
    setMode(folder_, 0755);
    setMode(file_, 0644);
  }

  // Empty if the file is trusted.
  static std::string problemOf(const fs::path& file) {
    return thrownText<InputError>([&] { validateTrust(file, trustedOwners()); }, "");
  }

  const TestDirectory directory_;
  const fs::path file_;
  const fs::path folder_;
};

TEST_F(PluginTrustTest, TrustsWhatOnlyTheUserMayChange) {
  EXPECT_EQ(problemOf(file_), "");
  EXPECT_EQ(problemOf("/proc/self/exe"), "");
  for (const mode_t mode : {0600U, 0444U, 0755U, 04755U}) {
    setMode(file_, mode);
    EXPECT_EQ(problemOf(file_), "") << mode;
  }
}

TEST_F(PluginTrustTest, RefusesAFileThatItsGroupOrEverybodyMayWrite) {
  setMode(file_, 0664);
  EXPECT_EQ(problemOf(file_), "may be changed by others: its group may write to '" + file_.string() +
                                  "' (mode 0664); this ends it: chmod g-w '" + file_.string() + "'");
  setMode(file_, 0646);
  EXPECT_EQ(problemOf(file_), "may be changed by others: everybody may write to '" + file_.string() +
                                  "' (mode 0646); this ends it: chmod go-w '" + file_.string() + "'");
  setMode(file_, 01646);  // on a file the sticky bit protects nothing
  EXPECT_THAT(problemOf(file_), HasSubstr("(mode 1646)"));
}

TEST_F(PluginTrustTest, RefusesAFolderAboveThatOthersMayWriteExceptASticky) {
  setMode(folder_, 0775);
  EXPECT_THAT(problemOf(file_), HasSubstr("its group may write to '" + folder_.string() + "' (mode 0775)"));
  setMode(folder_, 0777);
  EXPECT_THAT(problemOf(file_), HasSubstr("everybody may write to '" + folder_.string() + "' (mode 0777)"));
  setMode(folder_, 01777);
  EXPECT_EQ(problemOf(file_), "");
  setMode(directory_.path(), 0777);
  EXPECT_THAT(problemOf(file_), HasSubstr("everybody may write to '" + directory_.path().string() + "' (mode 0777)"));
}

TEST_F(PluginTrustTest, NamesEveryPlaceInTheCommandThatMendsIt) {
  setMode(folder_, 0775);
  setMode(file_, 0664);
  EXPECT_THAT(problemOf(file_), testing::EndsWith("chmod g-w '" + folder_.string() + "' '" + file_.string() + "'"));
  const fs::path odd = directory_.write("it's odd/plugin.so", "");
  setMode(odd.parent_path(), 0777);
  EXPECT_THAT(problemOf(odd), testing::EndsWith("chmod go-w '" + directory_.path().string() + "/it'\\''s odd'"));
}

TEST_F(PluginTrustTest, FollowsLinksAndChecksTheirFoldersToo) {
  const fs::path links = directory_.path() / "links";
  fs::create_directory(links);
  fs::create_symlink("../folder/plugin.so", links / "relative.so");
  fs::create_symlink(folder_, links / "absolute");
  EXPECT_EQ(problemOf(links / "relative.so"), "");
  EXPECT_EQ(problemOf(links / "absolute" / ".." / "folder" / "." / "plugin.so"), "");
  setMode(links, 0777);
  for (const fs::path& file : {links / "relative.so", links / "absolute" / "plugin.so"}) {
    EXPECT_THAT(problemOf(file), HasSubstr("'" + links.string() + "' (mode 0777)")) << file;
  }
  setMode(links, 0755);
  setMode(folder_, 0777);
  for (const fs::path& file : {links / "relative.so", links / "absolute" / "plugin.so"}) {
    EXPECT_THAT(problemOf(file), HasSubstr("'" + folder_.string() + "' (mode 0777)")) << file;
  }
}

TEST_F(PluginTrustTest, LeavesAPathThatLeadsNowhereToTheLoader) {
  EXPECT_EQ(problemOf(directory_.path() / "missing.so"), "");
  fs::create_symlink("loop.so", directory_.path() / "loop.so");
  EXPECT_EQ(problemOf(directory_.path() / "loop.so"), "");
}

TEST_F(PluginTrustTest, RefusesAFileToWhichNoPathLeads) {
  const int descriptor = ::open(file_.c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_GE(descriptor, 0);
  fs::remove(file_);
  EXPECT_THAT(problemOf("/proc/self/fd/" + std::to_string(descriptor)), StartsWith("cannot be followed to its place"));
  ::close(descriptor);
}

TEST_F(PluginTrustTest, TakesARelativePathFromTheWorkingFolder) {
  const fs::path before = fs::current_path();
  fs::current_path(folder_);
  EXPECT_EQ(problemOf("plugin.so"), "");
  setMode(folder_, 0777);
  EXPECT_THAT(problemOf("plugin.so"), HasSubstr("'" + folder_.string() + "' (mode 0777)"));
  fs::current_path(before);
}

TEST_F(PluginTrustTest, RefusesTheFilesOfStrangers) {
  const std::vector<uid_t> owners = trustedOwners();
  EXPECT_THAT(owners, testing::IsSupersetOf({uid_t{0}, ::geteuid()}));
  const auto strangersProblem = [this](const fs::path& place) {
    if (::geteuid() == 0) {
      EXPECT_EQ(::lchown(place.c_str(), kStranger, 0), 0) << place;
      return problemOf(file_);
    }
    // Only root may give a file away; everybody else is a stranger to those whom root alone suffices.
    return thrownText<InputError>([&] { validateTrust(file_, {0}); }, "");
  };
  const std::string stranger = std::to_string(::geteuid() == 0 ? kStranger : ::geteuid());
  for (const fs::path& place : {file_, folder_, directory_.path()}) {
    EXPECT_THAT(strangersProblem(place),
                testing::AllOf(StartsWith("may be changed by others: '"),
                               HasSubstr("' belongs to user " + stranger + ", who is neither")));
  }
  EXPECT_THAT(strangersProblem(directory_.path()), HasSubstr("'" + directory_.path().string() + "' belongs to user"));
}

TEST_F(PluginTrustTest, RefusesTheLinkOfAStranger) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root may give a link away";
  const fs::path link = directory_.path() / "link.so";
  fs::create_symlink(file_, link);
  EXPECT_EQ(problemOf(link), "");
  ASSERT_EQ(::lchown(link.c_str(), kStranger, 0), 0);
  EXPECT_THAT(problemOf(link), HasSubstr("'" + link.string() + "' belongs to user 54321"));
}

TEST_F(PluginTrustTest, RequiresItOfEveryPlugin) {
  const fs::path other = directory_.write("other.so", "");
  setMode(other, 0666);
  EXPECT_NO_THROW(requireTrustedPlugins({file_}));
  try {
    requireTrustedPlugins({file_, other});
    FAIL() << "it was not refused";
  } catch (const CommandError& refusal) {
    EXPECT_EQ(refusal.code(), ExitCode::kCannotRead);
    EXPECT_THAT(refusal.what(), StartsWith("the plug-in '" + other.string() + "' may be changed by others: everybody"));
  }
}

}  // namespace
}  // namespace quazor
