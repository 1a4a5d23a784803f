#include "diagnostics/sensor_images/nimbe_image_stream.h"

#include "tests/support/fake_sensor.h"
#include "tests/support/run_transcript.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

class KeepingDelegate final : public QZNimbeImageStreamDelegate {
 public:
  void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) override {
    if (onImage) onImage();
    images.push_back(std::move(image));
  }
  void streamDidError(DiagnosticErrorPtr error) override {
    if (onError) onError();
    errors.push_back(std::move(error));
  }

  std::function<void()> onImage;
  std::function<void()> onError;
  std::vector<std::shared_ptr<QZNimbeCorvaneImage>> images;
  std::vector<DiagnosticErrorPtr> errors;
};

class NimbeImageStream : public testing::Test {
 protected:
  NimbeImageStream() { stream->setDelegate(delegate); }

  // Opens the stream and returns the calls since the beginning, the outcome and the error.
  std::string open(ErrorPlace place = ErrorPlace::kGiven) {
    DiagnosticErrorPtr error = callersOwnError();
    const bool opened = stream->openWithRunLoop(sensor.loop, place == ErrorPlace::kGiven ? &error : nullptr);
    return transcript.text() + (opened ? "opened\n" : "not opened\n") + errorChain(error) + '\n';
  }
  // The calls since the previous call of this function, or since open().
  std::string calls() {
    const std::string all = transcript.text();
    return all.substr(std::exchange(seen_, all.size()));
  }
  void openQuietly() {
    ASSERT_TRUE(stream->openWithRunLoop(sensor.loop, nullptr));
    (void)calls();
  }

  RunTranscript transcript;
  const CallRecorder recorder = [this](std::string_view operation, std::string_view object, std::string_view detail,
                                       bool succeeded) { transcript.addCall(operation, object, detail, succeeded); };
  FakeSensor sensor{recorder};
  std::shared_ptr<KeepingDelegate> delegate = std::make_shared<KeepingDelegate>();
  std::shared_ptr<QZNimbeImageStream> stream = std::make_shared<QZNimbeImageStream>(sensor.platform());

 private:
  std::size_t seen_ = 0;
};

constexpr std::string_view kClosing =
    "sensor removeInputReportCallback\n"
    "sensor unschedule default\n"
    "sensor close 0\n";
constexpr std::string_view kUntouched = "CallerErrorDomain code 1: Here before the run.\n";

TEST_F(NimbeImageStream, OpensTheOneSensorAndSwitchesItToImages) {
  EXPECT_EQ(open(), R"(hid createManager
manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})
manager devices 1
sensor open
sensor setInputReportCallback
sensor setFeatureReport 171 = ab01
sensor setFeatureReport 172 = ac01
sensor schedule default
opened
)" + std::string(kUntouched));
  ASSERT_EQ(sensor.matching.size(), 1U);
  EXPECT_EQ(sensor.matching.front(), (Dictionary{{"PrimaryUsagePage", 65280U}, {"PrimaryUsage", 36U}}));
}

