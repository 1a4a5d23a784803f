// Signals in tests of what watches for them.
#pragma once

#include <signal.h>

namespace quazor {

// While it lives, a signal has that action.
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

// The requests to end a process have their default meaning in a test, however the tests were started: a shell's
// background jobs ignore interrupts.
class DefaultRequestsToEnd {
 public:
  DefaultRequestsToEnd() : interrupt_(SIGINT, SIG_DFL), termination_(SIGTERM, SIG_DFL), hangUp_(SIGHUP, SIG_DFL) {}

 private:
  SignalAction interrupt_;
  SignalAction termination_;
  SignalAction hangUp_;
};

}  // namespace quazor
