// The experiment's description, setup and lifetime.
#include "diagnostics/sensor_images/nimbe_image_experiment.h"

#include "tests/support/fake_sensor.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <limits>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using std::chrono::milliseconds;

constexpr std::string_view kPoweredDisplay =
    "framebuffer mainDisplay\n"
    "display registryService\n"
    "registry registryProperty DSPLY Debug Info\n";

class NimbeImageExperiment : public testing::Test {
 protected:
  std::shared_ptr<QZNimbeImageExperiment> make() {
    auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor.platform());
    (void)calls();
    return experiment;
  }
  std::shared_ptr<QZNimbeImageExperiment> makeFor(const Value& images, const Value& timeout) {
    auto experiment = make();
    EXPECT_TRUE(experiment->setupWithParameters({{"images", images}, {"timeout", timeout}}, nullptr, nullptr));
    (void)calls();
    return experiment;
  }
  // Delivers a report while the loop waits, that many milliseconds after the start.
  void imageAt(int time, std::uint32_t frameID) {
    sensor.loop.at(milliseconds(time), [this, frameID] { sensor.device->send(0x76, imageReport(frameID)); });
  }
  // The calls since the previous call of this function.
  std::string calls() {
    const std::string all = transcript.text();
    return all.substr(std::exchange(seen_, all.size()));
  }
  static std::size_t imagesOf(const QZExperimentResult& result) {
    const Value* images = result.auxiliaryData().find("images");
    return images == nullptr || images->array() == nullptr ? 0 : images->array()->size();
  }

  RunTranscript transcript;
  const CallRecorder recorder = [this](std::string_view operation, std::string_view object, std::string_view detail,
                                       bool succeeded) { transcript.addCall(operation, object, detail, succeeded); };
  FakeSensor sensor{recorder};

 private:
  std::size_t seen_ = 0;
};

TEST_F(NimbeImageExperiment, DescribesItselfAndItsTwoParameters) {
  const QZDescription description = make()->experimentDescription();
  EXPECT_EQ(description.summary(), "Stream Nimbe in active mode and capture frames.");
  const struct {
    const char* name;
    const char* summary;
  } rows[] = {{"images", "The number of frames to capture."}, {"timeout", "The timeout in seconds."}};
  ASSERT_EQ(description.parameters().size(), std::size(rows));
  auto parameter = description.parameters().begin();
  for (const auto& row : rows) {
    EXPECT_EQ(parameter->first, row.name);
    EXPECT_EQ(parameter->second.summary(), row.summary);
    EXPECT_TRUE(parameter->second.required());
    ++parameter;
  }
  EXPECT_EQ(calls(), "");
}

TEST_F(NimbeImageExperiment, HasNoTeardown) {
  EXPECT_EQ(std::dynamic_pointer_cast<QZTeardown>(std::shared_ptr<QZExperiment>(make())), nullptr);
}

TEST_F(NimbeImageExperiment, MakesOneSemaphoreAndNothingElse) {
  const QZNimbeImageExperiment experiment(sensor.platform());
  EXPECT_EQ(calls(), "concurrency makeSemaphore 0\n");
}

TEST_F(NimbeImageExperiment, UsesTheInstalledPlatformWhenItIsHandedNone) {
  const Platform before = installedPlatform();
  installPlatform(sensor.platform());
  const auto experiment = std::make_shared<QZNimbeImageExperiment>();
  installPlatform(before);
  EXPECT_TRUE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, nullptr));
  imageAt(1, 1);
  EXPECT_NE(experiment->run(nullptr), nullptr);
}

TEST_F(NimbeImageExperiment, LooksForThePowerOfTheDisplayAndForALoop) {
  QZDiagnosticHost host;
  DiagnosticErrorPtr error = callersOwnError();
  EXPECT_TRUE(make()->setupWithParameters({{"images", 5}, {"timeout", 2}}, &host, &error));
  EXPECT_EQ(error, callersOwnError());
  EXPECT_EQ(calls(), std::string(kPoweredDisplay) + "thread currentRunLoop\n");
}

