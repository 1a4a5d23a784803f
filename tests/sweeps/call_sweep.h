// Sweeps that make each call of a run fail, and every two calls.
#pragma once

#include "tests/support/call_failures.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A call that is made to fail: the nth of the run.
struct CallFailure {
  std::size_t call;
  bool hasError;
};

inline FaultError errorOf(const CallFailure& failure) {
  return {"SweepErrorDomain", -3, "Call " + std::to_string(failure.call) + " was made to fail."};
}

inline Fault faultOf(const CallFailure& failure) {
  Fault fault;
  fault.operation = "*";
  fault.occurrence = failure.call;
  return failing(fault, failure.hasError, errorOf(failure));
}

// The failures as the oracles take them.
inline std::map<std::size_t, std::optional<std::string>> failuresOf(const std::vector<CallFailure>& failures) {
  std::map<std::size_t, std::optional<std::string>> predicted;
  for (const CallFailure& failure : failures) {
    predicted[failure.call] =
        failure.hasError ? std::optional("SweepErrorDomain code -3: " + errorOf(failure).message) : std::nullopt;
  }
  return predicted;
}

// What a run under failures told, and how often each of them happened.
struct SweptRun {
  std::string told;
  std::size_t calls = 0;  // that can fail
  std::vector<std::uint64_t> fired;
};

inline constexpr std::array kPlaces{ErrorPlace::kGiven, ErrorPlace::kNone};
inline constexpr std::array kHasError{true, false};

// Thread: the test's.
class CallSweep : public testing::Test {
 protected:
  // Runs with the failures and compares with the oracle; returns what happened.
  virtual SweptRun check(const std::vector<CallFailure>& failures, ErrorPlace place) = 0;

  void checkEveryFailure() {
    const SweptRun healthy = check({}, ErrorPlace::kGiven);
    ASSERT_GT(healthy.calls, 20U);
    for (std::size_t call = 1; call <= healthy.calls; ++call) {
      for (const bool hasError : kHasError) {
        for (const ErrorPlace place : kPlaces) {
          const SweptRun run = check({{call, hasError}}, place);
          ASSERT_EQ(run.fired, std::vector<std::uint64_t>{1}) << "call " << call;
          ASSERT_FALSE(HasFailure()) << "call " << call << (hasError ? " with" : " without") << " an error";
        }
      }
    }
    // One more than there are does nothing.
    const SweptRun beyond = check({{healthy.calls + 1, true}}, ErrorPlace::kGiven);
    EXPECT_EQ(beyond.fired, std::vector<std::uint64_t>{0});
    EXPECT_EQ(beyond.told, healthy.told);
  }

  // Lets each call behind the first failure fail too, in the run that the first failure leads to, and one call more,
  // which is never reached.
  void checkWithEveryLaterFailure(const CallFailure& first, bool hasError, ErrorPlace place) {
    const SweptRun alone = check({first}, place);
    for (std::size_t second = first.call + 1; second <= alone.calls + 1; ++second) {
      const bool isReached = second <= alone.calls;
      const SweptRun run = check({first, {second, hasError}}, place);
      EXPECT_EQ(run.fired, (std::vector<std::uint64_t>{1, isReached ? 1U : 0U}));
      if (!isReached) {
        EXPECT_EQ(run.told, alone.told);
      }
      ASSERT_FALSE(HasFailure()) << "calls " << first.call << " and " << second;
    }
  }

  std::uint64_t cases_ = 0;
};

}  // namespace quazor
