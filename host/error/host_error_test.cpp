#include "host/error/host_error.h"

#include <gtest/gtest.h>

#include <cfenv>
#include <limits>
#include <stdexcept>

#ifdef __SSE2__
#include <xmmintrin.h>
#endif

namespace quazor {
namespace {

DiagnosticErrorPtr otherError() { return errorWithMessage("Other", 9, "other", nullptr); }

TEST(HostError, HasTheDomainAndItsCode) {
  const DiagnosticErrorPtr error = hostError(HostErrorCode::kInterrupted, "text");
  EXPECT_TRUE(isHostError(error));
  EXPECT_TRUE(isHostError(error, HostErrorCode::kInterrupted));
  EXPECT_FALSE(isHostError(error, HostErrorCode::kNotRecorded));
}

TEST(HostError, IsNoErrorOfAPluginWithTheSameCode) {
  const auto code = static_cast<std::int64_t>(HostErrorCode::kInterrupted);
  const DiagnosticErrorPtr error = errorWithMessage("Other", code, "text", nullptr);
  EXPECT_FALSE(isHostError(error));
  EXPECT_FALSE(isHostError(error, HostErrorCode::kInterrupted));
  EXPECT_FALSE(isHostError(nullptr, HostErrorCode::kInterrupted));
}

TEST(CallPlugin, LeavesTheFailureAloneOnSuccessEvenWithAnError) {
  DiagnosticErrorPtr failure;
  EXPECT_TRUE(callPlugin("run", &failure, [](DiagnosticErrorPtr* error) {
    *error = otherError();
    return true;
  }));
  EXPECT_EQ(failure, nullptr);
}

TEST(CallPlugin, GivesEachCallAFreshError) {
  DiagnosticErrorPtr failure = otherError();
  DiagnosticErrorPtr seen = otherError();
  callPlugin("run", &failure, [&seen](DiagnosticErrorPtr* error) {
    seen = *error;
    return false;
  });
  EXPECT_EQ(seen, nullptr);
}

TEST(CallPlugin, TakesTheErrorThatTheOperationGave) {
  const DiagnosticErrorPtr given = otherError();
  DiagnosticErrorPtr failure;
  EXPECT_FALSE(callPlugin("run", &failure, [&given](DiagnosticErrorPtr* error) {
    *error = given;
    return false;
  }));
  EXPECT_EQ(failure, given);
}

class Silent : public std::exception {
  const char* what() const noexcept override { return nullptr; }
};

TEST(CallPlugin, SurvivesAnExceptionWithoutAText) {
  DiagnosticErrorPtr failure;
  EXPECT_FALSE(callPlugin("run of X", &failure, [](DiagnosticErrorPtr*) -> bool { throw Silent(); }));
  ASSERT_NE(failure, nullptr);
  EXPECT_EQ(failure->localizedDescription(), "run of X threw an exception without a text");
}

TEST(CallPlugin, SaysSoWhenTheOperationGaveNone) {
  DiagnosticErrorPtr failure;
  EXPECT_FALSE(callPlugin("run of X", &failure, [](DiagnosticErrorPtr* /*error*/) { return false; }));
  ASSERT_NE(failure, nullptr);
  EXPECT_EQ(failure->domain(), QuazorHostErrorDomain);
  EXPECT_EQ(failure->code(), 1);
  EXPECT_EQ(failure->localizedDescription(), "run of X failed without giving an error");
}

TEST(CallPlugin, StopsWhateverIsThrown) {
  DiagnosticErrorPtr failure;
  EXPECT_FALSE(callPlugin("run of X", &failure,
                          [](DiagnosticErrorPtr* /*error*/) -> bool { throw std::runtime_error("no memory of it"); }));
  ASSERT_NE(failure, nullptr);
  EXPECT_EQ(failure->code(), 2);
  EXPECT_EQ(failure->localizedDescription(), "run of X threw an exception: no memory of it");
  EXPECT_FALSE(callPlugin("run of X", &failure, [](DiagnosticErrorPtr* /*error*/) -> bool { throw "text"; }));
  EXPECT_EQ(failure->localizedDescription(), "run of X threw something that is not a standard exception");
}

TEST(CallPlugin, RestoresTheFloatingPointEnvironment) {
  DiagnosticErrorPtr failure;
  callPlugin("run", &failure, [](DiagnosticErrorPtr* /*error*/) { return std::fesetround(FE_UPWARD) == 0; });
  EXPECT_EQ(std::fegetround(), FE_TONEAREST);
  callPlugin("run", &failure, [](DiagnosticErrorPtr* /*error*/) -> bool {
    std::fesetround(FE_DOWNWARD);
    throw std::runtime_error("the lamp is out");
  });
  EXPECT_EQ(std::fegetround(), FE_TONEAREST);
#ifdef __SSE2__
  constexpr unsigned kFlushToZero = 0x8040;  // the two bits of MXCSR, for results and operands
  callPlugin("run", &failure, [](DiagnosticErrorPtr* /*error*/) {
    _mm_setcsr(_mm_getcsr() | kFlushToZero);
    return true;
  });
  EXPECT_EQ(_mm_getcsr() & kFlushToZero, 0U);
  const volatile double small = std::numeric_limits<double>::min();
  EXPECT_GT(small / 2, 0.0);
#endif
}

}  // namespace
}  // namespace quazor
