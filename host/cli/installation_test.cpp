#include "host/cli/installation.h"

#include "host/testing/test_directory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

class InstallationTest : public testing::Test {
 protected:
  Installation installation() const { return Installation(directory_.path() / "bin" / "quazor"); }

  TestDirectory directory_;
  const std::filesystem::path prefix_ = directory_.path();
};

TEST_F(InstallationTest, FindsItsFilesFromThePlaceOfTheProgram) {
  EXPECT_EQ(installation().shippedPlugin(), prefix_ / QUAZOR_PLUGIN_DIRECTORY / "camera_sensor_diagnostics.so");
  EXPECT_EQ(installation().defaultProfile(), prefix_ / QUAZOR_DATA_DIRECTORY / "profiles/default.json");
  EXPECT_EQ(installation().defaultScenario(), prefix_ / QUAZOR_DATA_DIRECTORY / "scenarios/healthy.json");
  EXPECT_THAT(installation().explanations(), testing::ElementsAre(prefix_ / QUAZOR_DATA_DIRECTORY / "explanations"));
}

TEST_F(InstallationTest, TakesThePluginBesideTheProgramWhereNoneIsInstalled) {
  const std::filesystem::path beside = directory_.write("bin/camera_sensor_diagnostics.so", "");
  EXPECT_EQ(installation().shippedPlugin(), beside);
  const std::filesystem::path installed =
      directory_.write(std::filesystem::path(QUAZOR_PLUGIN_DIRECTORY) / "camera_sensor_diagnostics.so", "");
  EXPECT_EQ(installation().shippedPlugin(), installed);
}

TEST_F(InstallationTest, NamesThePluginsThatOthersHide) {
  const std::filesystem::path shipped =
      directory_.write(std::filesystem::path(QUAZOR_PLUGIN_DIRECTORY) / "camera_sensor_diagnostics.so", "");
  const std::filesystem::path alone = directory_.write(std::filesystem::path(QUAZOR_PLUGIN_DIRECTORY) / "one.so", "");
  const std::filesystem::path own = directory_.write("mine/plugins/camera_sensor_diagnostics.so", "");
  const Installation mine(prefix_ / "bin/quazor", {prefix_ / "mine", ""});
  EXPECT_THAT(mine.allPlugins(), testing::ElementsAre(alone, own));
  const std::vector<HiddenPlugin> hidden = mine.hiddenPlugins();
  ASSERT_EQ(hidden.size(), 1U);
  EXPECT_EQ(hidden[0].file, shipped);
  EXPECT_EQ(hidden[0].by, own);
  EXPECT_TRUE(installation().hiddenPlugins().empty());
}

TEST_F(InstallationTest, FindsAnInstalledScenarioByItsName) {
  const std::filesystem::path installed =
      directory_.write(std::filesystem::path(QUAZOR_DATA_DIRECTORY) / "scenarios/sync/refused.json", "{}");
  EXPECT_EQ(installation().scenario("sync/refused"), installed);
}

TEST_F(InstallationTest, FindsInstalledBindingsByTheirNames) {
  const std::filesystem::path bindings = std::filesystem::path(QUAZOR_DATA_DIRECTORY) / "bindings";
  const std::filesystem::path installed = directory_.write(bindings / "board.json", "{}");
  directory_.write(bindings / "binding.schema.json", "{}");
  EXPECT_EQ(installation().binding("board"), installed);
  EXPECT_EQ(installation().binding("other"), "other");
  EXPECT_EQ(installation().bindingNames(), std::vector<std::string>{"board"});
}

TEST_F(InstallationTest, PrefersAFileOfThatPathToAnInstalledScenario) {
  const std::filesystem::path file = directory_.write("mine", "{}");
  EXPECT_EQ(installation().scenario(file), file);
}

TEST_F(InstallationTest, PassesOverFolders) {
  const std::filesystem::path data = std::filesystem::path(QUAZOR_DATA_DIRECTORY);
  const std::filesystem::path installed = directory_.write(data / "profiles/strict.json", "{}");
  const std::filesystem::path plugin = directory_.write(std::filesystem::path(QUAZOR_PLUGIN_DIRECTORY) / "one.so", "");
  for (const char* folder : {"profiles/strict.json", "profiles/else.json", "plugins/one.so", "plugins/two.so"}) {
    std::filesystem::create_directories(prefix_ / "mine" / folder);
  }
  const Installation mine(prefix_ / "bin/quazor", {prefix_ / "mine", ""});
  EXPECT_EQ(mine.profile("strict"), installed);
  EXPECT_EQ(mine.profileSource()("strict", {}), installed);
  EXPECT_THAT(mine.profileNames(), testing::ElementsAre("strict"));
  EXPECT_THAT(mine.allPlugins(), testing::ElementsAre(plugin));
  EXPECT_TRUE(mine.hiddenPlugins().empty());
}

TEST_F(InstallationTest, LeavesAPathThatIsNothingAsItIs) {
  EXPECT_EQ(installation().scenario("sync/unknown"), "sync/unknown");
  EXPECT_EQ(installation().scenario("/sync/unknown"), "/sync/unknown");
}

}  // namespace
}  // namespace quazor