TEST_F(NimbeImageExperiment, TellsWhyItCannotBeSetUp) {
  const struct {
    const char* name;
    std::function<void(FakeSensor& phone)> damage;
    std::string calls;
    std::string error;
  } rows[] = {
      {"no display", [](FakeSensor& phone) { phone.hasDisplay = false; }, "framebuffer mainDisplay -> failed\n",
       "code 2: Could not get the main display to determine device power state."},
      {"no registry entry", [](FakeSensor& phone) { phone.hasRegistryService = false; },
       "framebuffer mainDisplay\ndisplay registryService -> failed\n",
       "code 2: Could not get the frame buffer to determine device power state."},
      {"no property", [](FakeSensor& phone) { phone.displayProperty.reset(); },
       "framebuffer mainDisplay\ndisplay registryService\nregistry registryProperty DSPLY Debug Info -> failed\n",
       "code 2: Could not find the display power state."},
      {"no power", [](FakeSensor& phone) { phone.displayProperty = displayPropertyOf(0); },
       std::string(kPoweredDisplay), "code 2: The display is not powered."},
      {"no loop", [](FakeSensor& phone) { phone.hasRunLoop = false; },
       std::string(kPoweredDisplay) + "thread currentRunLoop -> failed\n",
       "code 1: Nimbe is a HID device that requires a current run loop."},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    FakeSensor broken(recorder);
    row.damage(broken);
    const auto experiment = std::make_shared<QZNimbeImageExperiment>(broken.platform());
    (void)calls();
    DiagnosticErrorPtr error = callersOwnError();
    EXPECT_FALSE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, &error));
    EXPECT_EQ(calls(), row.calls);
    EXPECT_EQ(errorChain(error), "QZNimbeImageExperimentErrorDomain " + row.error);
    EXPECT_EQ(error->userInfo().size(), 1U);
    EXPECT_FALSE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, nullptr));
    EXPECT_EQ(calls(), row.calls);
  }
}

TEST_F(NimbeImageExperiment, ReadsThePowerOfTheDisplayAsABoolean) {
  const std::string missing = "Could not find the display power state.";
  const std::string off = "The display is not powered.";
  const Value power(1);
  const struct {
    const char* name;
    Value property;
    std::string message;  // empty if the display has power
  } rows[] = {
      {"one", displayPropertyOf(1), ""},
      {"true", displayPropertyOf(true), ""},
      {"a large number", displayPropertyOf(4294967296), ""},
      {"a negative number", displayPropertyOf(-1), ""},
      {"a fraction", displayPropertyOf(0.5), ""},
      {"zero", displayPropertyOf(0), off},
      {"false", displayPropertyOf(false), off},
      {"zero as a double", displayPropertyOf(0.0), off},
      {"not a number", displayPropertyOf(std::numeric_limits<double>::quiet_NaN()), off},
      {"a string", displayPropertyOf("1"), off},
      {"a list", displayPropertyOf(Array{1}), off},
      {"a string in place of the dictionary", "1", missing},
      {"an empty dictionary", Dictionary(), missing},
      {"a number in place of the inner dictionary", Dictionary{{"DSPLY power info", 1}}, missing},
      {"an empty inner dictionary", Dictionary{{"DSPLY power info", Dictionary()}}, missing},
      {"the entry one level too high", Dictionary{{"DSPLY power info panel", power}}, missing},
      {"the path as one key", Dictionary{{"DSPLY power info.DSPLY power info panel", power}}, missing},
      {"another panel", Dictionary{{"DSPLY power info", Dictionary{{"DSPLY power info panels", power}}}}, missing},
  };
  for (const auto& row : rows) {
    sensor.displayProperty = row.property;
    DiagnosticErrorPtr error = callersOwnError();
    EXPECT_EQ(make()->setupWithParameters({}, nullptr, &error), row.message.empty()) << row.name;
    EXPECT_EQ(errorChain(error), row.message.empty() ? "CallerErrorDomain code 1: Here before the run."
                                                     : "QZNimbeImageExperimentErrorDomain code 2: " + row.message)
        << row.name;
  }
}

