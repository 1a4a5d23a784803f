#include "host/record/verification.h"

#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/model/record_builder.h"
#include "host/model/trials.h"

#include <algorithm>
#include <cstdint>
#include <set>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

std::string textOf(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return "none";
  return formatMessage("%@ %@ '%@'", error->domain(), error->code(), error->localizedDescription());
}

// Checks that attempts and repetitions are in their order.
// Thread: one at a time.
class TrialOrder {
 public:
  // `problems` is borrowed.
  explicit TrialOrder(std::vector<std::string>& problems) : problems_(problems) {}

  void check(const RunStarted& run, const DiagnosticRecord& record) {
    const Trial& trial = record.trial;
    if (record.experimentName.empty()) {  // no diagnostic
      if (trial.attempt > 0 || trial.repetition > 0) add(record, "it is no diagnostic, but has attempts");
      return;
    }
    if (isAnalyzedAgain(record)) return;
    checkNumber(record, "attempt", trial.attempt, run.attempts);
    checkNumber(record, "repetition", trial.repetition, run.repetitions);
    checkStart(record);
    expected_ = trial.attempt < run.attempts && mayTryAgain(record) ? trial.attempt + 1 : 0;
    name_ = record.name;
    repetition_ = trial.repetition;
  }

  void checkEnd() { tellMissing(); }

 private:
  // The entries of an analysis keep the numbers of those that were analyzed.
  static bool isAnalyzedAgain(const DiagnosticRecord& record) {
    return record.trial.attempts == 0 && record.trial.repetitions == 0 &&
           std::all_of(record.stages.begin(), record.stages.end(), [](const StagePeriod& one) {
             return one.stage == Stage::kLoad || one.stage == Stage::kAnalyze;
           });
  }

  void checkNumber(const DiagnosticRecord& record, std::string_view what, std::uint64_t number, std::uint64_t most) {
    if (number > most || (number == 0 && most > 0)) {
      add(record, formatMessage("%@ %@ of a run that has %@", what, number, most));
    }
  }

  void checkStart(const DiagnosticRecord& record) {
    const Trial& trial = record.trial;
    if (trial.repetition < repetition_) add(record, formatMessage("it follows repetition %@", repetition_));
    const bool isNext = expected_ > 0 && record.name == name_ && trial.repetition == repetition_;
    if (isNext && trial.attempt == expected_) return;
    tellMissing();
    if (trial.attempt > 1) add(record, "no attempt before it ended in an error");
    if (trial.attempt == 1 && !first_.emplace(trial.repetition, record.name).second) {
      add(record, "the first attempt is recorded twice");
    }
  }

  void tellMissing() {
    if (expected_ == 0) return;
    problems_.push_back(formatMessage("%@ ended in an error, but attempt %@ is missing", name_, expected_));
  }

  void add(const DiagnosticRecord& record, const std::string& problem) {
    problems_.push_back(record.name + trialSuffix(record) + ": " + problem);
  }

  std::vector<std::string>& problems_;
  std::string name_;                                       // of the last diagnostic
  std::uint64_t repetition_ = 0;                           // its repetition
  std::uint64_t expected_ = 0;                             // its next attempt; 0: none
  std::set<std::pair<std::uint64_t, std::string>> first_;  // attempts of each repetition
};

class Verifier {
 public:
  void onEvent(const RunEvent& event) {
    if (const auto* const failed = std::get_if<Failed>(&event); failed != nullptr && !failed->stage) {
      hostError_ = failed->error;  // the host's own error, which must follow from the other events
      if (!builder_.isOpen()) add("a failure is recorded outside of any diagnostic");
      return;
    }
    checkPlace(event);
    builder_.onEvent(event);
    if (std::holds_alternative<DiagnosticStarted>(event)) {
      hostError_ = nullptr;
      wasSkipped_ = false;
    }
    if (std::holds_alternative<DiagnosticSkipped>(event)) wasSkipped_ = true;
    if (const auto* const traced = std::get_if<FramesTraced>(&event);
        traced != nullptr && builder_.isOpen() && builder_.record().stages.empty()) {
      add(builder_.record().name + (traced->kind == TracedKind::kFrames ? ": frames" : ": tasks") +
          " are recorded before its first stage");
    }
    if (std::holds_alternative<DiagnosticEnded>(event)) checkVerdict();
  }

  std::vector<std::string> problems;

