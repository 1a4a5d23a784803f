// The limits of all readers of JSON. A value beyond them is refused where it is made and where it is read.
#pragma once

#include <cstddef>

namespace quazor {

// Nested levels of a value from a diagnostic: more than any diagnostic needs, and few enough for the stack.
inline constexpr int kMaxValueLevels = 500;

// A line that a program wrote: an event in a record or on the connection to a plug-in's process. Each level of a value
// takes up to four levels of JSON, and the event around it a few more.
inline constexpr std::size_t kMaxLineLevels = std::size_t{4} * kMaxValueLevels + 16;
inline constexpr std::size_t kMaxLine = std::size_t{64} << 20U;  // bytes
// Keys of one object. The time to find a key is linear in their number.
inline constexpr std::size_t kMaxLineKeys = 256;

// A document that people write. No valid one is nested deeper.
inline constexpr std::size_t kMaxDocumentLevels = 32;
inline constexpr std::size_t kMaxDocument = std::size_t{16} << 20U;  // bytes; devices may be endless

}  // namespace quazor
