#include "host/system/file_size_limit.h"

#include <signal.h>

namespace quazor {

namespace {

struct sigaction before {};
bool isChanged = false;

}  // namespace

void failWritesBeyondFileSizeLimit() {
  struct sigaction ignored {};
  ignored.sa_handler = SIG_IGN;
  if (!isChanged) isChanged = ::sigaction(SIGXFSZ, &ignored, &before) == 0;
}

void restoreFileSizeSignal() {
  if (isChanged) ::sigaction(SIGXFSZ, &before, nullptr);
  isChanged = false;
}

}  // namespace quazor
