#include "host/run/plugin_scan.h"

#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/testing/test_descriptors.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_plugins.h"
#include "host/testing/test_refusals.h"
#include "host/testing/test_signals.h"
#include "host/testing/test_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

class PluginScanTest : public testing::Test {
 protected:
  static std::vector<Diagnostic> everything(const std::vector<Diagnostic>& catalogue) { return catalogue; }

  PluginScan scan(const std::vector<std::string>& plugins, const DiagnosticChoice& described = everything) {
    options_.plugins.clear();
    for (const std::string& name : plugins) options_.plugins.push_back(testPlugin(name));
    return scanPlugins(options_, signals_, described);
  }

  static std::vector<std::string> namesIn(const PluginScan& scan) {
    std::vector<std::string> names;
    for (const DescribedDiagnostic& one : scan.catalogue) names.push_back(one.diagnostic.name);
    return names;
  }

  static DescribedDiagnostic find(const PluginScan& scan, const std::string& name) {
    for (const DescribedDiagnostic& one : scan.catalogue) {
      if (one.diagnostic.name == name) return one;
    }
    ADD_FAILURE() << "there is no " << name;
    return {};
  }

  // Scans the plug-in Moody, whose mood changes after it was loaded. Returns the error of its description.
  std::string errorAfterChange(const char* mood) {
    std::optional<EnvironmentVariable> changed;
    const PluginScan all = scan({"moody"}, [&](const std::vector<Diagnostic>& catalogue) {
      changed.emplace("MOODY", mood);
      return catalogue;
    });
    EXPECT_THAT(all.failed, IsEmpty());
    EXPECT_THAT(namesIn(all), ElementsAre("Moody"));
    return textOf(all.catalogue[0].description.error);
  }

  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
  IsolationOptions options_;
};

TEST_F(PluginScanTest, TellsWhatThePluginsHaveWithoutLoadingThemHere) {
  const std::size_t before = QZLab::defaultLab().registrations().size();
  const PluginScan all = scan({"working", "experiments"});
  EXPECT_EQ(QZLab::defaultLab().registrations().size(), before);
  EXPECT_THAT(all.failed, IsEmpty());
  EXPECT_FALSE(all.interrupted);
  EXPECT_THAT(namesIn(all), ElementsAre("Fake.One", "Fake.Two", "Broken.Nothing", "Broken.Factory",
                                        "Broken.Description", "FakeExperiment", "NoExperiment", "ThrowingFactory",
                                        "UndescribableExperiment", "Alone.Images", "Alone.Counts", "Alone.Nothing"));
  const DescribedDiagnostic& one = all.catalogue[0];
  EXPECT_EQ(one.diagnostic.summary, "Does as it is told.");
  EXPECT_EQ(one.diagnostic.analysisName, "FakeAnalysis");
  EXPECT_EQ(one.diagnostic.makeExperiment, nullptr);
  EXPECT_EQ(one.description.error, nullptr);
  EXPECT_TRUE(one.description.experiment.parameters().contains("duration"));
  EXPECT_EQ(textOf(all.catalogue[3].description.error),
            "QuazorHostErrorDomain 2 describing ThrowingFactory threw an exception: factory threw");
  EXPECT_TRUE(all.catalogue[5].diagnostic.experimentOnly);
  EXPECT_THAT(all.catalogue[5].diagnostic.usedBy, ElementsAre("Fake.One", "Fake.Two"));
}

TEST_F(PluginScanTest, AsksOnlyForTheDescriptionsThatAreWanted) {
  const PluginScan some =
      scan({"working"}, [](const std::vector<Diagnostic>& catalogue) { return std::vector<Diagnostic>{catalogue[1]}; });
  EXPECT_EQ(some.catalogue.size(), 9U);
  EXPECT_EQ(some.catalogue[0].description.experiment.summary(), "");
  EXPECT_EQ(some.catalogue[1].description.experiment.summary(), "Measures what it is told to.");
  EXPECT_EQ(some.catalogue[3].description.error, nullptr);
  for (std::size_t i = 0; i < some.catalogue.size(); ++i) EXPECT_EQ(some.catalogue[i].description.isAsked, i == 1) << i;
}