TEST_F(NimbeImageExperiment, ReadsItsParametersAsUnsignedNumbers) {
  constexpr auto kForEver = std::numeric_limits<std::int64_t>::max();
  const struct {
    const char* name;
    Dictionary parameters;
    std::int64_t limit;    // nanoseconds
    std::string timedOut;  // seconds
  } rows[] = {
      {"none", {}, 0, "0"},
      {"zero", {{"timeout", 0}}, 0, "0"},
      {"an integer", {{"timeout", 2}}, 2'000'000'000, "2"},
      {"an unsigned integer", {{"timeout", 2U}}, 2'000'000'000, "2"},
      {"a fraction is cut off", {{"timeout", 2.9}}, 2'000'000'000, "2"},
      {"true", {{"timeout", true}}, 1'000'000'000, "1"},
      {"a string", {{"timeout", "2"}}, 0, "0"},
      {"a misspelt name", {{"Timeout", 2}}, 0, "0"},
      {"the last number of seconds that the clock can count",
       {{"timeout", 9223372036}},
       9223372036'000'000'000,
       "9223372036"},
      {"more than it can count", {{"timeout", 9223372037}}, kForEver, "9223372037"},
      {"minus one", {{"timeout", -1}}, kForEver, "18446744073709551615"},
      {"a negative double", {{"timeout", -1.0}}, 0, "0"},
      {"a huge double", {{"timeout", 1e300}}, kForEver, "18446744073709551615"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    FakeSensor idle(recorder);
    const auto experiment = std::make_shared<QZNimbeImageExperiment>(idle.platform());
    ASSERT_TRUE(experiment->setupWithParameters(row.parameters, nullptr, nullptr));
    (void)calls();
    DiagnosticErrorPtr error;
    EXPECT_EQ(experiment->run(&error), nullptr);
    EXPECT_NE(calls().find("loop runInMode default " + std::to_string(row.limit) + " ns\n"), std::string::npos);
    EXPECT_EQ(errorChain(error),
              "QZNimbeImageExperimentErrorDomain code 6: Timed out after " + row.timedOut + " seconds.");
    EXPECT_EQ(idle.loop.now().count(), row.limit);
  }
}

TEST_F(NimbeImageExperiment, StopsWhenItHasTheImagesThatWereAskedFor) {
  const struct {
    const char* name;
    Dictionary parameters;
    std::size_t images;  // of ten; 0 for a run that times out
  } rows[] = {
      {"five", {{"images", 5}, {"timeout", 1}}, 5},
      {"one", {{"images", 1}, {"timeout", 1}}, 1},
      {"a fraction is cut off", {{"images", 3.9}, {"timeout", 1}}, 3},
      {"none ends with the first", {{"images", 0}, {"timeout", 1}}, 1},
      {"a missing number is none", {{"timeout", 1}}, 1},
      {"all", {{"images", 10}, {"timeout", 1}}, 10},
      {"more than there are", {{"images", 11}, {"timeout", 1}}, 0},
      {"minus one is very many", {{"images", -1}, {"timeout", 1}}, 0},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    FakeSensor sending({});
    for (std::uint32_t i = 1; i <= 10; ++i) {
      sending.loop.at(milliseconds(i), [&, i] { sending.device->send(0x76, imageReport(i)); });
    }
    const auto experiment = std::make_shared<QZNimbeImageExperiment>(sending.platform());
    ASSERT_TRUE(experiment->setupWithParameters(row.parameters, nullptr, nullptr));
    const auto result = experiment->run(nullptr);
    EXPECT_EQ(result == nullptr ? 0 : imagesOf(*result), row.images);
    EXPECT_EQ(sending.loop.now(), row.images == 0 ? milliseconds(1000) : milliseconds(row.images));
  }
}

TEST_F(NimbeImageExperiment, KeepsImagesThatComeAfterItsStop) {
  const auto experiment = makeFor(1, 1);
  for (std::uint32_t i = 1; i <= 3; ++i) imageAt(1, i);  // all in one round of the loop
  const auto result = experiment->run(nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(imagesOf(*result), 3U);
}

TEST_F(NimbeImageExperiment, ReturnsWhatItHasWhenSomebodyElseStopsTheLoop) {
  const auto experiment = makeFor(5, 1);
  imageAt(1, 1);
  sensor.loop.at(milliseconds(2), [this] { sensor.loop.stop(); });
  const auto result = experiment->run(nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(imagesOf(*result), 1U);
}

TEST_F(NimbeImageExperiment, KeepsAnImageThatComesWhileTheStreamIsOpened) {
  const auto experiment = makeFor(2, 1);
  // Delivered before the loop runs, by a device that responds to a feature report with an image.
  sensor.loop.at(milliseconds(1), [this] { sensor.device->send(0x76, imageReport(2)); });
  sensor.device->careless = true;
  sensor.device->onFeatureReport = [this](std::uint8_t reportID) {
    if (reportID == 0xAC) sensor.device->deliver(0x76, imageReport(1));
  };
  const auto result = experiment->run(nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(imagesOf(*result), 2U);
}

TEST_F(NimbeImageExperiment, WaitsNoLongerThanItsTimeForAStopThatCameTooEarly) {
  const auto experiment = makeFor(1, 1);
  sensor.device->careless = true;
  sensor.device->onFeatureReport = [this](std::uint8_t reportID) {
    if (reportID == 0xAC) sensor.device->deliver(0x76, imageReport(1));
  };
  DiagnosticErrorPtr error;
  EXPECT_EQ(experiment->run(&error), nullptr);
  EXPECT_EQ(errorChain(error), "QZNimbeImageExperimentErrorDomain code 6: Timed out after 1 seconds.");
}

TEST_F(NimbeImageExperiment, RefusesToRunWithoutASetup) {
  DiagnosticErrorPtr error;
  EXPECT_EQ(make()->run(&error), nullptr);
  EXPECT_EQ(errorChain(error),
            "QZNimbeImageExperimentErrorDomain code 1: Nimbe is a HID device that requires a current run loop.");
  EXPECT_EQ(calls(), "");
}

TEST_F(NimbeImageExperiment, ClosesTheStreamOnlyAtTheExitOfTheLoop) {
  const auto experiment = makeFor(2, 1);
  imageAt(1, 1);
  imageAt(900, 2);
  std::vector<RunLoopActivities> closed;
  const auto observer = sensor.loop.makeObserver(kRunLoopAllActivities, true, 1, [&](RunLoopActivities activity) {
    if (!sensor.device->isOpen()) closed.push_back(activity);
  });
  sensor.loop.addObserver(observer, kRunLoopDefaultMode);
  EXPECT_NE(experiment->run(nullptr), nullptr);
  EXPECT_EQ(closed, std::vector<RunLoopActivities>{0x80});
}

TEST_F(NimbeImageExperiment, KeepsItsStreamClosedAndWithoutADelegate) {
  std::weak_ptr<QZNimbeImageStream> stream;
  auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor.platform(), [&](const Platform& platform) {
    auto made = std::make_shared<QZNimbeImageStream>(platform);
    stream = made;
    return made;
  });
  ASSERT_TRUE(experiment->setupWithParameters({{"images", 1}, {"timeout", 1}}, nullptr, nullptr));
  imageAt(1, 1);
  EXPECT_NE(experiment->run(nullptr), nullptr);
  ASSERT_FALSE(stream.expired());
  EXPECT_EQ(stream.lock()->delegate(), nullptr);
  EXPECT_FALSE(sensor.device->isOpen());
  EXPECT_FALSE(sensor.device->isScheduled());
  experiment.reset();
  EXPECT_TRUE(stream.expired());
}

TEST_F(NimbeImageExperiment, GivesUpItsObserverWhateverEndsTheRun) {
  for (const bool thrown : {false, true}) {
    const auto experiment = makeFor(1, 1);
    sensor.loop.at(sensor.loop.now(), [&] {
      EXPECT_EQ(sensor.loop.observers(), 1U);
      if (thrown) throw std::runtime_error("The wait can never end.");
    });
    if (thrown) {
      EXPECT_THROW(static_cast<void>(experiment->run(nullptr)), std::runtime_error);
    } else {
      EXPECT_EQ(experiment->run(nullptr), nullptr);
    }
    EXPECT_EQ(sensor.loop.observers(), 0U) << thrown;
    EXPECT_TRUE(sensor.loop.lastObserver().expired()) << thrown;
  }
}

// The loop may notify an observer of its exit after the experiment was released.
TEST_F(NimbeImageExperiment, IsHeldWeaklyByItsObserverAndItsStream) {
  auto experiment = makeFor(1, 1);
  const std::weak_ptr<QZNimbeImageExperiment> watched = experiment;
  std::shared_ptr<RunLoopObserver> kept;
  sensor.loop.at(milliseconds(0), [&] {
    kept = sensor.loop.lastObserver().lock();
    throw std::runtime_error("The wait can never end.");
  });
  EXPECT_THROW(static_cast<void>(experiment->run(nullptr)), std::runtime_error);
  ASSERT_NE(kept, nullptr);
  sensor.loop.addObserver(kept, kRunLoopDefaultMode);
  experiment.reset();
  EXPECT_TRUE(watched.expired());
  (void)sensor.loop.runInMode(kRunLoopDefaultMode, milliseconds(0), false);
}

}  // namespace
}  // namespace quazor
