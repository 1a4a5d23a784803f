// The sensors in real time: reports are generated on one thread and received on another.
#include "backends/simulated/hid/sensor_user_for_tests.h"
#include "backends/simulated/simulated_phone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <thread>

namespace quazor {
namespace {

using namespace std::chrono_literals;

HidDeviceConfig fastSensor() {
  HidDeviceConfig sensor = testSensor();
  sensor.rate = 1000;
  return sensor;
}

TEST(SimulatedHidOnThreadsTest, ImagesReachTheLoopOfTheThread) {
  const SimulatedPhone phone(sensorScenario({fastSensor()}), PhoneTime::kReal, 0);
  SensorUser user(phone.platform());
  const std::thread::id here = std::this_thread::get_id();
  bool elsewhere = false;
  user.onInput = [&] {
    elsewhere = elsewhere || std::this_thread::get_id() != here;
    if (user.seen().size() == 3) user.loop().stop();
  };
  ASSERT_TRUE(user.start());
  EXPECT_EQ(user.run(10s), RunLoopResult::kStopped);
  EXPECT_FALSE(elsewhere);
  const std::vector<std::string> seen = user.seen();
  ASSERT_GE(seen.size(), 3U);
  EXPECT_THAT(std::vector(seen.begin(), seen.begin() + 3),
              testing::ElementsAre("0x76 frame 1, 792 bytes", "0x76 frame 2, 792 bytes", "0x76 frame 3, 792 bytes"));
}

TEST(SimulatedHidOnThreadsTest, NothingComesAfterTheEnd) {
  const SimulatedPhone phone(sensorScenario({fastSensor()}), PhoneTime::kReal, 0);
  for (int round = 0; round < 20; ++round) {
    SensorUser user(phone.platform());
    user.onInput = [&] { user.loop().stop(); };
    ASSERT_TRUE(user.start());
    ASSERT_EQ(user.run(10s), RunLoopResult::kStopped);
    if (round % 2 == 0) user.device->close(0);
    user.unschedule();
    const std::size_t count = user.seen().size();
    user.run(2ms);
    EXPECT_THAT(user.seen(), testing::SizeIs(count));
  }
}

TEST(SimulatedHidOnThreadsTest, DevicesMayBeDestroyedWhileReportsCome) {
  const SimulatedPhone phone(sensorScenario({fastSensor()}), PhoneTime::kReal, 0);
  for (int round = 0; round < 20; ++round) {
    SensorUser user(phone.platform());
    user.onInput = [&] {
      if (round % 2 == 0) user.device = nullptr;
      user.loop().stop();
    };
    ASSERT_TRUE(user.start());
    user.run(10s);
    user.device = nullptr;
    const std::size_t count = user.seen().size();
    user.run(1ms);
    EXPECT_THAT(user.seen(), testing::SizeIs(count));
  }
}

// The thread and its loop end as soon as the device is unscheduled, while reports are still sent.
TEST(SimulatedHidOnThreadsTest, ALoopMayEndOnceTheDeviceIsUnscheduled) {
  const SimulatedPhone phone(sensorScenario({fastSensor()}), PhoneTime::kReal, 0);
  SensorUser keeper(phone.platform());  // keeps the sensor streaming
  ASSERT_TRUE(keeper.start());
  for (int round = 0; round < 20; ++round) {
    std::size_t count = 0;
    std::thread([&] {
      SensorUser user(phone.platform());
      user.onInput = [&] { user.loop().stop(); };
      ASSERT_TRUE(user.device->open(nullptr));
      user.schedule();
      user.run(10s);
      user.unschedule();
      count = user.seen().size();
    }).join();
    EXPECT_GE(count, 1U);
  }
}

}  // namespace
}  // namespace quazor
