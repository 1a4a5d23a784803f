#include "backends/simulated/hid/hid_sensor.h"

#include "backends/faults/hid_report_name.h"
#include "backends/hid/hid_matching.h"
#include "backends/simulated/calls/hid_error.h"
#include "backends/simulated/capture/frame_delivery.h"
#include "backends/simulated/hid/hid_image_report.h"

#include <algorithm>
#include <utility>

namespace quazor {

HidSensor::HidSensor(HidDeviceConfig traits, std::shared_ptr<Clock> clock, Concurrency& concurrency)
    : traits_(std::move(traits)),
      clock_(std::move(clock)),
      queue_(concurrency.makeSerialQueue("SimulatedHid." + traits_.name, QualityOfService::kUserInteractive)) {
  for (const HidFeatureReport& report : traits_.featureReports) values_[report.id] = 0;
}

bool HidSensor::matches(const std::vector<Dictionary>& matching) const {
  const std::lock_guard lock(mutex_);
  return !gone_ && matchesHidDevice(matching, HidUsage{traits_.usagePage, traits_.usage});
}

bool HidSensor::hasOpen(const std::shared_ptr<HidInbox>& user) const {
  return std::ranges::find(users_, user) != users_.end();
}

bool HidSensor::open(const std::shared_ptr<HidInbox>& user, DiagnosticErrorPtr* error) {
  const std::lock_guard lock(mutex_);
  if (gone_) return refuse(error, HidErrorCode::kGone, "%@ has been removed.", traits_.name);
  if (hasOpen(user)) return refuse(error, HidErrorCode::kAlreadyOpen, "%@ is open already.", traits_.name);
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
  if (gone_) return refuse(error, HidErrorCode::kGone, "%@ has been removed.", traits_.name);
  if (!hasOpen(user)) return refuse(error, HidErrorCode::kNotOpen, "%@ is not open; open it first.", traits_.name);
  if (!checkFeature(reportID, payload, error)) return false;
  values_[reportID] = payload[1];
  startOrStop();
  return true;
}

bool HidSensor::checkFeature(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                             DiagnosticErrorPtr* error) const {
  const auto report = std::ranges::find(traits_.featureReports, reportID, &HidFeatureReport::id);
  const std::string_view name = hidReportName(reportID);
  if (report == traits_.featureReports.end()) {
    return refuse(error, HidErrorCode::kUnknownReport, "%@ has no feature report %@.", traits_.name, name);
  }
  if (payload.size() != 2 || payload[0] != reportID) {
    return refuse(error, HidErrorCode::kRefusedReport, "Feature report %@ of %@ is two bytes, its ID and a value.",
                  name, traits_.name);
  }
  if (!report->accepts.empty() && !report->accepts.contains(payload[1])) {
    return refuse(error, HidErrorCode::kRefusedReport, "Feature report %@ of %@ does not take the value %@.", name,
                  traits_.name, payload[1]);
  }
  return true;
}

bool HidSensor::isToStream() const {
  return !gone_ && !users_.empty() &&
         std::ranges::all_of(traits_.featureReports, [this](const HidFeatureReport& report) {
           return !report.streamsAt || values_.at(report.id) == *report.streamsAt;
         });
}

void HidSensor::startOrStop() {
  const bool wanted = isToStream();
  if (wanted == streaming_) return;
  streaming_ = wanted;
  ++stretch_;
  if (!wanted) return;
  stretchStart_ = clock_->now();
  sentInStretch_ = 0;
  arm();
}

// The next report. The task does not keep the device: with its last user's reference the reports end.
void HidSensor::arm() {
  if (traits_.reportCount && nextReport_ >= *traits_.reportCount) return;
  const std::chrono::nanoseconds due = stretchStart_ + frameTime(microFrameRate(traits_.rate), sentInStretch_);
  queue_->asyncAfter(due - clock_->now(), [weak = weak_from_this(), stretch = stretch_] {
    if (const std::shared_ptr<HidSensor> self = weak.lock()) self->sendNext(stretch);
  });
}

void HidSensor::sendNext(std::uint64_t stretch) {
  std::shared_ptr<const HidInput> input;
  std::vector<std::shared_ptr<HidInbox>> users;
  {
    const std::lock_guard lock(mutex_);
    if (stretch != stretch_) return;
    users = users_;
    input = std::make_shared<const HidInput>(makeInput(nextReport_++));
    ++sentInStretch_;
    startOrStop();
    if (streaming_) arm();
  }
  for (const std::shared_ptr<HidInbox>& user : users) user->take(input);
}

HidInput HidSensor::makeInput(std::uint64_t number) {
  if (number == traits_.removedAfter) {
    gone_ = true;
    DiagnosticErrorPtr error;
    refuse(&error, HidErrorCode::kGone, "%@ has been removed.", traits_.name);
    return {{}, std::move(error)};
  }
  HidReportShape shape = traits_.every;
  if (const auto single = traits_.single.find(number); single != traits_.single.end()) {
    const HidReportShape& own = single->second;
    if (own.error) return {{}, errorWithMessage(own.error->domain, own.error->code, own.error->message, nullptr)};
    if (own.reportID) shape.reportID = own.reportID;
    if (own.length) shape.length = own.length;
  }
  return {hidInputReport(traits_.images, shape, number, clock_->now()), nullptr};
}

}  // namespace quazor
