// Functions for child processes in the tests of this folder.
#pragma once

#include <cstddef>
#include <string_view>

#include <unistd.h>

namespace quazor {

// Writes all of the text, or exits with code 99.
inline void say(int descriptor, std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written <= 0) ::_exit(99);
    text.remove_prefix(static_cast<std::size_t>(written));
  }
}

[[noreturn]] inline void hang() {
  for (;;) ::pause();
}

}  // namespace quazor
