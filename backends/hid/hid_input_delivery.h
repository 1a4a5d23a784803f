// HidInputDelivery: delivers the input reports of a device to one user's receiver on run loops.
#pragma once

#include "contract/value.h"
#include "platform/hid.h"
#include "platform/run_loop.h"

#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// An input from a device: a report that begins with its ID, or an error.
struct HidInput {
  Bytes report;
  DiagnosticErrorPtr error;
};

// Delivers inputs one after the other to the receiver while a loop that the device is scheduled on runs. The derived
// class supplies the inputs and signals the loops.
//
// Thread: one at a time, except retire(). The receiver is called without any lock and may call all of these functions.
class HidInputDelivery : public std::enable_shared_from_this<HidInputDelivery> {
 public:
  // The maximum number of inputs per round, after which other sources and the time limit of the loop have their turn.
  static constexpr std::size_t kMaxInARound = 64;

  HidInputDelivery(const HidInputDelivery&) = delete;
  HidInputDelivery& operator=(const HidInputDelivery&) = delete;
  virtual ~HidInputDelivery() = default;

  // Replaces the receiver. A receiver that is running is destroyed after it has returned.
  void setReceiver(HidDevice::InputReportCallback receiver);
  void schedule(RunLoop& loop, std::string_view mode);
  void unschedule(RunLoop& loop, std::string_view mode);
  // Ends the delivery, because the user is gone. Loops that the device is still scheduled on must be alive; each
  // releases its source in its next run. Thread: any, also while a loop calls the receiver.
  void retire();

 protected:
  // A loop and a mode that the device is scheduled on, owned by the handler of its source.
  struct Place {
    RunLoop* loop = nullptr;
    std::string mode;
    std::weak_ptr<RunLoopSource> source;
  };

  struct Scheduled {
    std::shared_ptr<const Place> place;
    std::shared_ptr<RunLoopSource> source;
  };

  HidInputDelivery() = default;

  // All of these are called with the mutex held.
  //
  // The next input; null if none is pending.
  virtual std::shared_ptr<const HidInput> next(const Place& place) = 0;
  // Called after the device was scheduled here, after it was unscheduled, and when its user goes while it is scheduled
  // at all of places().
  virtual void onScheduled(const Place& place) = 0;
  virtual void onUnscheduled(const Place& place) = 0;
  virtual void onRetired() = 0;
  // Called before the source of a place delivers inputs. The receiver may run the loop; it then gets the next input
  // there if the place is signalled again.
  virtual void onRoundBegan(const Place& place) = 0;

  // Makes the loop request the next inputs for that place. Call it with the mutex held, so that a place that has been
  // unscheduled is never signalled.
  static void signal(const Place& place);
  // The places that the device is scheduled at, in scheduling order. Call it with the mutex held.
  const std::vector<Scheduled>& places() const { return places_; }

  mutable std::mutex mutex_;  // guards the members below and those of derived classes

 private:
  using Receiver = std::shared_ptr<const HidDevice::InputReportCallback>;

  bool deliver(const Place& place);
  bool deliverNext(const Place& place);
  bool isScheduled(const Place& place) const;
  std::vector<Scheduled>::const_iterator find(const RunLoop& loop, std::string_view mode) const;

  Receiver receiver_;  // null if there is none
  std::vector<Scheduled> places_;
};

}  // namespace quazor
