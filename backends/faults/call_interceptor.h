// CallInterceptor: the one place that every call on a platform with faults passes.
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

// A call as it has returned.
struct PlatformCall {
  std::string operation;  // "CaptureStream.start"
  std::string object;     // the name of the object, empty where a platform has only one
  std::string detail;     // the property's key; of setValue "KEY = value"; of control calls the streams "(a, b)"; of
                          // Clock.sleep the seconds
  bool succeeded = false;

  friend bool operator==(const PlatformCall&, const PlatformCall&) = default;
};

// What a fault can tell calls apart by. Borrows; lives for one call.
struct CallSite {
  std::string_view operation;
  std::string_view object;
  std::string_view property;
};

// Lets faults act on calls, counts what they did, and tells an observer of every call.
//
// Thread: any, also several at once. Calls are made, and the observer is told, outside the interceptor's lock.
class CallInterceptor final {
 public:
  using Observer = std::function<void(const PlatformCall&)>;
  // Waits for ever, or throws; `what` says what hangs.
  using Hang = std::function<void(std::string_view what)>;
  // The error of a call that a fault without an error of its own makes fail; `sentence` says which call failed.
  using InjectedError = std::function<DiagnosticErrorPtr(const CallSite& site, std::string sentence)>;

  // `clock` times the delays.
  CallInterceptor(std::vector<Fault> faults, std::shared_ptr<Clock> clock, Hang hang, InjectedError injectedError);
  CallInterceptor(const CallInterceptor&) = delete;
  CallInterceptor& operator=(const CallInterceptor&) = delete;

  void addFault(Fault fault);
  // In the order of their adding.
  std::vector<FaultStatus> faultStatus() const;
  // Replaces the observer; an empty one observes nothing.
  void observe(Observer observer);

  // Makes a call that can fail: `body` does it and says by its result, a boolean, an optional or a pointer, whether it
  // succeeded. Where a fault makes the call fail, the body does not run and the result is false or nothing.
  // `detail` makes the text for the observer and is asked only when there is one.
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

  // Tells the observer of a call that has returned.
  template <class Detail>
  void report(const CallSite& site, Detail&& detail, bool succeeded) {
    if (const std::shared_ptr<const Observer> observer = currentObserver()) {
      (*observer)({std::string(site.operation), std::string(site.object), detail(), succeeded});
    }
  }

 private:
  struct CountedFault {
    FaultStatus status;
    std::uint64_t taken = 0;  // calls that its selectors took
  };

  bool faultsLetPass(const CallSite& site, DiagnosticErrorPtr* error);
  std::vector<Fault> faultsOn(const CallSite& site);
  DiagnosticErrorPtr errorOf(const Fault& fault, const CallSite& site) const;
  std::shared_ptr<const Observer> currentObserver() const;

  const std::shared_ptr<Clock> clock_;
  const Hang hang_;
  const InjectedError injectedError_;
  mutable std::mutex mutex_;  // guards what follows
  std::vector<CountedFault> faults_;
  std::shared_ptr<const Observer> observer_;  // null when there is none
};

// A hang that sleeps by the clock, for ever.
CallInterceptor::Hang sleepForEver(std::shared_ptr<Clock> clock);

}  // namespace quazor
