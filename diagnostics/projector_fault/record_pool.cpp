#include "diagnostics/projector_fault/record_pool.h"

#include <algorithm>

namespace quazor {

RecordPool::~RecordPool() {
  destroy(own_);
  destroy(given_.load(std::memory_order_acquire));
}

void* RecordPool::take(std::size_t size) {
  size_ = std::max({size_, size, sizeof(Free)});
  if (own_ == nullptr) own_ = given_.exchange(nullptr, std::memory_order_acquire);
  if (own_ == nullptr) return ::operator new(size_);
  return std::exchange(own_, own_->next);
}

void RecordPool::give(void* block) noexcept {
  // cppcheck-suppress legacyUninitvar  // does not recognise placement new
  Free* const head = ::new (block) Free{given_.load(std::memory_order_relaxed)};
  while (!given_.compare_exchange_weak(head->next, head, std::memory_order_release, std::memory_order_relaxed)) {
  }
}

void RecordPool::destroy(Free* list) {
  while (list != nullptr) ::operator delete(std::exchange(list, list->next));
}

}  // namespace quazor
