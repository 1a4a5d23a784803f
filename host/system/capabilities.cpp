#include "host/system/capabilities.h"

#include <linux/capability.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace quazor {

void dropCapabilities() {
  if (::getuid() == 0) return;
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  const __user_cap_data_struct none[_LINUX_CAPABILITY_U32S_3] = {};
  // An empty inheritable set empties the ambient one; an old kernel has none.
  if (::syscall(SYS_capset, &header, none) != 0) {
    throw std::system_error(errno, std::generic_category(), "dropping capabilities");
  }
}

}  // namespace quazor
