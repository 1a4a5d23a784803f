// RecordPool: memory for records that one thread makes and another one drops, all of one size.
#pragma once

#include <atomic>
#include <cstddef>
#include <new>
#include <utility>

namespace quazor {

// General allocators hand a block back to the heap of the thread that asked for it, so two threads that do this for
// every frame wait for each other. Here a dropped block goes to a list that the maker takes over as a whole when its
// own is empty.
//
// Blocks are kept until the pool is destroyed: as many as were in use at one time.
// Thread: one at a time for take(); any for give().
class RecordPool {
 public:
  RecordPool() = default;
  RecordPool(const RecordPool&) = delete;
  RecordPool& operator=(const RecordPool&) = delete;
  // REQUIRES: all blocks have been given back.
  ~RecordPool();

  // A block of `size` bytes, aligned for any ordinary object. Thread: one at a time.
  void* take(std::size_t size);
  // Gives a block of take() back. Thread: any.
  void give(void* block) noexcept;

 private:
  struct Free {
    Free* next;
  };

  static void destroy(Free* list);

  std::size_t size_ = 0;               // of every block; set by the first take
  Free* own_ = nullptr;                // of the thread that takes
  std::atomic<Free*> given_{nullptr};  // given back since `own_` was filled
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

  // One object at a time.
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
