// The registrations of the plug-in, loaded as the shipped shared object.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "contract/lab.h"
#include "platform/platform.h"
#include "tests/support/shipped_scenario.h"

#include <dlfcn.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <iterator>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Kind = QZLab::Kind;

const struct Row {
  Kind kind;
  std::string_view name;
  std::string_view summary = "";
  std::string_view experiment = "";
  std::string_view analysis = "";
} kCatalogue[] = {
    {Kind::kExperiment, "TesselTelemonExperiment"},
    {Kind::kAnalysis, "TesselTelemonAnalysis"},
    {Kind::kDiagnostic, "TesselTelemonDiagnostic",
     "Measure the important Tessel Telemons and ensure they are all present.", "TesselTelemonExperiment",
     "TesselTelemonAnalysis"},
    {Kind::kExperiment, "TesselFaultExperiment"},
    {Kind::kAnalysis, "TesselFaultAnalysis"},
    {Kind::kDiagnostic, "TesselFaultDiagnostic",
     "Perform a 30fps Dense-Intereleaved stream and capture K42ISP Telemon delta.", "TesselFaultExperiment",
     "TesselFaultAnalysis"},
    {Kind::kExperiment, "CameraSyncExperiment.Back"},
    {Kind::kAnalysis, "CameraSyncAnalysis.Back"},
    {Kind::kDiagnostic, "CameraSyncDiagnostic.Back", "Sync the back cameras and ensure each camera produces a frame.",
     "CameraSyncExperiment.Back", "CameraSyncAnalysis.Back"},
    {Kind::kExperiment, "CameraSyncExperiment.Front"},
    {Kind::kAnalysis, "CameraSyncAnalysis.Front"},
    {Kind::kDiagnostic, "CameraSyncDiagnostic.Front", "Sync the front cameras and ensure each camera produces a frame.",
     "CameraSyncExperiment.Front", "CameraSyncAnalysis.Front"},
};

class Catalogue : public ::testing::Test {
 protected:
  // Loads the plug-in, which registers once with this process's lab and stays loaded.
  static void SetUpTestSuite() {
    registeredBefore = QZLab::defaultLab().registrations().size();
    ASSERT_NE(dlopen(QUAZOR_PLUGIN, RTLD_NOW | RTLD_LOCAL), nullptr) << dlerror();
    Platform platform = SimulatedPhone(shippedScenario("healthy"), PhoneTime::kVirtual, 0).platform();
    installPlatform(std::move(platform));
  }

  // Runs a camera experiment and returns its changes of one property as "OBJECT KEY = VALUE".
  static std::vector<std::string> settingsOf(std::string_view experiment, std::string_view property) {
    SimulatedPhone phone(shippedScenario("healthy"), PhoneTime::kVirtual, 0);
    std::vector<std::string> settings;
    phone.observeCalls([&](const PlatformCall& call) {
      if (call.detail.starts_with(std::string(property) + " = ")) settings.push_back(call.object + ' ' + call.detail);
    });
    const Platform before = installedPlatform();
    installPlatform(phone.platform());
    const auto made = QZLab::defaultLab().find(Kind::kExperiment, experiment)->makeExperiment();
    EXPECT_TRUE(made->setupWithParameters({{"duration", 2.0}}, nullptr, nullptr));
    EXPECT_NE(made->run(nullptr), nullptr);
    installPlatform(before);
    return settings;
  }

  static inline std::size_t registeredBefore = 0;
};

TEST_F(Catalogue, HasTwelveEntriesInOrder) {
  EXPECT_EQ(registeredBefore, 0U);
  const auto& registrations = QZLab::defaultLab().registrations();
  ASSERT_EQ(registrations.size(), std::size(kCatalogue));
  for (std::size_t i = 0; i < registrations.size(); ++i) {
    SCOPED_TRACE(i);
    EXPECT_EQ(registrations[i].kind, kCatalogue[i].kind);
    EXPECT_EQ(registrations[i].name, kCatalogue[i].name);
    EXPECT_EQ(registrations[i].summary, kCatalogue[i].summary);
    EXPECT_EQ(registrations[i].experimentName, kCatalogue[i].experiment);
    EXPECT_EQ(registrations[i].analysisName, kCatalogue[i].analysis);
  }
  EXPECT_THAT(QZLab::defaultLab().refusedNames(), testing::IsEmpty());
}

TEST_F(Catalogue, MakesANewInstanceOnEveryCall) {
  for (const QZLab::Registration& entry : QZLab::defaultLab().registrations()) {
    SCOPED_TRACE(entry.name);
    if (entry.kind == Kind::kExperiment) {
      const auto first = entry.makeExperiment();
      ASSERT_NE(first, nullptr);
      EXPECT_NE(first, entry.makeExperiment());
    } else if (entry.kind == Kind::kAnalysis) {
      const auto first = entry.makeAnalysis();
      ASSERT_NE(first, nullptr);
      EXPECT_NE(first, entry.makeAnalysis());
    }
  }
}

TEST_F(Catalogue, GivesEveryExperimentAndAnalysisOfAGroupTheSamePorts) {
  for (const std::string_view group : {"Back", "Front"}) {
    const std::string suffix = "." + std::string(group);
    SimulatedPhone phone(shippedScenario("healthy"), PhoneTime::kVirtual, 0);
    const Platform before = installedPlatform();
    installPlatform(phone.platform());
    QZLab& lab = QZLab::defaultLab();
    const auto experiment = lab.find(Kind::kExperiment, "CameraSyncExperiment" + suffix)->makeExperiment();
    ASSERT_TRUE(experiment->setupWithParameters({{"duration", 2.0}}, nullptr, nullptr));
    const auto result = experiment->run(nullptr);
    ASSERT_NE(result, nullptr);
    const auto analysis = lab.find(Kind::kAnalysis, "CameraSyncAnalysis" + suffix)->makeAnalysis();
    const auto judged = analysis->analyzeExperimentResult(*result, nullptr);
    ASSERT_NE(judged, nullptr);
    EXPECT_EQ(judged->measuredResults().size(), group == "Back" ? 9U : 6U);  // three per camera
    installPlatform(before);
  }
}

TEST_F(Catalogue, ConfiguresTheBackCameras) {
  EXPECT_THAT(settingsOf("CameraSyncExperiment.Back", "FormatIndex"),
              testing::ElementsAre("back-wide FormatIndex = 16", "back-tele FormatIndex = 14",
                                   "back-super-wide FormatIndex = 9"));
  const auto rates = settingsOf("CameraSyncExperiment.Back", "MinimumFrameRate");
  EXPECT_EQ(rates.size(), 3U);
  for (const std::string& rate : rates) EXPECT_TRUE(rate.ends_with(" = 30")) << rate;
}

TEST_F(Catalogue, ConfiguresTheFrontCameras) {
  EXPECT_THAT(settingsOf("CameraSyncExperiment.Front", "FormatIndex"),
              testing::ElementsAre("front FormatIndex = 1", "front-infrared FormatIndex = 0"));
}

}  // namespace
}  // namespace quazor
