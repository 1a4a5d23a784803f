#include "contract/flat_destruction.h"

#include <algorithm>
#include <new>
#include <utility>
#include <variant>
#include <vector>

namespace QUAZOR_CONTRACT {

namespace {

using Waiting = std::vector<std::variant<Array, Dictionary>>;

// What waits for its destruction while another content is being destroyed on this thread; null if none is. A pointer
// has no destructor itself, so values can still be destroyed at the end of a thread.
thread_local Waiting* waiting = nullptr;

bool mayNest(const Value& value) {
  return value.kind() == Value::Kind::kArray || value.kind() == Value::Kind::kDictionary ||
         value.kind() == Value::Kind::kError || value.kind() == Value::Kind::kObject;
}

bool holdsNested(const Array& elements) { return std::any_of(elements.begin(), elements.end(), mayNest); }

bool holdsNested(const Dictionary& entries) {
  return std::any_of(entries.begin(), entries.end(), [](const auto& entry) { return mayNest(entry.second); });
}

template <class Content>
void destroy(Content& content) {
  if (!holdsNested(content)) return;  // the caller destroys it without much recursion
  Waiting own;
  Waiting& contents = waiting == nullptr ? own : *waiting;
  try {
    contents.emplace_back(std::move(content));
  } catch (const std::bad_alloc&) {  // GCOV_EXCL_LINE: only without memory
    return;                          // GCOV_EXCL_LINE: the caller destroys it, with recursion
  }
  if (waiting != nullptr) return;
  waiting = &contents;
  while (!contents.empty()) {
    const auto next = std::move(contents.back());
    contents.pop_back();
  }
  waiting = nullptr;
}

}  // namespace

void destroyFlat(Array&& elements) noexcept { destroy(elements); }
void destroyFlat(Dictionary&& entries) noexcept { destroy(entries); }

}  // namespace QUAZOR_CONTRACT
