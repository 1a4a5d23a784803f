// The table behind contract/alpha_numerics.h; no header of the contract.
#pragma once

#include <span>

namespace quazor {

// A range of code points; both ends belong to it.
struct CodePointRange {
  char32_t first;
  char32_t last;
};

// Every letter, mark and number: sorted, without overlap, and with a gap between any two ranges.
std::span<const CodePointRange> alphaNumericRanges();

}  // namespace quazor
