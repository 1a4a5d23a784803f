#include "host/phone.h"

#include "host/exit_code.h"
#include "host/test_directory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

constexpr const char* kScenario = R"({
  "title": "One camera, one fault",
  "cameras": {"wide": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
  "groups": {"back": {"cameras": ["wide"], "master": "wide"}},
  "faults": [{"operation": "CapturePlugIn.device", "action": "nothing"}]
})";

TEST(PhonesOfScenario, MakesANewPhoneEveryTime) {
  const TestDirectory directory;
  const PhoneMaker makePhone = phonesOfScenario(directory.write("one.json", kScenario), false, 1);
  const std::unique_ptr<Phone> first = makePhone();
  const std::unique_ptr<Phone> second = makePhone();
  EXPECT_EQ(first->platform().capture->createPlugIn()->device(nullptr), nullptr);
  ASSERT_EQ(first->faults().size(), 1U);
  EXPECT_EQ(first->faults()[0].fired, 1U);
  EXPECT_EQ(first->faults()[0].fault["operation"], "CapturePlugIn.device");
  EXPECT_EQ(second->faults()[0].fired, 0U);
}

TEST(PhonesOfScenario, LetsTimePassAsAsked) {
  using namespace std::chrono_literals;
  const TestDirectory directory;
  const std::filesystem::path file = directory.write("one.json", kScenario);
  const auto begin = std::chrono::steady_clock::now();
  phonesOfScenario(file, false, 1)()->platform().clock->sleep(1h);
  EXPECT_LT(std::chrono::steady_clock::now() - begin, 1min);
  const auto beginOfReal = std::chrono::steady_clock::now();
  phonesOfScenario(file, true, 1)()->platform().clock->sleep(5ms);
  EXPECT_GE(std::chrono::steady_clock::now() - beginOfReal, 5ms);
}

TEST(PhonesOfScenario, RefusesAScenarioThatCannotBeRead) {
  const TestDirectory directory;
  for (const std::filesystem::path& file :
       {directory.path() / "nothing.json", directory.write("text.json", "no JSON"), directory.path()}) {
    try {
      phonesOfScenario(file, false, 1);
      ADD_FAILURE() << file << " was accepted";
    } catch (const Refusal& refusal) {
      EXPECT_EQ(refusal.code(), ExitCode::kCannotRead) << file;
      EXPECT_THAT(refusal.what(), testing::HasSubstr(file.filename().string())) << file;
    }
  }
}

}  // namespace
}  // namespace quazor