TEST_F(NimbeImageStream, TellsWhyItDoesNotOpen) {
  const std::string found =
      "hid createManager\n"
      "manager enumerateDevicesMatching ({PrimaryUsagePage = 65280; PrimaryUsage = 36})\n";
  const std::string opened = found + "manager devices 1\nsensor open\nsensor setInputReportCallback\n";
  const struct {
    const char* name;
    std::function<void(FakeSensor& phone)> damage;
    std::string calls;
    std::string error;
    bool canHaveCause;
  } rows[] = {
      {"no device", [](FakeSensor& phone) { phone.matchingDevices.clear(); }, found + "manager devices 0\n",
       "QZNimbeImageExperimentErrorDomain code 3: Nimbe device match was ambiguous!", false},
      {"two devices", [](FakeSensor& phone) { phone.matchingDevices.push_back(phone.device); },
       found + "manager devices 2\n", "QZNimbeImageExperimentErrorDomain code 3: Nimbe device match was ambiguous!",
       false},
      {"a device that does not open", [](FakeSensor& phone) { phone.device->opens = false; },
       found + "manager devices 1\nsensor open -> failed\n",
       "QZNimbeImageExperimentErrorDomain code 3: Could not open Nimbe device.", true},
      {"the power mode is refused", [](FakeSensor& phone) { phone.device->refusedReports = {0xAB}; },
       opened + "sensor setFeatureReport 171 = ab01 -> failed\n",
       "QZNimbeImageExperimentErrorDomain code 4: Failed to override power mode to active!", true},
      {"the streaming mode is refused", [](FakeSensor& phone) { phone.device->refusedReports = {0xAC}; },
       opened + "sensor setFeatureReport 171 = ab01\nsensor setFeatureReport 172 = ac01 -> failed\n",
       "QZNimbeImageExperimentErrorDomain code 5: Failed to set streaming mode to images only!", true},
  };
  const DiagnosticErrorPtr own = makeError("BenchErrorDomain", 7, "Broken.");
  for (const auto& row : rows) {
    for (const bool hasOwn : {true, false}) {
      for (const ErrorPlace place : {ErrorPlace::kGiven, ErrorPlace::kNone}) {
        SCOPED_TRACE(row.name);
        FakeSensor broken(recorder);
        row.damage(broken);
        if (hasOwn) broken.device->ownError = own;
        (void)calls();
        DiagnosticErrorPtr error = callersOwnError();
        const auto refused = std::make_shared<QZNimbeImageStream>(broken.platform());
        EXPECT_FALSE(refused->openWithRunLoop(broken.loop, place == ErrorPlace::kGiven ? &error : nullptr));
        EXPECT_EQ(calls(), row.calls);
        if (place == ErrorPlace::kNone) {
          EXPECT_EQ(error, callersOwnError());
        } else {
          EXPECT_EQ(errorChain(error),
                    row.error + (hasOwn && row.canHaveCause ? ", caused by " + errorChain(own) : ""));
          EXPECT_EQ(error->userInfo().size(), hasOwn && row.canHaveCause ? 2U : 1U);
        }
        EXPECT_FALSE(broken.device->isScheduled());
      }
    }
  }
}

TEST_F(NimbeImageStream, LeavesADeviceOpenThatRefusesAMode) {
  sensor.device->refusedReports = {0xAC};
  EXPECT_FALSE(stream->openWithRunLoop(sensor.loop, nullptr));
  EXPECT_TRUE(sensor.device->isOpen());
  EXPECT_TRUE(sensor.device->hasReceiver());
}

TEST_F(NimbeImageStream, RaisesWhenThereIsNoHidManager) {
  sensor.hasHidManager = false;
  DiagnosticErrorPtr error = callersOwnError();
  EXPECT_EQ(thrownText<std::logic_error>([&] { return stream->openWithRunLoop(sensor.loop, &error); }),
            "No HID Manager available?!");
  EXPECT_EQ(error, callersOwnError());
  EXPECT_EQ(transcript.text(), "hid createManager -> failed\n");
}

TEST_F(NimbeImageStream, UsesTheInstalledPlatformWhenItIsHandedNone) {
  const Platform before = installedPlatform();
  installPlatform(sensor.platform());
  const auto installed = std::make_shared<QZNimbeImageStream>();
  installPlatform(before);
  EXPECT_TRUE(installed->openWithRunLoop(sensor.loop, nullptr));
  EXPECT_TRUE(sensor.device->isScheduled());
}

TEST_F(NimbeImageStream, HandsImagesOnInTheRunOfItsLoop) {
  openQuietly();
  sensor.device->send(0x76, imageReport(1));
  sensor.device->send(0x76, imageReport(2));
  EXPECT_TRUE(delegate->images.empty());
  (void)sensor.loop.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds(0), false);
  ASSERT_EQ(delegate->images.size(), 2U);
  EXPECT_EQ(delegate->images[0]->frameID(), Value(1U));
  EXPECT_EQ(delegate->images[1]->frameID(), Value(2U));
  EXPECT_EQ(delegate->images[1]->timestampInMilliseconds(), Value(66U));
  EXPECT_EQ(delegate->images[1]->tmonDataInC(), Value(36.6F));
  EXPECT_EQ(delegate->images[1]->dScanI()[23], Value(-1));
  EXPECT_EQ(delegate->images[1]->dScanQ()[47], Value(47000));
}

