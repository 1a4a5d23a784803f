#include "host/model/incomplete_run.h"

#include "host/error/host_error.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::ElementsAre;

RunStarted runOf(std::vector<std::string> names) {
  RunStarted run;
  run.names = std::move(names);
  return run;
}

std::vector<std::string> namesOf(const std::vector<PlannedDiagnostic>& planned) {
  std::vector<std::string> names;
  for (const auto& [name, repetition] : planned) {
    names.push_back(repetition == 0 ? name : name + " " + std::to_string(repetition));
  }
  return names;
}

TEST(NeverBegun, HasThePlannedParametersAndTheSeedOfTheRun) {
  RunStarted run = runOf({"A", "B", "C"});
  run.seed = 9;
  const DiagnosticRecord begun = recordOf("B", Verdict::kPass);
  EXPECT_THAT(neverBegun(run, {begun}), testing::IsEmpty()) << "an earlier record has no parameters";
  run.planned = {{"A", begun.parameters}, {"B", begun.parameters}, {"C", {}}};
  const std::vector<DiagnosticRecord> never = neverBegun(run, {begun});
  ASSERT_EQ(never.size(), 2U);
  EXPECT_EQ(never[0].name, "A");
  EXPECT_EQ(never[0].seed, 9U);
  ASSERT_EQ(never[0].parameters.experiment.size(), begun.parameters.experiment.size());
  EXPECT_EQ(never[0].parameters.experiment[0].value, begun.parameters.experiment[0].value);
  EXPECT_EQ(never[1].name, "C");
}

TEST(UnrecordedDiagnostics, AreNoneWhenAllHaveRecords) {
  const UnrecordedDiagnostics unrecorded =
      unrecordedDiagnosticsOf(runOf({"A", "B"}), {recordOf("A", Verdict::kPass), recordOf("B", Verdict::kError)}, {});
  EXPECT_EQ(unrecorded.interrupted, std::nullopt);
  EXPECT_THAT(namesOf(unrecorded.neverRun), testing::IsEmpty());
}

TEST(UnrecordedDiagnostics, AreTheInterruptedOneAndThoseAfterIt) {
  const UnrecordedDiagnostics unrecorded =
      unrecordedDiagnosticsOf(runOf({"A", "B", "C", "D"}), {recordOf("A", Verdict::kPass)}, "B");
  EXPECT_EQ(unrecorded.interrupted, "B");
  EXPECT_THAT(namesOf(unrecorded.neverRun), ElementsAre("C", "D"));
}

TEST(UnrecordedDiagnostics, HaveAnEmptyNameForAnInterruptBetweenTwo) {
  const UnrecordedDiagnostics unrecorded =
      unrecordedDiagnosticsOf(runOf({"A", "B"}), {recordOf("A", Verdict::kPass)}, "");
  EXPECT_EQ(unrecorded.interrupted, "");
  EXPECT_THAT(namesOf(unrecorded.neverRun), ElementsAre("B"));
  EXPECT_EQ(unrecordedDiagnosticsOf(runOf({"A"}), {}, "").interrupted, "");
}

TEST(UnrecordedDiagnostics, LeaveOutAnInterruptedOneWhoseRecordSaysSo) {
  DiagnosticRecord record = recordOf("B", Verdict::kError);
  record.error = hostError(HostErrorCode::kInterrupted, "it was interrupted");
  const UnrecordedDiagnostics unrecorded =
      unrecordedDiagnosticsOf(runOf({"A", "B", "C"}), {recordOf("A", Verdict::kPass), record}, "B");
  EXPECT_EQ(unrecorded.interrupted, std::nullopt);
  EXPECT_THAT(namesOf(unrecorded.neverRun), ElementsAre("C"));
}

TEST(UnrecordedDiagnostics, HaveAnInterruptedOneWhoseRecordTellsOfAnotherError) {
  DiagnosticRecord record = recordOf("A", Verdict::kError);
  const auto code = static_cast<std::int64_t>(HostErrorCode::kInterrupted);
  record.error = errorWithMessage("Domain", code, "another's", nullptr);
  EXPECT_EQ(unrecordedDiagnosticsOf(runOf({"A", "B"}), {record}, "B").interrupted, "B");
  record.error = hostError(HostErrorCode::kCrashed, "it crashed");
  EXPECT_EQ(unrecordedDiagnosticsOf(runOf({"A", "B"}), {record}, "B").interrupted, "B");
}

TEST(UnrecordedDiagnostics, CountEveryRunOfADiagnostic) {
  const UnrecordedDiagnostics unrecorded =
      unrecordedDiagnosticsOf(runOf({"A", "A", "A", "A"}), {recordOf("A", Verdict::kPass)}, "A");
  EXPECT_THAT(namesOf(unrecorded.neverRun), ElementsAre("A", "A"));
}

TEST(UnrecordedDiagnostics, HaveARepetitionEach) {
  RunStarted run = runOf({"broken.so", "A", "B"});
  run.repetitions = 2;
  run.attempts = 2;
  std::vector<DiagnosticRecord> records = {recordOf("broken.so", Verdict::kError)};  // what is no diagnostic runs once
  const auto add = [&records](const std::string& name, Verdict verdict, std::uint64_t repetition,
                              std::uint64_t attempt) {
    records.push_back(recordOf(name, verdict));
    records.back().trial = {attempt, 2, repetition, 2};
  };
  add("A", Verdict::kError, 1, 1);
  add("A", Verdict::kPass, 1, 2);
  EXPECT_THAT(namesOf(missingOf(run, records)), ElementsAre("B 1", "A 2", "B 2"));
  const UnrecordedDiagnostics unrecorded = unrecordedDiagnosticsOf(run, records, "B");
  EXPECT_EQ(unrecorded.interrupted, "B");
  EXPECT_THAT(namesOf(unrecorded.neverRun), ElementsAre("A 2", "B 2"));
  add("B", Verdict::kPass, 1, 1);
  add("A", Verdict::kPass, 2, 1);
  add("B", Verdict::kPass, 2, 1);
  EXPECT_THAT(namesOf(missingOf(run, records)), testing::IsEmpty());
}

TEST(Interruption, IsTheHostsError) {
  const DiagnosticErrorPtr error = interruptionOf(runOf({"A"}), "A");
  EXPECT_EQ(error->domain(), QuazorHostErrorDomain);
  EXPECT_EQ(error->code(), static_cast<std::int64_t>(HostErrorCode::kInterrupted));
  EXPECT_EQ(error->localizedDescription(), "A was interrupted");
  EXPECT_EQ(interruptionOf(runOf({"A"}), "")->localizedDescription(), "interrupted while no diagnostic was running");
}

}  // namespace
}  // namespace quazor
