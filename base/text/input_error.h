// InputError: the reason why an input is invalid.
#pragma once

#include <stdexcept>

namespace quazor {

// A text, a file or an argument that cannot be used. what() is user-readable: one sentence, or the end of one if the
// reader's documentation says so.
//
// Thread: any
class InputError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace quazor