 private:
  void checkPlace(const RunEvent& event) {
    if (ended_) add("events follow the end of the run");
    const bool begins = std::holds_alternative<DiagnosticStarted>(event);
    if (const auto* const began = std::get_if<RunStarted>(&event)) {
      if (began_) add("the run starts twice");
      began_ = true;
      run_ = *began;
    } else if (const auto* const ended = std::get_if<RunEnded>(&event)) {
      if (builder_.isOpen()) add("the run ends before " + builder_.record().name + " has ended");
      if (!ended->interrupted) {
        checkNames();
        checkLimits();
        trials_.checkEnd();
      }
      checkRunVerdict(*ended);
      ended_ = true;
    } else if (begins == builder_.isOpen()) {
      add(begins ? builder_.record().name + " has not ended when the next diagnostic starts"
                 : "an event is recorded outside of any diagnostic");
    }
  }

  void checkNames() {
    for (const PlannedDiagnostic& one : missingOf(run_, records_)) {
      const std::string which = one.repetition == 0 ? "" : formatMessage(", repetition %@,", one.repetition);
      add(one.name + which + " was selected to run but is missing from the record");
    }
  }

  // A run with attempts or repetitions has a verdict of its own.
  void checkRunVerdict(const RunEnded& ended) {
    const bool isDue = !ended.interrupted && hasTrials(records_);
    const std::string_view due = isDue ? nameOf(runVerdictOf(records_, run_.acceptFlaky)) : "none";
    const std::string_view recorded = ended.verdict ? nameOf(*ended.verdict) : "none";
    if (recorded == due) return;
    add(formatMessage("the recorded verdict of the run is %@, but its entries give %@", recorded, due));
  }

  void checkLimits() {
    for (const UserLimit& limit : limitsWithoutResult(run_.limits, records_)) {
      const std::string text = canonicalText(limit);
      const bool isReported = std::any_of(records_.begin(), records_.end(), [&text](const DiagnosticRecord& one) {
        return isOfLimit(one) && one.name == text;
      });
      if (!isReported) add(formatMessage("the limit '%@' fits no result, but this is not recorded as an error", text));
    }
  }

  void checkVerdict() {
    const DiagnosticRecord& record = builder_.record();
    trials_.check(run_, triedOf(record));
    records_.push_back(resultsOf(record));
    RecordJudgement judged = judgeRecord(record, builder_.isCompleted());
    if (wasSkipped_ && !isUntouched(record)) {
      add(record.name + " was skipped, but something of it is recorded");
    }
    const DiagnosticErrorPtr due = record.error == nullptr ? judged.error : nullptr;
    // That a record could not be written is independent of the diagnostic's events.
    if (isHostError(hostError_, HostErrorCode::kNotRecorded)) {
      judged.verdict = Verdict::kError;
    } else if (textOf(hostError_) != textOf(due)) {
      add(formatMessage("%@: the recorded error of quazor is %@, but the results, limits and errors give %@",
                        record.name, textOf(hostError_), textOf(due)));
    }
    if (judged.verdict != record.verdict) {
      add(formatMessage("%@: the recorded verdict is %@, but the results, limits and errors give %@", record.name,
                        nameOf(record.verdict), nameOf(judged.verdict)));
    }
  }

  // What the order of the attempts needs. An error of quazor is one as well.
  DiagnosticRecord triedOf(const DiagnosticRecord& record) const {
    DiagnosticRecord tried = resultsOf(record);
    if (tried.error == nullptr) tried.error = hostError_;
    tried.errorStage = record.errorStage;
    tried.stages = record.stages;
    return tried;
  }

  // What the comparison with limits and the verdict of the run need.
  static DiagnosticRecord resultsOf(const DiagnosticRecord& record) {
    DiagnosticRecord results;
    results.name = record.name;
    results.experimentName = record.experimentName;
    results.measuredResults = record.measuredResults;
    results.limits = record.limits;
    results.error = record.error;
    results.skip = record.skip;
    results.verdict = record.verdict;
    results.trial = record.trial;
    return results;
  }

  void add(std::string problem) { problems.push_back(std::move(problem)); }

  RecordBuilder builder_;
  DiagnosticErrorPtr hostError_;
  bool wasSkipped_ = false;  // the diagnostic that began last
  RunStarted run_;
  std::vector<DiagnosticRecord> records_;
  TrialOrder trials_{problems};
  bool began_ = false;
  bool ended_ = false;
};

}  // namespace

std::vector<std::string> problemsOf(const std::vector<RunEvent>& events) {
  Verifier verifier;
  for (const RunEvent& event : events) verifier.onEvent(event);
  return std::move(verifier.problems);
}

std::vector<std::string> problemsOfRecord(const StoredRecord& stored) {
  std::vector<std::string> problems = problemsOf(stored.events);
  const bool isComplete = std::holds_alternative<RunEnded>(stored.events.back());
  if (isComplete && stored.cutOff) problems.emplace_back("an incomplete line follows the end of the run");
  return problems;
}

}  // namespace quazor
