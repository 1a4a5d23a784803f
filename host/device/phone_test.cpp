#include "host/device/phone.h"

#include "base/text/input_error.h"
#include "host/testing/test_directory.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"
#include "tests/support/thrown_text.h"

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

TEST(PhonesOfScenario, CountsTheFramesThatHandlersGet) {
  using namespace std::chrono_literals;
  constexpr const char* kOneCamera =
      R"({"title": "One camera", "cameras": {"wide": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
          "groups": {"back": {"cameras": ["wide"], "master": "wide"}}, "faults": []})";
  const TestDirectory directory;
  const std::unique_ptr<Phone> phone = phonesOfScenario(directory.write("one.json", kOneCamera), false, 1)();
  const std::shared_ptr<CaptureDevice> device = phone->platform().capture->createPlugIn()->device(nullptr);
  const CaptureStreams streams = *device->streams(nullptr);
  ASSERT_TRUE(device->requestControlOfStreams(streams, nullptr));
  std::uint64_t handled = 0;
  const auto handler = std::make_shared<PixelBufferHandler>([&handled](PixelBuffer&, MediaTime) { ++handled; });
  const std::string output(capture_key::PrimaryScaler);
  ASSERT_TRUE(streams[0]->setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, nullptr));
  ASSERT_TRUE(
      streams[0]->setValue(Dictionary{{output, Dictionary{{std::string(capture_key::PixelBufferHandler), handler}}}},
                           capture_key::VideoOutputHandlers, nullptr));
  ASSERT_TRUE(streams[0]->start(nullptr));
  EXPECT_EQ(phone->framesDelivered(), 0U);
  phone->platform().clock->sleep(101ms);
  EXPECT_EQ(handled, 3U);
  EXPECT_EQ(phone->framesDelivered(), 3U);
  static_cast<void>(device->invalidate(nullptr));
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
    EXPECT_THAT(thrownText<InputError>([&] { phonesOfScenario(file, false, 1); }),
                testing::HasSubstr(file.filename().string()))
        << file;
  }
}

TEST(ScenarioFiles, SayWhatIsExpected) {
  const TestDirectory directory;
  const ScenarioSummary summary = summaryOfScenario(directory.write("one.json", R"({
    "title": "No camera", "cameras": {}, "groups": {}, "expect": {"D": {"verdict": "fail", "failedResults": ["R"]}}})"));
  EXPECT_EQ(summary.title, "No camera");
  EXPECT_FALSE(summary.hasFaults);
  ASSERT_EQ(summary.expected.size(), 1U);
  EXPECT_EQ(summary.expected[0].name, "D");
  EXPECT_EQ(summary.expected[0].verdict, "fail");
}

TEST(ScenarioFiles, AreRefusedWithMalformedExpectations) {
  const TestDirectory directory;
  const std::filesystem::path file = directory.write("one.json", R"({
    "title": "No camera", "cameras": {}, "groups": {}, "expect": {"D": {"verdict": "failed"}}})");
  const std::string due = "the simulated phone cannot be created: " + file.string() +
                          ":2: expect.D.verdict: \"failed\" is not a verdict; did you mean \"fail\"?";
  EXPECT_EQ(thrownText<InputError>([&] { phonesOfScenario(file, false, 1); }), due);
  EXPECT_EQ(thrownText<InputError>([&] { summaryOfScenario(file); }), due);
}

TEST(BindingNamed, IsTheFileAfterThePrefix) {
  EXPECT_EQ(bindingNamed("linux:board.json"), "board.json");
  EXPECT_EQ(bindingNamed("linux:"), "");
  EXPECT_EQ(bindingNamed("linux"), std::nullopt);
  EXPECT_EQ(bindingNamed("camera_sync/linux:board"), std::nullopt);
  EXPECT_EQ(bindingNamed(""), std::nullopt);
}

TEST(PhonesOfBinding, AreThisMachine) {
  const TestDirectory directory;
  const PhoneMaker makePhone = phonesOfBinding(directory.write("board.json", R"({"title": "Nothing"})"));
  const std::unique_ptr<Phone> phone = makePhone();
  EXPECT_TRUE(phone->faults().empty());
  EXPECT_EQ(phone->framesDelivered(), 0U);
  const Platform platform = phone->platform();
  DiagnosticErrorPtr error;
  EXPECT_EQ(platform.capture->createPlugIn()->device(&error), nullptr);
  ASSERT_NE(error, nullptr);
  EXPECT_EQ(error->domain(), "LinuxErrorDomain");
  EXPECT_NE(platform.reports->reportWithOnlySimpleChannels(nullptr), nullptr);
}

TEST(PhonesOfBinding, CountsTheFaultsOfTheBinding) {
  const TestDirectory directory;
  const PhoneMaker makePhone = phonesOfBinding(directory.write("board.json", R"({"title": "Nothing", "faults": [
    {"operation": "CapturePlugIn.device", "action": "fail"},
    {"operation": "HidService.createManager", "action": "nothing"}]})"));
  const std::unique_ptr<Phone> phone = makePhone();
  DiagnosticErrorPtr error;
  EXPECT_EQ(phone->platform().capture->createPlugIn()->device(&error), nullptr);
  EXPECT_EQ(defaultText(error), "LinuxErrorDomain code 12: CapturePlugIn.device failed.");
  const std::vector<DeclaredFault> faults = phone->faults();
  ASSERT_EQ(faults.size(), 2U);
  EXPECT_EQ(faults[0].fault.dump(), R"({"operation":"CapturePlugIn.device","action":"fail"})");
  EXPECT_EQ(faults[0].fired, 1U);
  EXPECT_EQ(faults[1].fired, 0U);
  EXPECT_EQ(makePhone()->faults()[0].fired, 0U);
}

TEST(PhonesOfBinding, RefusesABindingThatCannotBeRead) {
  const TestDirectory directory;
  EXPECT_THAT(thrownText<InputError>([&] { phonesOfBinding(directory.write("bad.json", "{\n\"titel\": 1}")); }),
              testing::HasSubstr("bad.json:2: the document: unknown key \"titel\""));
}

TEST(ProbeThisMachine, GivesABindingThatCanBeRead) {
  const TestDirectory directory;
  const PhoneProbe probe = probeThisMachine();
  EXPECT_FALSE(probe.lines.empty());
  EXPECT_NO_THROW(phonesOfBinding(directory.write("probed.json", probe.binding)));
}

}  // namespace
}  // namespace quazor