TEST_F(PluginScanTest, ThrowsTheRefusalsOfTheChoice) {
  const auto refuse = [](const std::vector<Diagnostic>&) -> std::vector<Diagnostic> {
    throw CommandError(ExitCode::kUsage, "not that");
  };
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [&] { return scan({"working"}, refuse); }), "not that");
}

TEST_F(PluginScanTest, TellsWhichPluginsADiagnosticNeeds) {
  const PluginScan all = scan({"working", "combining", "experiments"});
  const auto pluginsOf = [&all](const std::string& name) {
    for (const DescribedDiagnostic& one : all.catalogue) {
      if (one.diagnostic.name == name) return one.diagnostic.plugins;
    }
    return std::vector<std::filesystem::path>();
  };
  EXPECT_THAT(pluginsOf("Fake.One"), ElementsAre(testPlugin("working")));
  EXPECT_THAT(pluginsOf("FakeExperiment"), ElementsAre(testPlugin("working")));
  EXPECT_THAT(pluginsOf("Combined"), ElementsAre(testPlugin("working"), testPlugin("combining")));
  EXPECT_THAT(pluginsOf("Combining.Own"), ElementsAre(testPlugin("combining")));
  EXPECT_THAT(pluginsOf("Alone.Images"), ElementsAre(testPlugin("experiments")));
}

TEST_F(PluginScanTest, ThrowsTheRefusalsOfTheLoader) {
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead,
                      [&] {
                        scan({"working", "empty"});
                      }),
            "the plug-in '" + testPlugin("empty").string() + "' registers nothing");
}

TEST_F(PluginScanTest, LeavesOutAPluginThatEndsItsProcessWhileItIsLoaded) {
  const PluginScan rest = scan({"experiments", "fatal", "analysis"});
  EXPECT_THAT(namesIn(rest), ElementsAre("Alone.Images", "Alone.Counts", "Alone.Nothing"));
  ASSERT_EQ(rest.failed.size(), 1U);
  EXPECT_EQ(rest.failed[0].file, testPlugin("fatal"));
  EXPECT_EQ(textOf(rest.failed[0].error), "QuazorHostErrorDomain 6 loading the plug-in '" +
                                              testPlugin("fatal").string() +
                                              "' crashed: its process was terminated by signal 6 (SIGABRT)");
}

TEST_F(PluginScanTest, IsEmptyWhenNoPluginCanBeLoaded) {
  const PluginScan none = scan({"fatal"});
  EXPECT_THAT(none.catalogue, IsEmpty());
  EXPECT_EQ(none.failed.size(), 1U);
}

TEST_F(PluginScanTest, EndsALoadingThatTakesTooLong) {
  options_.deadlines = {{Stage::kLoad, 50ms}};
  const EnvironmentVariable way("FATAL_PLUGIN", "hang");
  const PluginScan none = scan({"fatal"});
  ASSERT_EQ(none.failed.size(), 1U);
  EXPECT_THAT(textOf(none.failed[0].error),
              testing::AllOf(testing::StartsWith("QuazorHostErrorDomain 8 loading the plug-in '"),
                             testing::EndsWith("exceeded its deadline of 0.05 s")));
}

TEST_F(PluginScanTest, LeavesOutAPluginThatWritesToItsProcessConnection) {
  constexpr const char* kLines[] = {
      "=garbage",
      "=5",
      R"(={"says":5})",
      R"(={"says":"strange"})",
      R"(={"says":"refused","code":0,"text":"nothing to do"})",
      R"(={"says":"registered","registrations":[]})",
      R"(=00000000000000000000000000000000{"says":"registered","registrations":[]})",
  };
  for (const char* line : kLines) {
    const EnvironmentVariable way("FATAL_PLUGIN", line);
    const PluginScan rest = scan({"fatal", "experiments"});
    ASSERT_EQ(rest.failed.size(), 1U) << line;
    EXPECT_EQ(textOf(rest.failed[0].error), "QuazorHostErrorDomain 9 loading the plug-in '" +
                                                testPlugin("fatal").string() +
                                                "' closed or overwrote its process's connection to quazor")
        << line;
    EXPECT_THAT(namesIn(rest), ElementsAre("Alone.Images", "Alone.Counts", "Alone.Nothing")) << line;
  }
}

