#include "host/system/file_size_limit.h"

#include <signal.h>

namespace quazor {

namespace {

struct sigaction actionBefore {};
bool isChanged = false;

}  // namespace

void failWritesBeyondFileSizeLimit() {
  struct sigaction ignored {};
  ignored.sa_handler = SIG_IGN;
  if (!isChanged) isChanged = ::sigaction(SIGXFSZ, &ignored, &actionBefore) == 0;
}

void restoreFileSizeSignal() {
  if (isChanged) ::sigaction(SIGXFSZ, &actionBefore, nullptr);
  isChanged = false;
}

}  // namespace quazor
