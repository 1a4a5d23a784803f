// WrapperCache: one wrapper per wrapped object, during the lifetime of the wrapper.
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <utility>

namespace quazor {

// A wrapper must keep its object alive, so that no other object has the same address while the wrapper exists.
//
// Thread: any.
template <class Wrapped, class Wrapper>
class WrapperCache final {
 public:
  WrapperCache() = default;
  WrapperCache(const WrapperCache&) = delete;
  WrapperCache& operator=(const WrapperCache&) = delete;

  // Returns the wrapper of `wrapped`; calls `make`, under the cache's lock, if none exists. Returns null for null.
  template <class Make>
  std::shared_ptr<Wrapper> wrapperOf(const std::shared_ptr<Wrapped>& wrapped, Make&& make) {
    if (wrapped == nullptr) return nullptr;
    const std::lock_guard lock(mutex_);
    if (const auto found = wrappers_.find(wrapped.get()); found != wrappers_.end()) {
      if (std::shared_ptr<Wrapper> wrapper = found->second.lock()) return wrapper;
    }
    std::erase_if(wrappers_, [](const auto& entry) { return entry.second.expired(); });
    std::shared_ptr<Wrapper> wrapper = make();
    wrappers_[wrapped.get()] = wrapper;
    return wrapper;
  }

 private:
  std::mutex mutex_;
  std::map<const Wrapped*, std::weak_ptr<Wrapper>> wrappers_;
};

}  // namespace quazor