TEST_F(NimbeImageStream, TakesImageReportsOfAtLeastARecordAndNoOthers) {
  const struct {
    const char* name;
    std::uint8_t reportID;
    std::size_t size;
    bool taken;
  } rows[] = {
      {"an image", 0x76, 792, true},
      {"a byte too many", 0x76, 793, true},
      {"very long", 0x76, 65536, true},
      {"a byte too few", 0x76, 791, false},
      {"the ID alone", 0x76, 1, false},
      {"nothing at all", 0x76, 0, false},
      {"the ID below", 0x75, 792, false},
      {"the ID above", 0x77, 792, false},
      {"no ID", 0x00, 792, false},
      {"the last ID", 0xFF, 792, false},
      {"a feature report's ID", 0xAC, 792, false},
  };
  openQuietly();
  for (const auto& row : rows) {
    delegate->images.clear();
    Bytes report = imageReport(9);
    report.resize(row.size, 0xEE);
    report.shrink_to_fit();  // makes a read past the end detectable
    sensor.device->deliver(row.reportID, report);
    EXPECT_EQ(delegate->images.size(), row.taken ? 1U : 0U) << row.name;
    for (const auto& image : delegate->images) EXPECT_EQ(image->frameID(), Value(9U)) << row.name;
  }
  EXPECT_TRUE(delegate->errors.empty());
  EXPECT_EQ(calls(), "");
}

// The ID that the device passes applies, not the byte in the data.
TEST_F(NimbeImageStream, GoesByTheIDThatTheDeviceTells) {
  openQuietly();
  Bytes report = imageReport(1);
  report[0] = 0x75;
  sensor.device->deliver(0x76, report);
  EXPECT_EQ(delegate->images.size(), 1U);
  sensor.device->deliver(0x75, imageReport(2));
  EXPECT_EQ(delegate->images.size(), 1U);
}

TEST_F(NimbeImageStream, ClosesBeforeItHandsOnTheErrorOfADevice) {
  openQuietly();
  DiagnosticErrorPtr error = makeError("BenchErrorDomain", 7, "Unplugged.");
  const std::weak_ptr<const DiagnosticError> watched = error;
  delegate->onError = [this] {
    EXPECT_EQ(calls(), kClosing);
    EXPECT_FALSE(sensor.device->isOpen());
  };
  sensor.device->deliver(0x76, imageReport(1));
  sensor.device->deliverError(std::move(error));  // the device releases it when it is closed
  ASSERT_EQ(delegate->errors.size(), 1U);
  EXPECT_EQ(delegate->errors.front(), watched.lock());
  EXPECT_EQ(errorChain(delegate->errors.front()), "BenchErrorDomain code 7: Unplugged.");
  EXPECT_EQ(delegate->images.size(), 1U);
  EXPECT_EQ(calls(), "");
}

TEST_F(NimbeImageStream, TakesAReportWithAnErrorForNoImage) {
  openQuietly();
  const DiagnosticErrorPtr error = makeError("BenchErrorDomain", 7, "Broken.");
  sensor.device->careless = true;
  sensor.device->deliverError(error);
  sensor.device->deliver(0x76, imageReport(1));
  sensor.device->deliverError(error);
  EXPECT_EQ(delegate->errors.size(), 1U);
  EXPECT_TRUE(delegate->images.empty());
}

TEST_F(NimbeImageStream, ClosesTwiceWithoutHarm) {
  openQuietly();
  stream->close();
  EXPECT_EQ(calls(), kClosing);
  EXPECT_FALSE(sensor.device->isScheduled());
  EXPECT_FALSE(sensor.device->hasReceiver());
  stream->close();
  EXPECT_EQ(calls(), kClosing);
  sensor.device->deliver(0x76, imageReport(1));
  EXPECT_TRUE(delegate->images.empty());
}