TEST_F(PluginScanTest, GoesOnBehindWhatEndsItsProcessWhileItIsDescribed) {
  const PluginScan all = scan({"undescribable", "unruly"});
  EXPECT_THAT(all.failed, IsEmpty());
  ASSERT_THAT(namesIn(all), ElementsAre("Fatal", "Unruly", "FatalExperiment", "UnrulyExperiment"));
  EXPECT_EQ(textOf(all.catalogue[0].description.error),
            "QuazorHostErrorDomain 7 describing Fatal ended its own process with exit code 4");
  EXPECT_EQ(all.catalogue[1].description.error, nullptr);
  EXPECT_TRUE(all.catalogue[1].description.experiment.parameters().contains("way"));
  EXPECT_THAT(textOf(all.catalogue[2].description.error),
              HasSubstr("describing FatalExperiment ended its own process"));
  EXPECT_EQ(all.catalogue[3].description.error, nullptr);
}

TEST_F(PluginScanTest, EndsWhenTheUserInterruptsIt) {
  const EnvironmentVariable way("FATAL_PLUGIN", "hang");
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  const PluginScan none = scan({"fatal", "working"});
  EXPECT_TRUE(none.interrupted);
}

TEST_F(PluginScanTest, LeavesOutWhatNeedsAPluginThatCouldNotBeLoaded) {
  const PluginScan rest = scan({"fatal", "combining"});
  EXPECT_EQ(rest.failed.size(), 1U);
  EXPECT_THAT(namesIn(rest), ElementsAre("Combining.Own", "CombiningExperiment"));
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead,
                      [&] {
                        return scan({"experiments", "combining"});
                      }),
            "the plug-in '" + testPlugin("combining").string() +
                "' registers the diagnostic 'Combined' with the experiment 'FakeExperiment', which is not registered");
}

TEST_F(PluginScanTest, ChecksEveryFileBeforeItLoadsOne) {
  options_.plugins = {testPlugin("fatal"), "nothing.so"};
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { return scanPlugins(options_, signals_, everything); }),
            "the plug-in 'nothing.so' does not exist");
}

TEST_F(PluginScanTest, LoadsAFileThatIsListedTwiceOnce) {
  const PluginScan none = scan({"fatal", "fatal"});
  EXPECT_EQ(none.failed.size(), 1U);
  EXPECT_THAT(namesIn(scan({"moody", "experiments", "moody"})),
              ElementsAre("Moody", "Alone.Images", "Alone.Counts", "Alone.Nothing"));
}

TEST_F(PluginScanTest, GivesEachPluginADeadlineOfItsOwn) {
  options_.deadlines = {{Stage::kLoad, 3500ms}};  // less than both plug-ins need together
  const EnvironmentVariable moody("MOODY", "slow");
  const EnvironmentVariable sullen("SULLEN", "slow, combining");
  const PluginScan all = scan({"moody", "sullen"});
  EXPECT_THAT(all.failed, IsEmpty());
  ASSERT_THAT(namesIn(all), ElementsAre("Both", "Moody", "Sullen"));
  for (const DescribedDiagnostic& one : all.catalogue) EXPECT_EQ(textOf(one.description.error), "");
}

TEST_F(PluginScanTest, BlamesNoPluginForAnotherThatAbortsLater) {
  const EnvironmentVariable moody("MOODY", "ticking");
  const EnvironmentVariable sullen("SULLEN", "slow");
  const PluginScan all =
      scan({"moody", "sullen"}, [](const std::vector<Diagnostic>&) { return std::vector<Diagnostic>(); });
  EXPECT_THAT(all.failed, IsEmpty());
  EXPECT_THAT(namesIn(all), ElementsAre("Moody", "Sullen"));
}

TEST_F(PluginScanTest, FindsThePluginsAfterOneHasChangedTheDirectory) {
  const std::filesystem::path before = std::filesystem::current_path();
  std::filesystem::current_path(QUAZOR_TEST_PLUGINS);
  const EnvironmentVariable moody("MOODY", "wandering");
  const EnvironmentVariable sullen("SULLEN", "combining");
  options_.plugins = {"moody_plugin.so", "./sullen_plugin.so"};
  const PluginScan all = scanPlugins(options_, signals_, everything);
  std::filesystem::current_path(before);
  ASSERT_THAT(namesIn(all), ElementsAre("Both", "Moody", "Sullen"));
  EXPECT_THAT(all.catalogue[0].diagnostic.plugins, ElementsAre("moody_plugin.so", "./sullen_plugin.so"));
  EXPECT_EQ(textOf(all.catalogue[0].description.error), "");
}

