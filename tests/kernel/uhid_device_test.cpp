#include "tests/kernel/uhid_device.h"

#include <linux/uhid.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// A sensor on connected sockets; the test plays the kernel.
class UhidDeviceTest : public ::testing::Test {
 protected:
  void make(DisplaySensorConfig traits) {
    std::array<int, 2> ends{-1, -1};
    ASSERT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends.data()), 0);
    kernel_ = FileDescriptor(ends[0]);
    sensor_ = std::make_unique<UhidSensor>(FileDescriptor(ends[1]), std::move(traits));
    ASSERT_TRUE(sensor_->create());
    const auto created = received();
    ASSERT_TRUE(created && created->type == UHID_CREATE2);
    created_ = *created;
  }
  void make() {
    DisplaySensorConfig traits;
    traits.rate = 100;
    make(traits);
  }
  // The next event that the sensor wrote, or nothing.
  std::optional<uhid_event> received() {
    uhid_event event{};
    size_ = ::recv(kernel_.get(), &event, sizeof event, 0);
    return size_ > 0 ? std::optional(event) : std::nullopt;
  }
  void tell(const uhid_event& event, UhidSensor::Time now = 0ns) {
    ASSERT_EQ(::send(kernel_.get(), &event, sizeof event, MSG_NOSIGNAL), static_cast<ssize_t>(sizeof event));
    EXPECT_TRUE(sensor_->handleEvent(now));
  }
  void tell(std::uint32_t type, UhidSensor::Time now = 0ns) {
    uhid_event event{};
    event.type = type;
    tell(event, now);
  }
  // Sends a feature report and returns the error in the response, or nothing without a response.
  std::optional<int> set(std::uint8_t id, std::uint8_t value, std::uint8_t type = UHID_FEATURE_REPORT,
                         std::uint16_t size = 2, UhidSensor::Time now = 0ns) {
    uhid_event event{};
    event.type = UHID_SET_REPORT;
    event.u.set_report.id = 7;
    event.u.set_report.rnum = id;
    event.u.set_report.rtype = type;
    event.u.set_report.size = size;
    event.u.set_report.data[0] = id;
    event.u.set_report.data[1] = value;
    tell(event, now);
    const auto answer = received();
    if (!answer) return std::nullopt;
    EXPECT_EQ(answer->type, std::uint32_t{UHID_SET_REPORT_REPLY});
    EXPECT_EQ(answer->u.set_report_reply.id, 7U);
    return answer->u.set_report_reply.err;
  }
  void turnOn(UhidSensor::Time now = 0ns) {
    tell(UHID_OPEN, now);
    EXPECT_EQ(set(0xAB, 1, UHID_FEATURE_REPORT, 2, now), 0);
    EXPECT_EQ(set(0xAC, 1, UHID_FEATURE_REPORT, 2, now), 0);
  }
  // The frame ID of the next report, or nothing.
  std::optional<std::uint32_t> frame() {
    const auto event = received();
    if (!event) return std::nullopt;
    EXPECT_EQ(event->type, std::uint32_t{UHID_INPUT2});
    EXPECT_EQ(size_, 6 + event->u.input2.size);
    EXPECT_EQ(event->u.input2.data[0], 0x76);
    std::uint32_t id = 0;
    std::memcpy(&id, event->u.input2.data + 4, sizeof id);
    return id;
  }

  FileDescriptor kernel_;
  std::unique_ptr<UhidSensor> sensor_;
  uhid_event created_{};
  ssize_t size_ = 0;
};

TEST_F(UhidDeviceTest, TheKernelIsToldOfASensor) {
  DisplaySensorConfig traits;
  traits.name = std::string(200, 'n');
  make(traits);
  EXPECT_EQ(size_, static_cast<ssize_t>(sizeof(uhid_event)));
  EXPECT_EQ(created_.u.create2.rd_size, 40);
  EXPECT_EQ(created_.u.create2.rd_data[0], 0x06);
  EXPECT_EQ(created_.u.create2.rd_data[39], 0xC0);
  EXPECT_EQ(std::string(reinterpret_cast<const char*>(created_.u.create2.name)), std::string(127, 'n'));
  EXPECT_FALSE(sensor_->isStarted());
  tell(UHID_START);
  EXPECT_TRUE(sensor_->isStarted());
}

