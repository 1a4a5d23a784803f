// SharedCounter: a number shared by a process and the children that it creates later.
#pragma once

#include <atomic>
#include <cstdint>

namespace quazor {

// Thread: any, of any of the processes.
class SharedCounter {
 public:
  // Throws std::system_error if the memory cannot be mapped.
  SharedCounter();
  SharedCounter(const SharedCounter&) = delete;
  SharedCounter& operator=(const SharedCounter&) = delete;
  ~SharedCounter();

  void set(std::uint64_t number) { number_->store(number, std::memory_order_relaxed); }
  std::uint64_t get() const { return number_->load(std::memory_order_relaxed); }

 private:
  std::atomic<std::uint64_t>* number_;
};

}  // namespace quazor
