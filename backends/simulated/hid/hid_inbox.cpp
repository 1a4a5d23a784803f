#include "backends/simulated/hid/hid_inbox.h"

#include <utility>

namespace quazor {

void HidInbox::open() {
  const std::lock_guard lock(mutex_);
  open_ = true;
}

void HidInbox::close() {
  const std::lock_guard lock(mutex_);
  open_ = false;
  waiting_.clear();
}

void HidInbox::take(std::shared_ptr<const HidInput> input) {
  const std::lock_guard lock(mutex_);
  if (waiting_.size() >= kDepth && input->error == nullptr) return;
  waiting_.push_back(std::move(input));
  discardWhatIsLost();
  if (waiting_.empty()) return;
  for (const Scheduled& scheduled : places()) signal(*scheduled.place);
}

std::shared_ptr<const HidInput> HidInbox::next(const Place& /*place*/) {
  if (waiting_.empty()) return nullptr;
  std::shared_ptr<const HidInput> input = std::move(waiting_.front());
  waiting_.pop_front();
  return input;
}

void HidInbox::onScheduled(const Place& place) {
  if (!waiting_.empty()) signal(place);
}

void HidInbox::onUnscheduled(const Place& /*place*/) { discardWhatIsLost(); }

void HidInbox::onRetired() {
  open_ = false;
  waiting_.clear();
}

void HidInbox::onRoundBegan(const Place& place) {
  if (waiting_.size() > 1) signal(place);
}

void HidInbox::discardWhatIsLost() {
  if (!open_) waiting_.clear();
  if (places().empty()) std::erase_if(waiting_, [](const auto& input) { return input->error == nullptr; });
}

}  // namespace quazor
