// InputError: what is wrong with something that was given to be read.
#pragma once

#include <stdexcept>

namespace quazor {

// A text, a file or an argument that cannot be used. what() is a user-readable reason: one sentence, or the end of one
// where the reader says so.
//
// Thread: any
class InputError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace quazor
