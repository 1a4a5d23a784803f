#include "host/error/host_error.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace quazor {
namespace {

DiagnosticErrorPtr otherError() { return errorWithMessage("Other", 9, "other", nullptr); }

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

}  // namespace
}  // namespace quazor
