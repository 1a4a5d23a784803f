#include "backends/threads/parker.h"

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <climits>
#include <ctime>

namespace quazor {

// See futex(2). The kernel needs the address of the atomic's underlying word.
static_assert(sizeof(std::atomic<std::uint32_t>) == sizeof(std::uint32_t));

void Parker::park(std::chrono::nanoseconds deadline) {
  timespec absolute{};
  const timespec* timeout = nullptr;
  if (deadline != std::chrono::nanoseconds::max()) {
    const auto seconds = std::chrono::floor<std::chrono::seconds>(deadline);
    absolute.tv_sec = static_cast<std::time_t>(seconds.count());
    absolute.tv_nsec = static_cast<long>((deadline - seconds).count());
    timeout = &absolute;
  }
  if (woken_.load(std::memory_order_acquire) != 0) return;
  // The timeout of FUTEX_WAIT_BITSET is an absolute time of the steady clock. The call returns at once if the word is
  // not 0.
  syscall(SYS_futex, &woken_, FUTEX_WAIT_BITSET | FUTEX_PRIVATE_FLAG, 0, timeout, nullptr, FUTEX_BITSET_MATCH_ANY);
}

void Parker::unpark() {
  woken_.store(1, std::memory_order_release);
  syscall(SYS_futex, &woken_, FUTEX_WAKE | FUTEX_PRIVATE_FLAG, 1, nullptr, nullptr, 0);
}

}  // namespace quazor
