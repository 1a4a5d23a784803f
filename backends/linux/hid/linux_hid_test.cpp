#include "backends/linux/hid/linux_hid.h"

#include "backends/linux/hid/hidraw_for_tests.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

Dictionary matchingUsage(Value page, Value usage) {
  return {{std::string(kHidPrimaryUsagePage), std::move(page)}, {std::string(kHidPrimaryUsage), std::move(usage)}};
}

class LinuxHidTest : public ::testing::Test {
 protected:
  std::shared_ptr<HidManager> manager() { return makeLinuxHid(tree_.roots(), calls_)->createManager(); }
  std::vector<std::shared_ptr<HidDevice>> find(const std::vector<Dictionary>& matching = {Dictionary{}}) {
    const std::shared_ptr<HidManager> made = manager();
    made->enumerateDevicesMatching(matching);
    return made->devices();
  }
  // The names of the nodes that match one of the dictionaries.
  std::vector<std::string> found(const std::vector<Dictionary>& matching) {
    std::vector<std::string> names;
    for (const auto& device : find(matching)) {
      const std::string text = device->description();
      names.push_back(text.substr(text.find("/hidraw") + 1, 7));
    }
    return names;
  }
  std::shared_ptr<HidDevice> sensor() {
    tree_.connect("hidraw0", sensorDescriptor());
    return find().at(0);
  }
  // The text of the error, with "/dev" for the directory of this test's devices.
  std::string textOf(const DiagnosticErrorPtr& error) const {
    std::string text = defaultText(error);
    const std::string folder = tree_.roots().devices;
    for (auto at = text.find(folder); at != std::string::npos; at = text.find(folder)) {
      text.replace(at, folder.size(), "/dev");
    }
    return text;
  }
  std::string errorOfOpen(HidDevice& device) const {
    DiagnosticErrorPtr error;
    EXPECT_FALSE(device.open(&error));
    EXPECT_FALSE(device.open(nullptr));
    return textOf(error);
  }
  std::string errorOfFeature(HidDevice& device, std::uint8_t id, const Bytes& payload) const {
    DiagnosticErrorPtr error;
    EXPECT_FALSE(device.setFeatureReportWithID(id, payload, &error));
    EXPECT_FALSE(device.setFeatureReportWithID(id, payload, nullptr));
    return textOf(error);
  }

  HidrawTree tree_;
  std::shared_ptr<FakeHidrawCalls> calls_ = std::make_shared<FakeHidrawCalls>();
};

TEST_F(LinuxHidTest, ADevicesNameIsWhatItCallsItself) {
  const std::shared_ptr<HidDevice> device = sensor();
  const std::string description = device->description();
  EXPECT_THAT(description, ::testing::EndsWith(" \"" + linuxHidName(*device) + "\""));
  EXPECT_NE(linuxHidName(*device), "");
}

TEST_F(LinuxHidTest, ADeviceWithADamagedDescriptorMatchesOnlyTheEmptyDictionary) {
  tree_.connect("hidraw0", sensorDescriptor());
  tree_.connect("hidraw1", {0x05});
  EXPECT_THAT(found({Dictionary{}}), ElementsAre("hidraw0", "hidraw1"));
  EXPECT_THAT(found({matchingUsage(0, 0)}), IsEmpty());
  EXPECT_THAT(found({matchingUsage(0xFF00, 0x24)}), ElementsAre("hidraw0"));
}

TEST_F(LinuxHidTest, OnlyTheFirstTopLevelCollectionIsMatched) {
  Bytes both = unnumberedDescriptor();
  const Bytes second = sensorDescriptor();
  both.insert(both.end(), second.begin(), second.end());
  tree_.connect("hidraw0", both);
  EXPECT_THAT(find({matchingUsage(0xFF00, 0x24)}), IsEmpty());
  EXPECT_THAT(find({matchingUsage(0xFF00, 0x30)}), testing::SizeIs(1));
}

TEST_F(LinuxHidTest, AManagerTellsWhatItsLastEnumerationFound) {
  tree_.connect("hidraw0", sensorDescriptor());
  const std::shared_ptr<HidManager> made = manager();
  EXPECT_EQ(made->description(), "HID manager of " + tree_.roots().devices.string() + "/hidraw*");
  EXPECT_THAT(made->devices(), IsEmpty());
  made->enumerateDevicesMatching({Dictionary{}});
  EXPECT_THAT(made->devices(), testing::SizeIs(1));
  EXPECT_EQ(made->devices(), made->devices());
  EXPECT_EQ(made->devices().front()->description(),
            "HID device " + tree_.path("hidraw0").string() + " \"Test Sensor\"");
  tree_.disconnect("hidraw0");
  made->enumerateDevicesMatching({Dictionary{}});
  EXPECT_THAT(made->devices(), IsEmpty());
}

TEST_F(LinuxHidTest, WithoutHidrawThereIsNoManager) {
  std::filesystem::remove(tree_.roots().sysfs / "class" / "hidraw");
  EXPECT_EQ(manager(), nullptr);
}

