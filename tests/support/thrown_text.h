// What a call throws, as text, and rows of what is refused.
#pragma once

#include <string>

namespace quazor {

// The text of the exception of that type that the call throws; `otherwise` when it returns. Others go through.
template <class Exception, class Call>
std::string thrownText(const Call& call, const char* otherwise = "nothing") {
  try {
    static_cast<void>(call());
  } catch (const Exception& thrown) {
    return thrown.what();
  }
  return otherwise;
}

// Rows of tables: a text, what to call it where it does not speak for itself, and why it is refused.
struct RefusedText {
  const char* text;
  const char* problem;
};
struct NamedRefusal {
  const char* name;
  std::string text;
  const char* problem;
};

}  // namespace quazor
