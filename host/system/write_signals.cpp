#include "host/system/write_signals.h"

#include <signal.h>

namespace quazor {

namespace {

struct Ignored {
  int signal;
  struct sigaction before {};
  bool isChanged = false;
};

Ignored ignoredSignals[] = {{SIGXFSZ}, {SIGPIPE}};

}  // namespace

void failWritesWithoutSignals() {
  struct sigaction ignore {};
  ignore.sa_handler = SIG_IGN;
  for (Ignored& one : ignoredSignals) {
    if (!one.isChanged) one.isChanged = ::sigaction(one.signal, &ignore, &one.before) == 0;
  }
}

void restoreWriteSignals() {
  for (Ignored& one : ignoredSignals) {
    if (one.isChanged) ::sigaction(one.signal, &one.before, nullptr);
    one.isChanged = false;
  }
}

}  // namespace quazor
