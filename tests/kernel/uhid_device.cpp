#include "tests/kernel/uhid_device.h"

#include <linux/input.h>
#include <linux/uhid.h>

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <span>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint16_t kRefused = EIO;

// An event is written up to the end of its used part.
constexpr std::size_t kPayload = offsetof(uhid_event, u);

}  // namespace

UhidSensor::UhidSensor(FileDescriptor uhid, DisplaySensorConfig config)
    : uhid_(std::move(uhid)), sensor_(std::move(config)) {}

bool UhidSensor::write(const uhid_event& event, std::size_t size) {
  return ::write(uhid_.get(), &event, size) == static_cast<ssize_t>(size);
}

bool UhidSensor::create() {
  uhid_event event{};
  event.type = UHID_CREATE2;
  uhid_create2_req& request = event.u.create2;
  const std::string& name = sensor_.config().name;
  const std::span<const std::uint8_t> descriptor = displaySensorDescriptor();
  std::memcpy(request.name, name.data(), std::min(name.size(), sizeof request.name - 1));
  request.rd_size = static_cast<std::uint16_t>(descriptor.size());
  std::memcpy(request.rd_data, descriptor.data(), descriptor.size());
  request.bus = BUS_USB;
  request.vendor = kDisplaySensorVendor;
  request.product = kDisplaySensorProduct;
  created_ = write(event, sizeof event);
  return created_;
}

void UhidSensor::destroy() {
  if (!created_ || sensor_.isGone()) return;
  sensor_.remove();
  (void)tellRemoval();
}

bool UhidSensor::tellRemoval() {
  uhid_event event{};
  event.type = UHID_DESTROY;
  return write(event, sizeof event.type);
}

bool UhidSensor::handleEvent(Time now) {
  uhid_event event{};
  const ssize_t size = ::read(uhid_.get(), &event, sizeof event);
  if (size < 0) return false;
  switch (event.type) {
    case UHID_START: started_ = true; break;
    case UHID_OPEN: sensor_.setOpen(true, now); break;
    case UHID_CLOSE: sensor_.setOpen(false, now); break;
    case UHID_SET_REPORT: return takeReport(event, now);
    case UHID_GET_REPORT: return refuseRead(event.u.get_report.id);
    default: break;
  }
  return true;
}

bool UhidSensor::takeReport(const uhid_event& event, Time now) {
  const uhid_set_report_req& request = event.u.set_report;
  const std::span data(request.data, std::min<std::size_t>(request.size, UHID_DATA_MAX));
  const FeatureAnswer taken = sensor_.takeReport(request.rnum, request.rtype == UHID_FEATURE_REPORT, data, now);
  if (taken == FeatureAnswer::kNone) return true;
  uhid_event answer{};
  answer.type = UHID_SET_REPORT_REPLY;
  answer.u.set_report_reply.id = request.id;
  answer.u.set_report_reply.err = taken == FeatureAnswer::kRefused ? kRefused : std::uint16_t{0};
  return write(answer, kPayload + sizeof answer.u.set_report_reply);
}

bool UhidSensor::refuseRead(std::uint32_t request) {
  uhid_event answer{};
  answer.type = UHID_GET_REPORT_REPLY;
  answer.u.get_report_reply.id = request;
  answer.u.get_report_reply.err = kRefused;
  return write(answer, kPayload + sizeof answer.u.get_report_reply);
}

bool UhidSensor::act(Time now) {
  while (const std::optional<SensorAction> action = sensor_.takeAction(now)) {
    if (!(*action == SensorAction::kRemoval ? tellRemoval() : sendReport(now))) return false;
  }
  return true;
}

bool UhidSensor::sendReport(Time now) {
  const Bytes report = sensor_.report(now);
  uhid_event event{};
  event.type = UHID_INPUT2;
  event.u.input2.size = static_cast<std::uint16_t>(std::min<std::size_t>(report.size(), UHID_DATA_MAX));
  std::memcpy(event.u.input2.data, report.data(), event.u.input2.size);
  if (!write(event, kPayload + offsetof(uhid_input2_req, data) + event.u.input2.size)) return false;
  sensor_.countSent();
  return true;
}

}  // namespace quazor
