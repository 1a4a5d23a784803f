// Signal actions in tests.
#pragma once

#include <signal.h>

namespace quazor {

// Sets the action of a signal during its lifetime.
class SignalAction {
 public:
  SignalAction(int signal, void (*handler)(int)) : signal_(signal) {
    struct sigaction action {};
    action.sa_handler = handler;
    sigaction(signal, &action, &before_);
  }
  SignalAction(const SignalAction&) = delete;
  SignalAction& operator=(const SignalAction&) = delete;
  ~SignalAction() { sigaction(signal_, &before_, nullptr); }

 private:
  const int signal_;
  struct sigaction before_ {};
};

// Restores the default action of the signals that request the end of a process; a shell ignores interrupts in
// background jobs.
class DefaultRequestsToEnd {
 public:
  DefaultRequestsToEnd() : interrupt_(SIGINT, SIG_DFL), termination_(SIGTERM, SIG_DFL), hangUp_(SIGHUP, SIG_DFL) {}

 private:
  SignalAction interrupt_;
  SignalAction termination_;
  SignalAction hangUp_;
};

}  // namespace quazor
