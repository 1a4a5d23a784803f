#include "backends/simulated/hid/hid_sensor.h"

#include "backends/simulated/hid/sensor_user_for_tests.h"
#include "backends/simulated/simulated_phone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::SizeIs;

class HidSensorTest : public ::testing::Test {
 protected:
  template <class Change>
  void make(Change&& change) {
    HidDeviceConfig sensor = testSensor();
    change(sensor);
    phone_.emplace(sensorScenario({sensor}), PhoneTime::kVirtual, 1);
    user_.emplace(phone_->platform());
  }
  void make() {
    make([](HidDeviceConfig&) {});
  }
  std::string setting(std::uint8_t id, std::vector<std::uint8_t> payload) {
    DiagnosticErrorPtr error;
    const bool succeeded = user_->device->setFeatureReportWithID(id, payload, &error);
    return succeeded ? "done" : defaultText(error);
  }
  std::string opening() {
    DiagnosticErrorPtr error;
    return user_->device->open(&error) ? "done" : defaultText(error);
  }

  std::optional<SimulatedPhone> phone_;
  std::optional<SensorUser> user_;
};

TEST_F(HidSensorTest, ImagesComeAtTheRate) {
  make();
  ASSERT_TRUE(user_->start());
  EXPECT_EQ(user_->run(35ms), RunLoopResult::kTimedOut);
  EXPECT_THAT(user_->seen(),
              ElementsAre("0x76 frame 1, 792 bytes", "0x76 frame 2, 792 bytes", "0x76 frame 3, 792 bytes"));
  EXPECT_THAT(user_->times(), ElementsAre(10ms, 20ms, 30ms));
}

TEST_F(HidSensorTest, RatesDoNotDrift) {
  make([](HidDeviceConfig& sensor) { sensor.rate = 60; });
  ASSERT_TRUE(user_->start());
  user_->run(10s - 1ns);
  EXPECT_THAT(user_->seen(), SizeIs(599));
  user_->run(2ns);
  EXPECT_THAT(user_->seen(), SizeIs(600));
}

TEST_F(HidSensorTest, ImagesCarryTheTimeOfTheirSending) {
  make();
  ASSERT_TRUE(user_->start());
  std::vector<std::uint8_t> last;
  user_->device->setInputReportCallback([&](std::uint8_t, std::span<const std::uint8_t> data,
                                            const DiagnosticErrorPtr&) { last.assign(data.begin(), data.end()); });
  user_->run(305ms);
  ASSERT_THAT(last, SizeIs(792));
  EXPECT_EQ(last[12] | last[13] << 8, 300);
}

TEST_F(HidSensorTest, NothingComesUnlessEveryFeatureReportIsAsItMustBe) {
  const struct {
    const char* name;
    std::vector<std::pair<std::uint8_t, std::uint8_t>> settings;
    std::size_t images;
  } kRows[] = {
      {"nothing set", {}, 0},
      {"only the first", {{0xAB, 1}}, 0},
      {"only the second", {{0xAC, 2}}, 0},
      {"a value below", {{0xAB, 1}, {0xAC, 1}}, 0},
      {"a value above", {{0xAB, 1}, {0xAC, 3}}, 0},
      {"both", {{0xAB, 1}, {0xAC, 2}}, 10},
      {"in the other order", {{0xAC, 2}, {0xAB, 1}}, 10},
      {"and one that does not matter", {{0xAC, 2}, {0xAB, 1}, {0xAD, 255}}, 10},
      {"taken back", {{0xAB, 1}, {0xAC, 2}, {0xAB, 0}}, 0},
  };
  for (const auto& row : kRows) {
    make();
    ASSERT_TRUE(user_->device->open(nullptr));
    user_->schedule();
    for (const auto& [id, value] : row.settings) EXPECT_TRUE(user_->set(id, value)) << row.name;
    user_->run(105ms);
    EXPECT_THAT(user_->seen(), SizeIs(row.images)) << row.name;
  }
}

TEST_F(HidSensorTest, ASensorWithoutSettingsStreamsOnceItIsOpen) {
  make([](HidDeviceConfig& sensor) { sensor.featureReports.clear(); });
  user_->schedule();
  user_->run(50ms);
  EXPECT_THAT(user_->seen(), testing::IsEmpty());
  ASSERT_TRUE(user_->device->open(nullptr));
  user_->run(55ms);
  EXPECT_THAT(user_->seen(), SizeIs(5));
}

