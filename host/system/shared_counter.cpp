#include "host/system/shared_counter.h"

#include <sys/mman.h>

#include <cerrno>
#include <new>
#include <system_error>

namespace quazor {

static_assert(std::atomic<std::uint64_t>::is_always_lock_free, "a lock would be each process' own");

SharedCounter::SharedCounter() {
  void* const memory = ::mmap(nullptr, sizeof *number_, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::system_error(errno, std::generic_category(), "sharing memory");
  number_ = new (memory) std::atomic<std::uint64_t>(0);
}

SharedCounter::~SharedCounter() { ::munmap(number_, sizeof *number_); }

}  // namespace quazor
