#include "backends/faults/operations.h"

#include <algorithm>

namespace quazor {

const Operation* findOperation(std::string_view name) {
  const auto found = std::ranges::find(kOperations, name, &Operation::name);
  return found == kOperations.end() ? nullptr : &*found;
}

}  // namespace quazor