TEST_F(LinuxHidTest, ThisMachinesServiceAnswers) {
  const std::shared_ptr<HidManager> made = makeLinuxHid()->createManager();
  EXPECT_EQ(made != nullptr, hasHidraw());
  if (made == nullptr) return;
  made->enumerateDevicesMatching({Dictionary{}});
  EXPECT_EQ(made->devices().size(), hidrawNodes().size());
}

TEST_F(LinuxHidTest, ADeviceOpensOnceUntilItIsClosed) {
  const std::shared_ptr<HidDevice> device = sensor();
  EXPECT_TRUE(device->open(nullptr));
  EXPECT_EQ(errorOfOpen(*device), "LinuxErrorDomain code 7: /dev/hidraw0 is already open.");
  device->close(0);
  device->close(0);
  EXPECT_TRUE(device->open(nullptr));
  EXPECT_THAT(calls_->opened, ElementsAre("hidraw0", "hidraw0"));
}

TEST_F(LinuxHidTest, ADeviceThatDoesNotOpenSaysWhy) {
  const struct {
    int number;
    const char* error;
  } kRows[] = {
      {EACCES, "LinuxErrorDomain code 4: open on /dev/hidraw0 failed: Permission denied (EACCES)"},
      {ENODEV, "LinuxErrorDomain code 9: open on /dev/hidraw0 failed: No such device (ENODEV)"},
      {ENOENT, "LinuxErrorDomain code 9: /dev/hidraw0 has been removed."},
      {EMFILE, "LinuxErrorDomain code 1: open on /dev/hidraw0 failed: Too many open files (EMFILE)"},
  };
  const std::shared_ptr<HidDevice> device = sensor();
  for (const auto& row : kRows) {
    calls_->openError = row.number;
    EXPECT_EQ(errorOfOpen(*device), row.error);
  }
  calls_->openError = 0;
  EXPECT_TRUE(device->open(nullptr));
}

TEST_F(LinuxHidTest, ADeviceInThePlaceOfAnotherIsNotOpened) {
  const std::shared_ptr<HidDevice> device = sensor();
  tree_.disconnect("hidraw0");
  tree_.connect("hidraw0", sensorDescriptor(), "Test Sensor", 2);
  EXPECT_EQ(errorOfOpen(*device),
            "LinuxErrorDomain code 9: /dev/hidraw0 has been removed, and another device has its place.");
  EXPECT_TRUE(find().at(0)->open(nullptr));
}

TEST_F(LinuxHidTest, ADeviceThatGoesWhileItIsOpenedHasNotBeenReplaced) {
  const std::shared_ptr<HidDevice> device = sensor();
  calls_->onOpen = [this] { tree_.disconnect("hidraw0"); };
  EXPECT_EQ(errorOfOpen(*device), "LinuxErrorDomain code 9: /dev/hidraw0 has been removed.");
  calls_->device.reset();
}

TEST_F(LinuxHidTest, ASignalIsNotTakenForTheAnswerToAFeatureReport) {
  const std::shared_ptr<HidDevice> device = sensor();
  ASSERT_TRUE(device->open(nullptr));
  calls_->featureInterruptions = 2;
  EXPECT_TRUE(device->setFeatureReportWithID(0xAB, Bytes{0xAB, 1}, nullptr));
  EXPECT_THAT(calls_->features, testing::SizeIs(3));
  calls_->featureInterruptions = 1;
  calls_->featureError = EIO;
  calls_->featureTime = 2600ms;
  EXPECT_THAT(errorOfFeature(*device, 0xAB, {0xAB, 1}), ::testing::HasSubstr("failed: the device did not respond"));
}

TEST_F(LinuxHidTest, FeatureReportsReachTheDeviceWhole) {
  const std::shared_ptr<HidDevice> device = sensor();
  EXPECT_EQ(errorOfFeature(*device, 0xAB, {0xAB, 1}), "LinuxErrorDomain code 7: /dev/hidraw0 is not open.");
  ASSERT_TRUE(device->open(nullptr));
  DiagnosticErrorPtr error = makeError("D", 1, "Here before.");
  EXPECT_TRUE(device->setFeatureReportWithID(0xAB, Bytes{0xAB, 1}, &error));
  EXPECT_EQ(defaultText(error), "D code 1: Here before.");
  EXPECT_TRUE(device->setFeatureReportWithID(0, Bytes{0, 7}, nullptr));
  EXPECT_THAT(calls_->features, ElementsAre(Bytes{0xAB, 1}, Bytes{0, 7}));
  const std::string refusal =
      "LinuxErrorDomain code 6: /dev/hidraw0 accepts feature reports that begin with their ID and have at most 16383 "
      "bytes.";
  EXPECT_EQ(errorOfFeature(*device, 0xAB, {}), refusal);
  EXPECT_EQ(errorOfFeature(*device, 0xAB, {0xAC, 1}), refusal);
  EXPECT_EQ(errorOfFeature(*device, 0xAB, Bytes(16384, 0xAB)), refusal);
  EXPECT_TRUE(device->setFeatureReportWithID(0xAB, Bytes(16383, 0xAB), nullptr));
  EXPECT_THAT(calls_->features, testing::SizeIs(3));
  device->close(0);
  EXPECT_EQ(errorOfFeature(*device, 0xAB, {0xAB, 1}), "LinuxErrorDomain code 7: /dev/hidraw0 is not open.");
}

