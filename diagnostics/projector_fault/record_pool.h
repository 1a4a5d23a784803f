// RecordPool: memory for records of one size that one thread creates and another destroys.
#pragma once

#include <atomic>
#include <cstddef>
#include <new>
#include <utility>

namespace quazor {

// General allocators return a block to the heap of the thread that allocated it, so two threads that do this for every
// frame contend for it. Here a released block goes to a list, which the allocating thread takes over as a whole when
// its own list is empty.
//
// The pool keeps its blocks until it is destroyed; their number is the maximum in use at one time.
// Thread: one at a time for take(); any for give().
class RecordPool {
 public:
  RecordPool() = default;
  RecordPool(const RecordPool&) = delete;
  RecordPool& operator=(const RecordPool&) = delete;
  // REQUIRES: all blocks have been released.
  ~RecordPool();

  // A block of `size` bytes, aligned for any ordinary object. Thread: one at a time.
  void* take(std::size_t size);
  // Releases a block returned by take(). Thread: any.
  void give(void* block) noexcept;

 private:
  struct Free {
    Free* next;
  };

  static void destroy(Free* list);

  std::size_t size_ = 0;               // of every block; set by the first take
  Free* own_ = nullptr;                // free blocks of the allocating thread
  std::atomic<Free*> given_{nullptr};  // blocks released since `own_` was filled
};

// For std::allocate_shared; the pool, which serves one type, must outlive every object in it.
// Thread: as RecordPool.
template <class T>
class PoolAllocator {
 public:
  using value_type = T;

  explicit PoolAllocator(RecordPool& pool) : pool_(&pool) {}
  template <class Other>
  PoolAllocator(const PoolAllocator<Other>& other) : pool_(&other.pool()) {}

  // REQUIRES: `count` is 1.
  T* allocate(std::size_t count) { return static_cast<T*>(pool_->take(count * sizeof(T))); }
  void deallocate(T* object, std::size_t /*count*/) noexcept { pool_->give(object); }

  RecordPool& pool() const { return *pool_; }
  template <class Other>
  bool operator==(const PoolAllocator<Other>& other) const {
    return pool_ == &other.pool();
  }

 private:
  RecordPool* pool_;
};

}  // namespace quazor
