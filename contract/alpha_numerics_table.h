// The table used by contract/alpha_numerics.h. Internal; not part of the contract.
#pragma once

#include <span>

namespace quazor {

// A closed range of code points.
struct CodePointRange {
  char32_t first;
  char32_t last;
};

// All letters, marks and numbers: sorted ranges, not overlapping and not adjacent.
std::span<const CodePointRange> alphaNumericRanges();

}  // namespace quazor