TEST_F(HidSensorTest, FeatureReportsAreRefusedAsARealSensorWould) {
  make();
  EXPECT_EQ(setting(0xAB, {0xAB, 1}), refusal(HidErrorCode::kNotOpen, "sensor is not open; open it first."));
  ASSERT_TRUE(user_->device->open(nullptr));
  const struct {
    const char* name;
    std::uint8_t id;
    std::vector<std::uint8_t> payload;
    std::string outcome;
  } kRows[] = {
      {"the right one", 0xAB, {0xAB, 1}, "done"},
      {"any value", 0xAC, {0xAC, 255}, "done"},
      {"a value that it does not take",
       0xAB,
       {0xAB, 2},
       refusal(HidErrorCode::kRefusedReport, "Feature report 0xAB of sensor does not take the value 2.")},
      {"a report that it does not have",
       0x76,
       {0x76, 1},
       refusal(HidErrorCode::kUnknownReport, "sensor has no feature report 0x76.")},
      {"another ID in the payload",
       0xAB,
       {0xAC, 1},
       refusal(HidErrorCode::kRefusedReport, "Feature report 0xAB of sensor is two bytes, its ID and a value.")},
      {"a short one",
       0xAB,
       {0xAB},
       refusal(HidErrorCode::kRefusedReport, "Feature report 0xAB of sensor is two bytes, its ID and a value.")},
      {"a long one",
       0xAB,
       {0xAB, 1, 0},
       refusal(HidErrorCode::kRefusedReport, "Feature report 0xAB of sensor is two bytes, its ID and a value.")},
  };
  for (const auto& row : kRows) EXPECT_EQ(setting(row.id, row.payload), row.outcome) << row.name;
}

TEST_F(HidSensorTest, ADeviceIsOpenedOnce) {
  make();
  EXPECT_EQ(opening(), "done");
  EXPECT_EQ(opening(), refusal(HidErrorCode::kAlreadyOpen, "sensor is already open."));
  user_->device->close(0);
  user_->device->close(0);
  EXPECT_EQ(opening(), "done");
}

TEST_F(HidSensorTest, ClosingEndsTheImagesAndKeepsTheSettings) {
  make();
  ASSERT_TRUE(user_->start());
  user_->run(25ms);
  user_->device->close(0);
  user_->run(100ms);
  EXPECT_THAT(user_->seen(), SizeIs(2));
  ASSERT_TRUE(user_->device->open(nullptr));
  user_->run(25ms);
  EXPECT_THAT(user_->seen(), ElementsAre("0x76 frame 1, 792 bytes", "0x76 frame 2, 792 bytes",
                                         "0x76 frame 3, 792 bytes", "0x76 frame 4, 792 bytes"));
  EXPECT_THAT(user_->times(), ElementsAre(10ms, 20ms, 135ms, 145ms));
}

TEST_F(HidSensorTest, AStopAndAStartBeginAFreshPeriod) {
  make();
  ASSERT_TRUE(user_->start());
  user_->run(15ms);
  ASSERT_TRUE(user_->set(0xAB, 0) && user_->set(0xAB, 1));
  user_->run(11ms);
  EXPECT_THAT(user_->times(), ElementsAre(10ms, 25ms));
  ASSERT_TRUE(user_->set(0xAB, 1));  // same value as before
  user_->run(9ms);
  EXPECT_THAT(user_->times(), ElementsAre(10ms, 25ms, 35ms));
}

TEST_F(HidSensorTest, SingleReportsDifferFromAll) {
  make([](HidDeviceConfig& sensor) {
    sensor.every.length = 800;
    sensor.single[1].reportID = 0x75;
    sensor.single[2].length = 3;
    sensor.single[3].error = FaultError{"SensorErrorDomain", -4, "The sensor is hot."};
  });
  ASSERT_TRUE(user_->start());
  user_->run(55ms);
  EXPECT_THAT(user_->seen(), ElementsAre("0x76 frame 1, 800 bytes", "0x75 frame 2, 800 bytes", "0x76, 3 bytes",
                                         "SensorErrorDomain code -4: The sensor is hot.", "0x76 frame 5, 800 bytes"));
}