TEST_F(LinuxHidTest, AFeatureReportThatFailsSaysWhy) {
  const struct {
    const char* name;
    int number;
    std::chrono::nanoseconds time;
    const char* error;
  } kRows[] = {
      {"refused", EIO, 1ms,
       "LinuxErrorDomain code 1: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: Input/output error (EIO)"},
      {"refused late", EIO, 4499ms,
       "LinuxErrorDomain code 1: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: Input/output error (EIO)"},
      {"without an answer in time", EIO, 4500ms,
       "LinuxErrorDomain code 11: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: the device did not respond for "
       "4500 ms."},
      {"without an answer", EIO, 5120ms,
       "LinuxErrorDomain code 11: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: the device did not respond for "
       "5120 ms."},
      {"without an answer from USB", ETIMEDOUT, 1s,
       "LinuxErrorDomain code 11: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: the device did not respond for "
       "1000 ms."},
      {"gone", ENODEV, 5s,
       "LinuxErrorDomain code 9: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: No such device (ENODEV)"},
      {"not known", EPIPE, 6s,
       "LinuxErrorDomain code 1: HIDIOCSFEATURE of report 171 on /dev/hidraw0 failed: Broken pipe (EPIPE)"},
  };
  const std::shared_ptr<HidDevice> device = sensor();
  ASSERT_TRUE(device->open(nullptr));
  for (const auto& row : kRows) {
    calls_->featureError = row.number;
    calls_->featureTime = row.time;
    EXPECT_EQ(errorOfFeature(*device, 0xAB, {0xAB, 1}), row.error) << row.name;
  }
}

TEST_F(LinuxHidTest, ReportsComeOnTheLoopOfTheThreadUntilTheDeviceGoes) {
  RunLoop& loop = *makeLinuxRunLoops()->currentRunLoop();
  std::vector<std::string> seen;
  for (const bool numbered : {true, false}) {
    tree_.connect("hidraw0", numbered ? sensorDescriptor() : unnumberedDescriptor());
    std::shared_ptr<HidDevice> device = find().at(0);
    ASSERT_TRUE(device->open(nullptr));
    device->setInputReportCallback([&](std::uint8_t id, std::span<const std::uint8_t> data,
                                       const DiagnosticErrorPtr& error) {
      seen.push_back(error == nullptr ? std::to_string(id) + ": " + defaultText(Value(Bytes(data.begin(), data.end())))
                                      : textOf(error));
    });
    device->scheduleWithRunLoop(loop, kRunLoopDefaultMode);
    sendReport(calls_->device, {0x76, 1});
    EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 0ns, false), RunLoopResult::kTimedOut);
    calls_->device.reset();
    EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 0ns, false), RunLoopResult::kTimedOut);
    device->unscheduleFromRunLoop(loop, kRunLoopDefaultMode);
    EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 1s, false), RunLoopResult::kFinished);
    device.reset();
    tree_.disconnect("hidraw0");
  }
  EXPECT_THAT(seen, ElementsAre("118: 7601", "LinuxErrorDomain code 9: /dev/hidraw0 has been removed.", "0: 007601",
                                "LinuxErrorDomain code 9: /dev/hidraw0 has been removed."));
}

TEST_F(LinuxHidTest, ADeviceThatIsDroppedWhileItIsScheduledLeavesItsLoop) {
  RunLoop& loop = *makeLinuxRunLoops()->currentRunLoop();
  std::shared_ptr<HidDevice> device = sensor();
  ASSERT_TRUE(device->open(nullptr));
  device->setInputReportCallback([](auto...) { ADD_FAILURE() << "nobody is there"; });
  device->scheduleWithRunLoop(loop, kRunLoopDefaultMode);
  sendReport(calls_->device, {0x76, 1});
  device.reset();
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 10s, false), RunLoopResult::kFinished);
}

// The system's own calls, on files that are not HID devices.
TEST(HidrawCallsTest, TheyAskTheSystem) {
  const std::shared_ptr<HidrawCalls> calls = makeHidrawCalls();
  EXPECT_FALSE(calls->open("/no/such/device"));
  EXPECT_EQ(errno, ENOENT);
  const FileDescriptor null = calls->open("/dev/null");
  ASSERT_TRUE(null);
  const std::array<std::uint8_t, 2> report{0xAB, 1};
  EXPECT_LT(calls->setFeature(null.get(), report), 0);
  EXPECT_EQ(errno, ENOTTY);
  std::array<std::uint8_t, 2> room{};
  EXPECT_EQ(calls->read(null.get(), room), 0);
  EXPECT_LT(calls->read(-1, room), 0);
  EXPECT_EQ(errno, EBADF);
  EXPECT_EQ(calls->read(calls->open("/dev/zero").get(), room), 2);
  const auto before = calls->now();
  EXPECT_GE(calls->now(), before);
}

}  // namespace
}  // namespace quazor
