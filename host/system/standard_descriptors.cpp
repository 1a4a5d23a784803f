#include "host/system/standard_descriptors.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace quazor {

void openStandardDescriptors() {
  for (const int one : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    if (::fcntl(one, F_GETFD) >= 0) continue;
    // The lowest free number is `one`, because those below are open. The mode is the opposite of how it is used.
    if (::open("/dev/null", one == STDIN_FILENO ? O_WRONLY : O_RDONLY) != one) {
      throw std::system_error(errno, std::generic_category(), "opening a missing standard descriptor");
    }
  }
}

}  // namespace quazor