TEST_F(HidSensorTest, AllReportsCanHaveAnotherID) {
  make([](HidDeviceConfig& sensor) {
    sensor.every.reportID = 0x77;
    sensor.single[1].reportID = 0x76;
  });
  ASSERT_TRUE(user_->start());
  user_->run(25ms);
  EXPECT_THAT(user_->seen(), ElementsAre("0x77 frame 1, 792 bytes", "0x76 frame 2, 792 bytes"));
}

TEST_F(HidSensorTest, ASensorMaySendNoMore) {
  make([](HidDeviceConfig& sensor) { sensor.reportCount = 2; });
  ASSERT_TRUE(user_->start());
  EXPECT_EQ(user_->run(1s), RunLoopResult::kTimedOut);
  EXPECT_THAT(user_->seen(), SizeIs(2));
  user_->device->close(0);
  ASSERT_TRUE(user_->device->open(nullptr));
  user_->run(1s);
  EXPECT_THAT(user_->seen(), SizeIs(2));
}

TEST_F(HidSensorTest, ASensorThatIsRemovedSaysSoOnce) {
  make([](HidDeviceConfig& sensor) { sensor.removedAfter = 1; });
  ASSERT_TRUE(user_->start());
  user_->run(1s);
  const std::string gone = refusal(HidErrorCode::kGone, "sensor has been removed.");
  EXPECT_THAT(user_->seen(), ElementsAre("0x76 frame 1, 792 bytes", gone));
  EXPECT_EQ(setting(0xAB, {0xAB, 1}), gone);
  user_->device->close(0);
  EXPECT_EQ(opening(), gone);
  const std::shared_ptr<HidManager> manager = phone_->platform().hid->createManager();
  manager->enumerateDevicesMatching({Dictionary{}});
  EXPECT_THAT(manager->devices(), testing::IsEmpty());
}

TEST_F(HidSensorTest, EveryUserGetsEveryReport) {
  make();
  SensorUser other(phone_->platform());
  ASSERT_TRUE(user_->start());
  user_->run(15ms);
  ASSERT_TRUE(other.device->open(nullptr));
  other.schedule();
  user_->run(10ms);
  user_->device->close(0);
  user_->run(10ms);
  EXPECT_THAT(user_->seen(), ElementsAre("0x76 frame 1, 792 bytes", "0x76 frame 2, 792 bytes"));
  EXPECT_THAT(other.seen(), ElementsAre("0x76 frame 2, 792 bytes", "0x76 frame 3, 792 bytes"));
}

TEST_F(HidSensorTest, ADeviceThatIsDestroyedEndsItsUse) {
  make();
  ASSERT_TRUE(user_->start());
  user_->run(15ms);
  user_->device = nullptr;
  EXPECT_EQ(user_->run(100ms), RunLoopResult::kFinished);
  EXPECT_THAT(user_->seen(), SizeIs(1));
  SensorUser other(phone_->platform());
  ASSERT_TRUE(other.start());
  other.run(15ms);
  EXPECT_THAT(other.seen(), ElementsAre("0x76 frame 2, 792 bytes"));
}

TEST_F(HidSensorTest, TheReceiverMayDestroyTheDevice) {
  make();
  ASSERT_TRUE(user_->start());
  user_->onInput = [this] { user_->device = nullptr; };
  EXPECT_EQ(user_->run(100ms), RunLoopResult::kFinished);
  EXPECT_THAT(user_->seen(), SizeIs(1));
}

TEST_F(HidSensorTest, ADeviceOutlivesItsManagerAndThePhone) {
  make();
  ASSERT_TRUE(user_->device->open(nullptr));
  const Platform platform = phone_->platform();
  phone_.reset();
  ASSERT_TRUE(user_->set(0xAB, 1) && user_->set(0xAC, 2));
  user_->schedule();
  user_->run(25ms);
  EXPECT_THAT(user_->seen(), SizeIs(2));
}

TEST_F(HidSensorTest, ReportsEndWithTheirLastUser) {
  make();
  ASSERT_TRUE(user_->start());
  const std::weak_ptr<HidDevice> device = user_->device;
  user_->device = nullptr;
  EXPECT_TRUE(device.expired());
  const auto before = phone_->platform().clock->now();
  user_->run(1s);
  EXPECT_EQ(phone_->platform().clock->now(), before);  // nothing was left to wait for
}

}  // namespace
}  // namespace quazor
