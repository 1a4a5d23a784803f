#include "backends/faults/call_interceptor.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

void PrintTo(const PlatformCall& call, std::ostream* out) {
  *out << call.operation << " on '" << call.object << "' about '" << call.detail << "' "
       << (call.succeeded ? "succeeded" : "failed");
}

namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;

class SleepingClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return slept; }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds duration) override { slept += duration; }

  std::chrono::nanoseconds slept{0};
};

struct Hung {
  std::string what;
};

class CallInterceptorTest : public ::testing::Test {
 protected:
  // Makes a call; returns "done", "failed" or the error's text.
  std::string call(std::string_view operation, std::string_view object = {}, std::string_view property = {}) {
    DiagnosticErrorPtr error;
    const bool succeeded = calls_.perform(
        {operation, object, property}, &error, [] { return std::string("detail"); },
        [&] {
          ++bodies_;
          return bodySucceeds_;
        });
    if (succeeded) return error == nullptr ? "done" : "done, with an error";
    return error == nullptr ? "failed" : defaultText(error);
  }
  std::vector<std::uint64_t> fired() {
    std::vector<std::uint64_t> fired;
    for (const FaultStatus& status : calls_.faultStatus()) fired.push_back(status.fired);
    return fired;
  }
  static Fault fault(std::string operation, FaultAction action) {
    Fault fault;
    fault.operation = std::move(operation);
    fault.action = action;
    return fault;
  }

  std::shared_ptr<SleepingClock> clock_ = std::make_shared<SleepingClock>();
  CallInterceptor calls_{{},
                         clock_,
                         [](std::string_view what) { throw Hung{std::string(what)}; },
                         [](const CallSite& site, std::string sentence) {
                           return errorWithMessage("LampErrorDomain", site.object.empty() ? 1 : 2, std::move(sentence),
                                                   nullptr);
                         }};
  int bodies_ = 0;
  bool bodySucceeds_ = true;
};

constexpr const char* kStart = "CaptureStream.start";
constexpr const char* kSet = "CaptureStream.setValue";

TEST_F(CallInterceptorTest, WithoutFaultsTheCallIsMadeAndItsResultIsGiven) {
  EXPECT_EQ(call(kStart), "done");
  bodySucceeds_ = false;
  EXPECT_EQ(call(kStart), "failed");
  EXPECT_EQ(bodies_, 2);
}

TEST_F(CallInterceptorTest, AFailureWithoutAnErrorOfItsOwnGivesOneThatNamesTheCall) {
  calls_.addFault(fault("*", FaultAction::kFail));
  EXPECT_EQ(call("CapturePlugIn.device"), "LampErrorDomain code 1: CapturePlugIn.device failed.");
  EXPECT_EQ(call(kStart, "wide"), "LampErrorDomain code 2: CaptureStream.start of wide failed.");
  EXPECT_EQ(call(kSet, "wide", "FormatIndex"),
            "LampErrorDomain code 2: CaptureStream.setValue of wide for FormatIndex failed.");
  EXPECT_EQ(bodies_, 0);
}

TEST_F(CallInterceptorTest, AFailureGivesTheErrorOfTheFault) {
  Fault own = fault(kStart, FaultAction::kFail);
  own.error = FaultError{"LensErrorDomain", -3, "The lens is stuck."};
  calls_.addFault(own);
  EXPECT_EQ(call(kStart), "LensErrorDomain code -3: The lens is stuck.");
}

TEST_F(CallInterceptorTest, AFailureNeedsNoPlaceForItsError) {
  calls_.addFault(fault("*", FaultAction::kFail));
  const auto result = calls_.perform(
      {kStart, {}, {}}, nullptr, [] { return std::string(); }, [] { return std::optional<int>(1); });
  EXPECT_EQ(result, std::nullopt);
}

TEST_F(CallInterceptorTest, NothingFailsWithoutAnError) {
  calls_.addFault(fault(kStart, FaultAction::kNothing));
  EXPECT_EQ(call(kStart), "failed");
  EXPECT_EQ(bodies_, 0);
}

TEST_F(CallInterceptorTest, ADelaySleepsByTheClockAndThenMakesTheCall) {
  Fault delay = fault(kStart, FaultAction::kDelay);
  delay.seconds = 0.25;
  calls_.addFault(delay);
  EXPECT_EQ(call(kStart), "done");
  EXPECT_EQ(clock_->slept, 250ms);
}

TEST_F(CallInterceptorTest, AHangSaysWhatHangs) {
  calls_.addFault(fault(kStart, FaultAction::kHang));
  try {
    call(kStart, "wide");
    FAIL() << "the call returned";
  } catch (const Hung& hung) {
    EXPECT_EQ(hung.what, "CaptureStream.start of wide hangs");
  }
  EXPECT_EQ(bodies_, 0);
}

