#include "backends/simulated/hid/hid_sensor.h"

#include "backends/faults/hid_report_name.h"
#include "backends/hid/hid_matching.h"
#include "backends/simulated/capture/frame_delivery.h"
#include "backends/simulated/errors/hid_error.h"
#include "backends/simulated/hid/hid_image_report.h"

#include <algorithm>
#include <utility>

namespace quazor {

HidSensor::HidSensor(HidDeviceConfig config, std::shared_ptr<Clock> clock, Concurrency& concurrency)
    : config_(std::move(config)),
      clock_(std::move(clock)),
      queue_(concurrency.makeSerialQueue("SimulatedHid." + config_.name, QualityOfService::kUserInteractive)) {
  for (const HidFeatureReport& report : config_.featureReports) values_[report.id] = 0;
}

bool HidSensor::matches(const std::vector<Dictionary>& matching) const {
  const std::lock_guard lock(mutex_);
  return !gone_ && matchesHidDevice(matching, HidUsage{config_.usagePage, config_.usage});
}

bool HidSensor::hasOpen(const std::shared_ptr<HidInbox>& user) const {
  return std::ranges::find(users_, user) != users_.end();
}

bool HidSensor::open(const std::shared_ptr<HidInbox>& user, DiagnosticErrorPtr* error) {
  const std::lock_guard lock(mutex_);
  if (gone_) return refuse(error, HidErrorCode::kGone, "%@ has been removed.", config_.name);
  if (hasOpen(user)) return refuse(error, HidErrorCode::kAlreadyOpen, "%@ is already open.", config_.name);
  user->open();
  users_.push_back(user);
  startOrStop();
  return true;
}

void HidSensor::close(const std::shared_ptr<HidInbox>& user) {
  const std::lock_guard lock(mutex_);
  user->close();
  std::erase(users_, user);
  startOrStop();
}

bool HidSensor::setFeature(const std::shared_ptr<HidInbox>& user, std::uint8_t reportID,
                           std::span<const std::uint8_t> payload, DiagnosticErrorPtr* error) {
  const std::lock_guard lock(mutex_);
  if (gone_) return refuse(error, HidErrorCode::kGone, "%@ has been removed.", config_.name);
  if (!hasOpen(user)) return refuse(error, HidErrorCode::kNotOpen, "%@ is not open; open it first.", config_.name);
  if (!checkFeature(reportID, payload, error)) return false;
  values_[reportID] = payload[1];
  startOrStop();
  return true;
}

bool HidSensor::checkFeature(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                             DiagnosticErrorPtr* error) const {
  const auto report = std::ranges::find(config_.featureReports, reportID, &HidFeatureReport::id);
  const std::string_view name = hidReportName(reportID);
  if (report == config_.featureReports.end()) {
    return refuse(error, HidErrorCode::kUnknownReport, "%@ has no feature report %@.", config_.name, name);
  }
  if (payload.size() != 2 || payload[0] != reportID) {
    return refuse(error, HidErrorCode::kRefusedReport, "Feature report %@ of %@ is two bytes, its ID and a value.",
                  name, config_.name);
  }
  if (!report->accepts.empty() && !report->accepts.contains(payload[1])) {
    return refuse(error, HidErrorCode::kRefusedReport, "Feature report %@ of %@ does not take the value %@.", name,
                  config_.name, payload[1]);
  }
  return true;
}

bool HidSensor::isToStream() const {
  return !gone_ && !users_.empty() &&
         std::ranges::all_of(config_.featureReports, [this](const HidFeatureReport& report) {
           return !report.streamsAt || values_.at(report.id) == *report.streamsAt;
         });
}

void HidSensor::startOrStop() {
  const bool wanted = isToStream();
  if (wanted == streaming_) return;
  streaming_ = wanted;
  ++period_;
  if (!wanted) return;
  periodStart_ = clock_->now();
  sentInPeriod_ = 0;
  arm();
}

// Schedules the next report. The task does not own the device: the reports end with the last user's reference.
void HidSensor::arm() {
  if (config_.reportCount && nextReport_ >= *config_.reportCount) return;
  const std::chrono::nanoseconds due = periodStart_ + frameTime(microFrameRate(config_.rate), sentInPeriod_);
  queue_->asyncAfter(due - clock_->now(), [weak = weak_from_this(), period = period_] {
    if (const std::shared_ptr<HidSensor> self = weak.lock()) self->sendNext(period);
  });
}

void HidSensor::sendNext(std::uint64_t period) {
  std::shared_ptr<const HidInput> input;
  std::vector<std::shared_ptr<HidInbox>> users;
  {
    const std::lock_guard lock(mutex_);
    if (period != period_) return;
    users = users_;
    input = std::make_shared<const HidInput>(makeInput(nextReport_++));
    ++sentInPeriod_;
    startOrStop();
    if (streaming_) arm();
  }
  for (const std::shared_ptr<HidInbox>& user : users) user->take(input);
}

HidInput HidSensor::makeInput(std::uint64_t number) {
  if (number == config_.removedAfter) {
    gone_ = true;
    DiagnosticErrorPtr error;
    refuse(&error, HidErrorCode::kGone, "%@ has been removed.", config_.name);
    return {{}, std::move(error)};
  }
  HidReportShape shape = config_.every;
  if (const auto single = config_.single.find(number); single != config_.single.end()) {
    const HidReportShape& own = single->second;
    if (own.error) return {{}, errorWithMessage(own.error->domain, own.error->code, own.error->message, nullptr)};
    if (own.reportID) shape.reportID = own.reportID;
    if (own.length) shape.length = own.length;
  }
  return {hidInputReport(config_.images, shape, number, clock_->now()), nullptr};
}

}  // namespace quazor