TEST_F(NimbeImageStream, ClosesWithoutHarmWhatWasNeverOpened) {
  stream->close();
  EXPECT_EQ(calls(), "");
  sensor.matchingDevices.clear();
  EXPECT_FALSE(stream->openWithRunLoop(sensor.loop, nullptr));
  (void)calls();
  stream->close();
  EXPECT_EQ(calls(), "");
}

TEST_F(NimbeImageStream, LosesNothingWithoutADelegateButTheImages) {
  openQuietly();
  stream->setDelegate({});
  EXPECT_EQ(stream->delegate(), nullptr);
  sensor.device->deliver(0x76, imageReport(1));
  sensor.device->deliver(0x76, Bytes(3));
  EXPECT_EQ(calls(), "");
  stream->setDelegate(delegate);
  EXPECT_EQ(stream->delegate(), delegate);
  sensor.device->deliver(0x76, imageReport(2));
  EXPECT_EQ(delegate->images.size(), 1U);
  stream->setDelegate({});
  sensor.device->deliverError(makeError("BenchErrorDomain", 7, "Broken."));
  EXPECT_EQ(calls(), kClosing);
  EXPECT_TRUE(delegate->errors.empty());
}

TEST_F(NimbeImageStream, HoldsItsDelegateWeakly) {
  openQuietly();
  const std::weak_ptr<KeepingDelegate> watched = delegate;
  delegate.reset();
  EXPECT_TRUE(watched.expired());
  EXPECT_EQ(stream->delegate(), nullptr);
  sensor.device->deliver(0x76, imageReport(1));
}

TEST_F(NimbeImageStream, HoldsItsDelegateWhileItCallsIt) {
  const std::weak_ptr<KeepingDelegate> watched = delegate;
  bool alive = false;
  openQuietly();
  delegate->onImage = [&] {
    delegate.reset();
    alive = !watched.expired();
  };
  sensor.device->deliver(0x76, imageReport(1));
  EXPECT_TRUE(alive);
  EXPECT_TRUE(watched.expired());
}

TEST_F(NimbeImageStream, MayGoWhileItsDeviceStays) {
  openQuietly();
  const std::weak_ptr<QZNimbeImageStream> watched = stream;
  stream.reset();
  EXPECT_TRUE(watched.expired());
  EXPECT_TRUE(sensor.device->hasReceiver());
  sensor.device->deliver(0x76, imageReport(1));
  sensor.device->deliverError(makeError("BenchErrorDomain", 7, "Broken."));
  EXPECT_TRUE(delegate->images.empty());
  EXPECT_TRUE(delegate->errors.empty());
  EXPECT_EQ(calls(), "");
}

TEST_F(NimbeImageStream, MayBeClosedAndDroppedByItsDelegate) {
  for (const bool byError : {false, true}) {
    stream = std::make_shared<QZNimbeImageStream>(sensor.platform());
    stream->setDelegate(delegate);
    openQuietly();
    const std::weak_ptr<QZNimbeImageStream> watched = stream;
    const auto drop = [this] {
      stream->close();
      stream.reset();
    };
    delegate->onImage = drop;
    delegate->onError = drop;
    if (byError) {
      sensor.device->deliverError(makeError("BenchErrorDomain", 7, "Broken."));
    } else {
      sensor.device->deliver(0x76, imageReport(1));
    }
    EXPECT_TRUE(watched.expired()) << byError;
    EXPECT_FALSE(sensor.device->hasReceiver()) << byError;
  }
  EXPECT_EQ(delegate->images.size(), 1U);
  EXPECT_EQ(delegate->errors.size(), 1U);
}

TEST_F(NimbeImageStream, KeepsItsDeviceUntilItGoes) {
  openQuietly();
  const std::weak_ptr<HidDevice> watched = sensor.device;
  sensor.matchingDevices.clear();
  sensor.device.reset();
  stream->close();
  EXPECT_FALSE(watched.expired());
  stream.reset();
  EXPECT_TRUE(watched.expired());
}

}  // namespace
}  // namespace quazor
