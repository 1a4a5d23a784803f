#include "host/record/verification.h"

#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/limit_check.h"
#include "host/model/record_builder.h"

#include <algorithm>
#include <cstdint>
#include <utility>

namespace quazor {

namespace {

// True for the host's failure to write a record, which is independent of the diagnostic's events.
bool isNotRecorded(const DiagnosticError& error) {
  return error.domain() == QuazorHostErrorDomain &&
         error.code() == static_cast<std::int64_t>(HostErrorCode::kNotRecorded);
}

std::string textOf(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return "none";
  return formatMessage("%@ %@ '%@'", error->domain(), error->code(), error->localizedDescription());
}

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
      toRun_ = began->names;
      limits_ = began->limits;
    } else if (const auto* const ended = std::get_if<RunEnded>(&event)) {
      if (builder_.isOpen()) add("the run ends before " + builder_.record().name + " has ended");
      if (!ended->interrupted) {
        checkNames();
        checkLimits();
      }
      ended_ = true;
    } else if (begins == builder_.isOpen()) {
      add(begins ? builder_.record().name + " has not ended when the next diagnostic starts"
                 : "an event is recorded outside of any diagnostic");
    }
  }

  void checkNames() {
    for (const std::string& name : toRun_) {
      if (std::find(run_.begin(), run_.end(), name) == run_.end())
        add(name + " was selected to run but is missing from the record");
    }
  }

  void checkLimits() {
    for (const UserLimit& limit : limitsWithoutResult(limits_, records_)) {
      const std::string text = canonicalText(limit);
      const bool isReported = std::any_of(records_.begin(), records_.end(), [&text](const DiagnosticRecord& one) {
        return isOfLimit(one) && one.name == text;
      });
      if (!isReported) add(formatMessage("the limit '%@' fits no result, but this is not recorded as an error", text));
    }
  }

  void checkVerdict() {
    const DiagnosticRecord& record = builder_.record();
    run_.push_back(record.name);
    records_.push_back(resultsOf(record));
    RecordJudgement judged = judgeRecord(record, builder_.isCompleted());
    if (wasSkipped_ && !isUntouched(record)) {
      add(record.name + " was skipped, but something of it is recorded");
    }
    const DiagnosticErrorPtr due = record.error == nullptr ? judged.error : nullptr;
    if (hostError_ != nullptr && isNotRecorded(*hostError_)) {
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

  // What the comparison with limits needs.
  static DiagnosticRecord resultsOf(const DiagnosticRecord& record) {
    DiagnosticRecord results;
    results.name = record.name;
    results.experimentName = record.experimentName;
    results.measuredResults = record.measuredResults;
    results.error = record.error;
    results.skip = record.skip;
    return results;
  }

  void add(std::string problem) { problems.push_back(std::move(problem)); }

  RecordBuilder builder_;
  DiagnosticErrorPtr hostError_;
  bool wasSkipped_ = false;  // the diagnostic that began last
  std::vector<std::string> toRun_;
  std::vector<UserLimit> limits_;
  std::vector<DiagnosticRecord> records_;
  std::vector<std::string> run_;
  bool began_ = false;
  bool ended_ = false;
};

}  // namespace

std::vector<std::string> problemsOf(const std::vector<RunEvent>& events) {
  Verifier verifier;
  for (const RunEvent& event : events) verifier.onEvent(event);
  return std::move(verifier.problems);
}

}  // namespace quazor
