#include "host/system/identity.h"

#include "base/text/hexadecimal.h"

#include <sys/random.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <system_error>

namespace quazor {

std::string randomIdentifier() {
  std::array<std::uint8_t, 16> bytes{};
  // Up to 256 bytes come at once (getrandom(2)).
  if (::getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
    throw std::system_error(errno, std::generic_category(), "drawing random numbers");
  }
  return hexadecimal(bytes);
}

std::string nameOfThisMachine() {
  std::array<char, HOST_NAME_MAX + 1> name{};
  return ::gethostname(name.data(), name.size() - 1) == 0 ? std::string(name.data()) : std::string();
}

}  // namespace quazor
