// How much the repetitive tests do.
#pragma once

#include <cstdlib>

namespace quazor {

// True if QUAZOR_THOROUGH is in the environment: exhaustive tests omit nothing and random ones take many more rounds.
inline bool isThorough() { return std::getenv("QUAZOR_THOROUGH") != nullptr; }

#if defined(QUAZOR_ADDRESS_SANITIZER) || defined(QUAZOR_THREAD_SANITIZER)
constexpr bool kHasSanitizer = true;
#else
constexpr bool kHasSanitizer = false;
#endif

// Whether to try each of very many similar cases. A sanitizer multiplies their time; it sees what it can see in fewer,
// and the build without one tries them all.
inline bool triesAll() { return !kHasSanitizer || isThorough(); }

// Rounds of a random test: all `count`, or a quarter.
inline int roundsOf(int count) { return triesAll() ? count : count / 4; }

}  // namespace quazor
