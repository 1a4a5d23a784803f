// Results and errors of plug-ins that are nested too deeply to be recorded.
#include "contract/message_format.h"
#include "host/model/record_builder.h"
#include "host/run/diagnostic_run.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <utility>

namespace quazor {
namespace {

DiagnosticRecord recordOfRun(const std::function<std::shared_ptr<QZExperiment>()>& makeExperiment) {
  const Diagnostic diagnostic = {"Fake",         "Summary.",     "FakeExperiment",
                                 "FakeAnalysis", makeExperiment, [] { return std::make_shared<fake::FakeAnalysis>(); }};
  RunOptions options;
  options.makePhone = [] { return std::make_unique<TestPhone>(); };
  EventList events;
  events.onEvent(beginningOf("Fake"));
  runDiagnostic(diagnostic, {}, options, events);
  RecordBuilder builder;
  for (const RunEvent& event : events.events) builder.onEvent(event);
  for (const RunEvent& event : builder.ending(momentAt(9))) builder.onEvent(event);
  return builder.takeRecord();
}

TEST(RunDiagnosticTest, RefusesAResultThatIsNestedTooDeeplyToBeRecorded) {
  class Deep final : public fake::FakeExperiment {
   public:
    std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
      Value value(1);
      for (int i = 0; i < 120'000; ++i) value = Value(Array{std::move(value)});
      std::unique_ptr<QZExperimentResult> result = fake::FakeExperiment::run(error);
      result->auxiliaryData().set("deep", std::move(value));
      return result;
    }
  };
  const DiagnosticRecord record = recordOfRun([] { return std::make_shared<Deep>(); });
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(record.errorStage, Stage::kRun);
  EXPECT_EQ(
      formatMessage("%@", record.error),
      "QuazorHostErrorDomain code 13: the entry 'deep' in the result of FakeExperiment is nested more than 500 levels "
      "deep");
  EXPECT_TRUE(record.auxiliaryData.empty());
}

TEST(RunDiagnosticTest, CutsAChainOfErrorsThatIsTooLongToBeRecorded) {
  class LongChain final : public fake::FakeExperiment {
   public:
    std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
      DiagnosticErrorPtr chain;
      for (int i = 0; i < 120'000; ++i) chain = errorWithMessage("Bus", i, "stalled", std::move(chain));
      *error = std::move(chain);
      return nullptr;
    }
  };
  const DiagnosticRecord record = recordOfRun([] { return std::make_shared<LongChain>(); });
  EXPECT_EQ(formatMessage("%@", record.error), "Bus code 119999: stalled");
  int length = 0;
  for (DiagnosticErrorPtr one = record.error; one != nullptr; one = one->underlyingError()) ++length;
  EXPECT_EQ(length, 102);
}

}  // namespace
}  // namespace quazor
