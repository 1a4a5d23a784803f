// What is known of an error, a diagnostic or a result, and what to do about it.
#pragma once

#include <string>
#include <vector>

namespace quazor {

struct Advice {
  std::string title;  // one line
  std::string meaning;
  std::string failing;              // what a failing result means; empty for an error
  std::vector<std::string> causes;  // the most likely first
  std::vector<std::string> next;    // steps, in order
};

}  // namespace quazor
