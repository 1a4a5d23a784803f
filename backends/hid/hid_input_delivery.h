// HidInputDelivery: how the input reports of a device reach the receiver of one of its users on run loops.
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

// What comes from a device: a report with its ID first, or else an error.
struct HidInput {
  Bytes report;
  DiagnosticErrorPtr error;
};

// Hands inputs to the receiver, one after the other, while a loop that the device is scheduled on runs. Where they come
// from, and how a loop hears of them, is the derived class's.
//
// Thread: one at a time, but for retire(). The receiver is called without any lock, and may call everything here.
class HidInputDelivery : public std::enable_shared_from_this<HidInputDelivery> {
 public:
  // How many inputs a source hands on before other sources of the loop, and its time limit, have their turn.
  static constexpr std::size_t kMaxInARound = 64;

  HidInputDelivery(const HidInputDelivery&) = delete;
  HidInputDelivery& operator=(const HidInputDelivery&) = delete;
  virtual ~HidInputDelivery() = default;

  // Replaces the receiver. One that is running is destroyed when it has returned.
  void setReceiver(HidDevice::InputReportCallback receiver);
  void schedule(RunLoop& loop, std::string_view mode);
  void unschedule(RunLoop& loop, std::string_view mode);
  // The user is gone: nothing is received any more. Loops that the device is still scheduled on must be alive; each
  // lets go of its source the next time it runs. Thread: any, also while a loop calls the receiver.
  void retire();

 protected:
  // A loop and a mode that the device is scheduled on. The handler of its source holds it.
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
  // The next input, or null when none waits.
  virtual std::shared_ptr<const HidInput> next(const Place& place) = 0;
  // The device was scheduled here, was unscheduled, or had its user go while it was scheduled on all of places().
  virtual void onScheduled(const Place& place) = 0;
  virtual void onUnscheduled(const Place& place) = 0;
  virtual void onRetired() = 0;
  // The place's source is about to hand inputs on. The receiver may run the loop meanwhile, and gets the next input
  // there if the place is signalled again.
  virtual void onRoundBegan(const Place& place) = 0;

  // Has the loop call for the next inputs of that place. With the mutex held, so that nobody is called for a place that
  // the device is not scheduled on any more.
  static void signal(const Place& place);
  // Where the device is scheduled, in the order in which it was. With the mutex held.
  const std::vector<Scheduled>& places() const { return places_; }

  mutable std::mutex mutex_;  // guards what follows, and what derived classes have

 private:
  using Receiver = std::shared_ptr<const HidDevice::InputReportCallback>;

  bool deliver(const Place& place);
  bool deliverNext(const Place& place);
  bool isScheduled(const Place& place) const;
  std::vector<Scheduled>::const_iterator find(const RunLoop& loop, std::string_view mode) const;

  Receiver receiver_;  // null when there is none
  std::vector<Scheduled> places_;
};

}  // namespace quazor
