#include "backends/faults/call_interceptor.h"

#include <chrono>
#include <optional>

namespace quazor {
namespace {

bool takes(const Fault& fault, const CallSite& site) {
  return (fault.operation == "*" || fault.operation == site.operation) &&
         (!fault.object || *fault.object == site.object) && (!fault.property || *fault.property == site.property);
}

// "CaptureStream.setValue of back-tele for FormatIndex"
std::string nameOf(const CallSite& site) {
  std::string name(site.operation);
  if (!site.object.empty()) name.append(" of ").append(site.object);
  if (!site.property.empty()) name.append(" for ").append(site.property);
  return name;
}

}  // namespace

CallInterceptor::CallInterceptor(std::vector<Fault> faults, std::shared_ptr<Clock> clock, Hang hang,
                                 InjectedError injectedError)
    : clock_(std::move(clock)), hang_(std::move(hang)), injectedError_(std::move(injectedError)) {
  for (Fault& fault : faults) addFault(std::move(fault));
}

void CallInterceptor::addFault(Fault fault) {
  const std::lock_guard lock(mutex_);
  faults_.push_back({{std::move(fault), 0}, 0});
}

std::vector<FaultStatus> CallInterceptor::faultStatus() const {
  const std::lock_guard lock(mutex_);
  std::vector<FaultStatus> statuses;
  for (const CountedFault& fault : faults_) statuses.push_back(fault.status);
  return statuses;
}

void CallInterceptor::observe(Observer observer) {
  auto replacement = observer ? std::make_shared<const Observer>(std::move(observer)) : nullptr;
  const std::lock_guard lock(mutex_);
  observer_.swap(replacement);
}

std::shared_ptr<const CallInterceptor::Observer> CallInterceptor::currentObserver() const {
  const std::lock_guard lock(mutex_);
  return observer_;
}

// The faults that apply to this call: delays, followed by at most one fault that ends it.
std::vector<Fault> CallInterceptor::faultsOn(const CallSite& site) {
  const std::lock_guard lock(mutex_);
  std::vector<Fault> acting;
  std::optional<Fault> ending;
  for (CountedFault& fault : faults_) {
    if (!takes(fault.status.fault, site)) continue;
    ++fault.taken;
    if (fault.status.fault.occurrence && *fault.status.fault.occurrence != fault.taken) continue;
    const bool delays = fault.status.fault.action == FaultAction::kDelay;
    if (!delays && ending) continue;
    ++fault.status.fired;
    if (delays) {
      acting.push_back(fault.status.fault);
    } else {
      ending = fault.status.fault;
    }
  }
  if (ending) acting.push_back(*std::move(ending));
  return acting;
}

DiagnosticErrorPtr CallInterceptor::errorOf(const Fault& fault, const CallSite& site) const {
  if (!fault.error) return injectedError_(site, nameOf(site) + " failed.");
  return errorWithMessage(fault.error->domain, fault.error->code, fault.error->message, nullptr);
}

bool CallInterceptor::faultsLetPass(const CallSite& site, DiagnosticErrorPtr* error) {
  for (const Fault& fault : faultsOn(site)) {
    switch (fault.action) {
      case FaultAction::kDelay: clock_->sleep(nanosecondsFromSeconds(fault.seconds)); break;
      case FaultAction::kHang: hang_(nameOf(site) + " hangs"); return false;
      case FaultAction::kNothing: return false;
      case FaultAction::kFail: storeError(error, errorOf(fault, site)); return false;
    }
  }
  return true;
}

CallInterceptor::Hang sleepForEver(std::shared_ptr<Clock> clock) {
  return [clock = std::move(clock)](std::string_view) {
    for (;;) clock->sleep(std::chrono::nanoseconds::max());
  };
}

}  // namespace quazor
