// Refusals of commands for tests.
#pragma once

#include "host/error/exit_code.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {

// Why the call is refused, which must be for that exit code; "accepted" when it is not.
template <class Call>
std::string refusalOf(ExitCode code, const Call& call) {
  try {
    static_cast<void>(call());
  } catch (const CommandError& refusal) {
    EXPECT_EQ(refusal.code(), code) << refusal.what();
    return refusal.what();
  }
  return "accepted";
}

}  // namespace quazor
