// SHA-256 (FIPS 180-4).
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// The 32 bytes of the digest.
std::string sha256(std::string_view bytes);

}  // namespace quazor
