// CallInterceptor: all calls on a platform with faults pass through it.
#pragma once

#include "backends/faults/fault.h"
#include "contract/diagnostic_error.h"
#include "platform/clock.h"

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

namespace quazor {

// A completed call.
struct PlatformCall {
  std::string operation;  // "CaptureStream.start"
  std::string object;     // the name of the object; empty if a platform has only one
  std::string detail;     // the property's key; "KEY = value" for setValue; the streams "(a, b)" for control calls;
                          // the seconds for Clock.sleep
  bool succeeded = false;

  friend bool operator==(const PlatformCall&, const PlatformCall&) = default;
};

// The features of a call that faults select by. Borrows its texts; valid for one call.
struct CallSite {
  std::string_view operation;
  std::string_view object;
  std::string_view property;
};

// Applies faults to calls, counts their effects, and notifies an observer of every call.
//
// Thread: any, several at once. Calls and notifications are made outside the interceptor's lock.
class CallInterceptor final {
 public:
  using Observer = std::function<void(const PlatformCall&)>;
  // Blocks forever or throws; `what` describes the call.
  using Hang = std::function<void(std::string_view what)>;
  // Creates the error for a fault that has none of its own; `sentence` names the failed call.
  using InjectedError = std::function<DiagnosticErrorPtr(const CallSite& site, std::string sentence)>;

  // `clock` is used for delays.
  CallInterceptor(std::vector<Fault> faults, std::shared_ptr<Clock> clock, Hang hang, InjectedError injectedError);
  CallInterceptor(const CallInterceptor&) = delete;
  CallInterceptor& operator=(const CallInterceptor&) = delete;

  void addFault(Fault fault);
  // In the order of addition.
  std::vector<FaultStatus> faultStatus() const;
  // Replaces the observer; an empty one disables notifications.
  void observe(Observer observer);

  // Makes a call that can fail: `body` performs it and returns a boolean, an optional or a pointer that tells whether
  // it succeeded. If a fault makes the call fail, the body does not run and the result is false or nothing. `detail`
  // creates the text for the observer and is called only if there is one.
  template <class Detail, class Body>
  std::invoke_result_t<Body&> perform(const CallSite& site, DiagnosticErrorPtr* error, Detail&& detail, Body&& body) {
    std::invoke_result_t<Body&> result{};
    if (faultsLetPass(site, error)) result = body();
    report(site, detail, static_cast<bool>(result));
    return result;
  }
  // The same for a call without a detail.
  template <class Body>
  std::invoke_result_t<Body&> perform(const CallSite& site, DiagnosticErrorPtr* error, Body&& body) {
    return perform(
        site, error, [] { return std::string(); }, body);
  }

  // Notifies the observer of a completed call.
  template <class Detail>
  void report(const CallSite& site, Detail&& detail, bool succeeded) {
    if (const std::shared_ptr<const Observer> observer = currentObserver()) {
      (*observer)({std::string(site.operation), std::string(site.object), detail(), succeeded});
    }
  }

 private:
  struct CountedFault {
    FaultStatus status;
    std::uint64_t taken = 0;  // the number of calls that its selectors matched
  };

  bool faultsLetPass(const CallSite& site, DiagnosticErrorPtr* error);
  std::vector<Fault> faultsOn(const CallSite& site);
  DiagnosticErrorPtr errorOf(const Fault& fault, const CallSite& site) const;
  std::shared_ptr<const Observer> currentObserver() const;

  const std::shared_ptr<Clock> clock_;
  const Hang hang_;
  const InjectedError injectedError_;
  mutable std::mutex mutex_;  // guards the members below
  std::vector<CountedFault> faults_;
  std::shared_ptr<const Observer> observer_;  // null if there is none
};

// A hang that sleeps forever on that clock.
CallInterceptor::Hang sleepForEver(std::shared_ptr<Clock> clock);

}  // namespace quazor
