// Destruction of nested values without recursion. Not installed: only the sources of the contract use it.
#pragma once

#include "contract/value.h"

namespace QUAZOR_CONTRACT {

// Destroys the content of a value or an error. What it holds alone, at any depth, is destroyed one after the other, so
// that the depth does not matter to the stack.
// Thread: any.
void destroyFlat(Array&& elements) noexcept;
void destroyFlat(Dictionary&& entries) noexcept;

}  // namespace QUAZOR_CONTRACT