TEST_F(PluginScanTest, LeavesOutAPluginWhoseProcessCrashesAfterIt) {
  const EnvironmentVariable mood("MOODY", "mortal");
  const PluginScan rest = scan({"moody", "experiments"});
  ASSERT_EQ(rest.failed.size(), 1U);
  EXPECT_EQ(textOf(rest.failed[0].error), "QuazorHostErrorDomain 6 loading the plug-in '" +
                                              testPlugin("moody").string() +
                                              "' crashed: its process was terminated by signal 31 (SIGSYS)");
  EXPECT_THAT(namesIn(rest), ElementsAre("Alone.Images", "Alone.Counts", "Alone.Nothing"));
}

TEST_F(PluginScanTest, EndsADescriptionInAnErrorWhereItsPluginNoLongerLoads) {
  const std::string loading = "loading the plug-in '" + testPlugin("moody").string() + "' ";
  options_.deadlines = {{Stage::kLoad, 200ms}};
  EXPECT_EQ(errorAfterChange("hanging"), "QuazorHostErrorDomain 8 " + loading + "exceeded its deadline of 0.2 s");
  options_.deadlines.clear();
  EXPECT_EQ(errorAfterChange("aborting"),
            "QuazorHostErrorDomain 6 " + loading + "crashed: its process was terminated by signal 6 (SIGABRT)");
  EXPECT_EQ(errorAfterChange("mute"),
            "QuazorHostErrorDomain 3 the plug-in '" + testPlugin("moody").string() + "' registers nothing");
  EXPECT_EQ(errorAfterChange("renamed"), "QuazorHostErrorDomain 3 the plug-ins no longer register Moody");
  EXPECT_EQ(errorAfterChange("calm"), "");
}

TEST_F(PluginScanTest, EndsADescriptionInAnErrorIfItsProcessCrashesAfterIt) {
  EXPECT_EQ(errorAfterChange("described to death"),
            "QuazorHostErrorDomain 6 describing Moody crashed: its process was terminated by signal 31 (SIGSYS)");
}

TEST_F(PluginScanTest, ListsAPluginThatGetsNoProcess) {
  const FewDescriptors few;
  const PluginScan none = scan({"working", "experiments"});
  EXPECT_THAT(none.catalogue, IsEmpty());
  ASSERT_EQ(none.failed.size(), 2U);
  EXPECT_EQ(textOf(none.failed[1].error), "QuazorHostErrorDomain 12 the process for loading the plug-in '" +
                                              testPlugin("experiments").string() +
                                              "' could not be created: making a pipe: Too many open files");
}

TEST_F(PluginScanTest, EndsADescriptionThatGetsNoProcessInAnError) {
  std::optional<FewDescriptors> few;
  const PluginScan all = scan({"working", "experiments"}, [&few](const std::vector<Diagnostic>& catalogue) {
    few.emplace();
    return std::vector<Diagnostic>{catalogue[0], catalogue[1]};
  });
  EXPECT_THAT(all.failed, IsEmpty());
  EXPECT_EQ(all.catalogue.size(), 12U);
  EXPECT_EQ(
      textOf(find(all, "Fake.Two").description.error),
      "QuazorHostErrorDomain 12 the process for describing Fake.Two could not be created: making a pipe: Too many "
      "open files");
  EXPECT_FALSE(find(all, "Alone.Images").description.isAsked);
}

TEST_F(PluginScanTest, DescribesMoreOfACatalogue) {
  PluginScan all = scan({"working", "experiments"}, [](const auto&) { return std::vector<Diagnostic>(); });
  for (const DescribedDiagnostic& one : all.catalogue) EXPECT_FALSE(one.description.isAsked);
  EXPECT_TRUE(describeIsolated(options_, signals_, {find(all, "Fake.Two").diagnostic}, all.catalogue));
  EXPECT_EQ(find(all, "Fake.Two").description.experiment.summary(), "Measures what it is told to.");
  EXPECT_FALSE(find(all, "Fake.One").description.isAsked);
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  EXPECT_FALSE(describeIsolated(options_, signals_, {find(all, "Fake.One").diagnostic}, all.catalogue));
}

}  // namespace
}  // namespace quazor
