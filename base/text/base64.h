// Base64 (RFC 4648).
#pragma once

#include <string>
#include <string_view>

namespace quazor {

// The bytes in Base64, with padding and without line ends.
std::string base64(std::string_view bytes);

}  // namespace quazor