TEST_F(CallInterceptorTest, SelectorsTakeOnlyTheCallsTheyName) {
  Fault selective = fault(kSet, FaultAction::kNothing);
  selective.object = "wide";
  selective.property = "FormatIndex";
  calls_.addFault(selective);
  EXPECT_EQ(call(kStart, "wide"), "done");
  EXPECT_EQ(call(kSet, "tele", "FormatIndex"), "done");
  EXPECT_EQ(call(kSet, "wide", "MaximumFrameRate"), "done");
  EXPECT_EQ(call(kSet, "wide", "FormatIndex"), "failed");
  EXPECT_THAT(fired(), ElementsAre(1U));
}

TEST_F(CallInterceptorTest, AnOccurrenceCountsTheCallsThatTheOtherSelectorsTake) {
  Fault second = fault("*", FaultAction::kNothing);
  second.object = "wide";
  second.occurrence = 2;
  calls_.addFault(second);
  EXPECT_EQ(call(kStart, "wide"), "done");
  EXPECT_EQ(call(kStart, "tele"), "done");
  EXPECT_EQ(call(kSet, "wide", "FormatIndex"), "failed");
  EXPECT_EQ(call(kStart, "wide"), "done");
  EXPECT_THAT(fired(), ElementsAre(1U));
}

TEST_F(CallInterceptorTest, DelaysAddUpAndTheFirstOfTheOthersDecides) {
  Fault delay = fault(kStart, FaultAction::kDelay);
  delay.seconds = 1;
  calls_.addFault(fault(kStart, FaultAction::kNothing));
  calls_.addFault(delay);
  calls_.addFault(fault(kStart, FaultAction::kFail));
  calls_.addFault(delay);
  EXPECT_EQ(call(kStart), "failed");
  EXPECT_EQ(clock_->slept, 2s);
  EXPECT_THAT(fired(), ElementsAre(1U, 1U, 0U, 1U));
}

TEST_F(CallInterceptorTest, ACallThatAnEarlierFaultEndsStillCountsAsAnOccurrence) {
  Fault first = fault(kStart, FaultAction::kNothing);
  first.occurrence = 1;
  Fault second = fault(kStart, FaultAction::kFail);
  second.occurrence = 2;
  calls_.addFault(first);
  calls_.addFault(second);
  EXPECT_EQ(call(kStart), "failed");
  EXPECT_EQ(call(kStart), "LampErrorDomain code 1: CaptureStream.start failed.");
  EXPECT_EQ(call(kStart), "done");
}

TEST_F(CallInterceptorTest, FaultsThatNeverFiredSayZero) {
  calls_.addFault(fault(kStart, FaultAction::kFail));
  calls_.addFault(fault(kSet, FaultAction::kHang));
  call("CapturePlugIn.device");
  EXPECT_THAT(fired(), ElementsAre(0U, 0U));
  EXPECT_EQ(calls_.faultStatus()[1].fault, fault(kSet, FaultAction::kHang));
}

TEST_F(CallInterceptorTest, TheObserverIsToldOfEveryCallAsItReturns) {
  std::vector<PlatformCall> seen;
  calls_.observe([&](const PlatformCall& made) { seen.push_back(made); });
  Fault nothing = fault(kSet, FaultAction::kNothing);
  calls_.addFault(nothing);
  call(kStart, "wide");
  call(kSet, "tele", "FormatIndex");
  EXPECT_THAT(seen,
              ElementsAre(PlatformCall{kStart, "wide", "detail", true}, PlatformCall{kSet, "tele", "detail", false}));
  calls_.observe(nullptr);
  call(kStart);
  EXPECT_EQ(seen.size(), 2U);
}

TEST_F(CallInterceptorTest, TheDetailIsMadeOnlyForAnObserver) {
  int made = 0;
  const auto detail = [&] {
    ++made;
    return std::string();
  };
  const auto body = [] { return true; };
  calls_.perform({kStart, {}, {}}, nullptr, detail, body);
  EXPECT_EQ(made, 0);
  calls_.observe([](const PlatformCall&) {});
  calls_.perform({kStart, {}, {}}, nullptr, detail, body);
  EXPECT_EQ(made, 1);
}

TEST_F(CallInterceptorTest, AnObserverMayMakeCallsAndReplaceItself) {
  std::vector<std::string> seen;
  calls_.observe([&](const PlatformCall& made) {
    seen.push_back(made.operation);
    calls_.observe(nullptr);
    call("CapturePlugIn.device");
  });
  call(kStart);
  EXPECT_THAT(seen, ElementsAre(kStart));
}

}  // namespace
}  // namespace quazor