TEST_F(UhidDeviceTest, ImagesComeWhileItIsOpenAndBothModesAreOn) {
  make();
  tell(UHID_OPEN);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  EXPECT_EQ(set(0xAB, 1), 0);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  EXPECT_EQ(set(0xAC, 1, UHID_FEATURE_REPORT, 2, 1s), 0);
  EXPECT_EQ(sensor_->due(), 1010ms);
  EXPECT_TRUE(sensor_->act(1009ms));
  EXPECT_EQ(frame(), std::nullopt);
  EXPECT_TRUE(sensor_->act(1035ms));
  EXPECT_EQ(frame(), 1U);
  EXPECT_EQ(frame(), 2U);
  EXPECT_EQ(frame(), 3U);
  EXPECT_EQ(frame(), std::nullopt);
  EXPECT_EQ(sensor_->sensor().sent(), 3U);
  tell(UHID_CLOSE);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  tell(UHID_OPEN, 2s);
  EXPECT_EQ(sensor_->due(), 2010ms);
  EXPECT_EQ(set(0xAC, 0), 0);
  EXPECT_EQ(sensor_->due(), std::nullopt);
}

TEST_F(UhidDeviceTest, ASensorMayAlwaysStream) {
  DisplaySensorConfig traits;
  traits.alwaysStreams = true;
  traits.rate = 1;
  make(traits);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  tell(UHID_OPEN);
  EXPECT_EQ(sensor_->due(), 1s);
}

TEST_F(UhidDeviceTest, ReportsHaveTheLengthThatIsAskedFor) {
  DisplaySensorConfig traits;
  traits.length = 4096;
  traits.images.firstFrameID = 5;
  make(traits);
  turnOn();
  EXPECT_TRUE(sensor_->act(20ms));
  EXPECT_EQ(frame(), 5U);
  EXPECT_EQ(size_, 4102);
}

TEST_F(UhidDeviceTest, FeatureReportsAreAnsweredRefusedOrIgnored) {
  DisplaySensorConfig traits;
  traits.refuses = {0xAB};
  traits.ignores = {0xAC};
  make(traits);
  tell(UHID_OPEN);
  EXPECT_EQ(set(0xAB, 1), EIO);
  EXPECT_EQ(set(0xAC, 1), std::nullopt);
  EXPECT_EQ(set(0xAD, 1), 0);
  EXPECT_EQ(set(0xAD, 1, UHID_OUTPUT_REPORT), EIO);
  EXPECT_EQ(set(0xAD, 1, UHID_FEATURE_REPORT, 1), EIO);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  ASSERT_THAT(sensor_->sensor().features(), testing::SizeIs(5));
  EXPECT_EQ(sensor_->sensor().features()[0].id, 0xAB);
  EXPECT_THAT(sensor_->sensor().features()[0].data, testing::ElementsAre(0xAB, 1));
}

TEST_F(UhidDeviceTest, ReadsOfFeatureReportsAreRefusedAndOtherEventsPassedOver) {
  make();
  uhid_event event{};
  event.type = UHID_GET_REPORT;
  event.u.get_report.id = 9;
  tell(event);
  const auto answer = received();
  ASSERT_TRUE(answer.has_value());
  EXPECT_EQ(answer->type, std::uint32_t{UHID_GET_REPORT_REPLY});
  EXPECT_EQ(answer->u.get_report_reply.id, 9U);
  EXPECT_EQ(answer->u.get_report_reply.err, EIO);
  tell(UHID_STOP);
  EXPECT_FALSE(received().has_value());
}

TEST_F(UhidDeviceTest, ASensorThatStopsSendsNoMore) {
  DisplaySensorConfig traits;
  traits.stopsAfter = 2;
  make(traits);
  turnOn();
  EXPECT_TRUE(sensor_->act(1s));
  EXPECT_EQ(sensor_->sensor().sent(), 2U);
  EXPECT_EQ(sensor_->due(), std::nullopt);
  EXPECT_FALSE(sensor_->sensor().isGone());
}

TEST_F(UhidDeviceTest, ASensorThatIsRemovedSaysSoToTheKernelOnce) {
  DisplaySensorConfig traits;
  traits.removedAfter = 2;
  make(traits);
  turnOn();
  EXPECT_TRUE(sensor_->act(1s));
  EXPECT_EQ(frame(), 1U);
  EXPECT_EQ(frame(), 2U);
  const auto event = received();
  ASSERT_TRUE(event.has_value());
  EXPECT_EQ(event->type, std::uint32_t{UHID_DESTROY});
  EXPECT_TRUE(sensor_->sensor().isGone());
  sensor_->destroy();
  EXPECT_FALSE(received().has_value());
}

TEST_F(UhidDeviceTest, WhatTheKernelRefusesIsTold) {
  make();
  EXPECT_FALSE(sensor_->handleEvent(0ns));
  EXPECT_EQ(errno, EAGAIN);
  turnOn();
  kernel_.reset();
  ::signal(SIGPIPE, SIG_IGN);
  EXPECT_FALSE(sensor_->act(1s));
  EXPECT_EQ(sensor_->sensor().sent(), 0U);
  EXPECT_FALSE(sensor_->create());
}

}  // namespace
}  // namespace quazor
