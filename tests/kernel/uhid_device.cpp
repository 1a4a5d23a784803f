#include "tests/kernel/uhid_device.h"

#include "backends/simulated/hid/hid_image_report.h"

#include <linux/input.h>
#include <linux/uhid.h>

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cmath>
#include <cstddef>
#include <cstring>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint8_t kPowerMode = 0xAB;
constexpr std::uint8_t kStreamingMode = 0xAC;
constexpr std::uint8_t kOn = 1;
constexpr std::uint16_t kRefused = EIO;

// Usage 0x24 of the vendor page 0xFF00, with input report 0x76 of 791 bytes after its ID and feature reports 0xAB and
// 0xAC of one byte.
constexpr std::array<std::uint8_t, 40> kDescriptor{
    0x06, 0x00, 0xFF,                                      // usage page 0xFF00
    0x09, 0x24, 0xA1, 0x01,                                // usage 0x24, application collection
    0x15, 0x00, 0x26, 0xFF, 0x00, 0x75, 0x08,              // fields of 8 bits, from 0 to 255
    0x85, 0x76, 0x09, 0x76, 0x96, 0x17, 0x03, 0x81, 0x02,  // report 0x76: 791 input fields
    0x85, 0xAB, 0x09, 0xAB, 0x95, 0x01, 0xB1, 0x02,        // report 0xAB: a feature
    0x85, 0xAC, 0x09, 0xAC, 0x95, 0x01, 0xB1, 0x02,        // report 0xAC: another
    0xC0};

// An event is written up to the end of its used part.
constexpr std::size_t kPayload = offsetof(uhid_event, u);

}  // namespace

UhidSensor::UhidSensor(FileDescriptor uhid, UhidSensorConfig traits)
    : uhid_(std::move(uhid)),
      traits_(std::move(traits)),
      period_(static_cast<Time::rep>(std::llround(1e9 / traits_.rate))) {}

bool UhidSensor::write(const uhid_event& event, std::size_t size) {
  return ::write(uhid_.get(), &event, size) == static_cast<ssize_t>(size);
}

bool UhidSensor::create() {
  uhid_event event{};
  event.type = UHID_CREATE2;
  uhid_create2_req& request = event.u.create2;
  std::memcpy(request.name, traits_.name.data(), std::min(traits_.name.size(), sizeof request.name - 1));
  request.rd_size = static_cast<std::uint16_t>(kDescriptor.size());
  std::memcpy(request.rd_data, kDescriptor.data(), kDescriptor.size());
  request.bus = BUS_USB;
  request.vendor = 0x1209;
  request.product = 0x0001;
  created_ = write(event, sizeof event);
  return created_;
}

void UhidSensor::destroy() {
  if (!created_ || gone_) return;
  uhid_event event{};
  event.type = UHID_DESTROY;
  gone_ = true;
  streaming_ = false;
  (void)write(event, sizeof event.type);
}

bool UhidSensor::handleEvent(Time now) {
  uhid_event event{};
  const ssize_t size = ::read(uhid_.get(), &event, sizeof event);
  if (size < 0) return false;
  switch (event.type) {
    case UHID_START: started_ = true; return true;
    case UHID_OPEN: open_ = true; break;
    case UHID_CLOSE: open_ = false; break;
    case UHID_SET_REPORT: return takeFeature(event, now);
    case UHID_GET_REPORT: return refuseRead(event.u.get_report.id);
    default: return true;
  }
  startOrStop(now);
  return true;
}

bool UhidSensor::takeFeature(const uhid_event& event, Time now) {
  const uhid_set_report_req& request = event.u.set_report;
  const auto end = static_cast<std::size_t>(std::min<std::uint16_t>(request.size, UHID_DATA_MAX));
  const Bytes data(request.data, request.data + end);
  features_.push_back({request.rnum, data});
  if (traits_.ignores.contains(request.rnum)) return true;
  const bool refused =
      traits_.refuses.contains(request.rnum) || request.rtype != UHID_FEATURE_REPORT || data.size() < 2;
  if (!refused) values_[request.rnum] = data[1];
  uhid_event answer{};
  answer.type = UHID_SET_REPORT_REPLY;
  answer.u.set_report_reply.id = request.id;
  answer.u.set_report_reply.err = refused ? kRefused : std::uint16_t{0};
  if (!write(answer, kPayload + sizeof answer.u.set_report_reply)) return false;
  startOrStop(now);
  return true;
}

bool UhidSensor::refuseRead(std::uint32_t request) {
  uhid_event answer{};
  answer.type = UHID_GET_REPORT_REPLY;
  answer.u.get_report_reply.id = request;
  answer.u.get_report_reply.err = kRefused;
  return write(answer, kPayload + sizeof answer.u.get_report_reply);
}

void UhidSensor::startOrStop(Time now) {
  const auto isOn = [this](std::uint8_t id) {
    const auto found = values_.find(id);
    return found != values_.end() && found->second == kOn;
  };
  const bool wanted = open_ && !gone_ && (traits_.alwaysStreams || (isOn(kPowerMode) && isOn(kStreamingMode)));
  if (wanted == streaming_) return;
  streaming_ = wanted;
  next_ = now + period_;
}

std::optional<UhidSensor::Time> UhidSensor::due() const {
  const bool hasEnded = traits_.stopsAfter && sent_ >= *traits_.stopsAfter && !traits_.removedAfter;
  return streaming_ && !hasEnded ? std::optional(next_) : std::nullopt;
}

bool UhidSensor::act(Time now) {
  while (due() && *due() <= now) {
    next_ += period_;
    if (traits_.removedAfter && sent_ >= *traits_.removedAfter) {
      destroy();
    } else if (!sendReport(now)) {
      return false;
    }
  }
  return true;
}

bool UhidSensor::sendReport(Time now) {
  HidReportShape shape;
  shape.length = traits_.length;
  const Bytes report = hidInputReport(traits_.images, shape, sent_, now);
  uhid_event event{};
  event.type = UHID_INPUT2;
  event.u.input2.size = static_cast<std::uint16_t>(std::min<std::size_t>(report.size(), UHID_DATA_MAX));
  std::memcpy(event.u.input2.data, report.data(), event.u.input2.size);
  if (!write(event, kPayload + offsetof(uhid_input2_req, data) + event.u.input2.size)) return false;
  ++sent_;
  return true;
}

}  // namespace quazor
