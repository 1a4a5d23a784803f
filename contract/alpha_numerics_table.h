// The table used by contract/alpha_numerics.h. Internal; not part of the contract.
#pragma once

#include <span>

namespace quazor {

// A closed range of code points.
struct CodePointRange {
  char32_t first;
  char32_t last;
};

// Every letter, mark and number: sorted, without overlap, and with a gap between any two ranges.
std::span<const CodePointRange> alphaNumericRanges();

}  // namespace quazor
