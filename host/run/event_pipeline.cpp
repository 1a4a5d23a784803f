#include "host/run/event_pipeline.h"

#include "host/device/phone.h"
#include "host/error/host_error.h"
#include "host/record/previous_run.h"
#include "host/text/table.h"
#include "host/text/timestamp.h"

#include <chrono>
#include <system_error>

namespace quazor {

namespace {

constexpr std::chrono::seconds kMaxWaitOfInterrupt{1};

void tellLastRunIsLost(const std::string& why, std::ostream& err) {
  err << "quazor: 'run --only failed' will not know this run: " << printable(why) << '\n' << std::flush;
}

// The record of the previous run; null if it cannot be created. The user did not request it, so that is no failure.
std::unique_ptr<RecordWriter> lastRunRecord(std::ostream& err) {
  const std::filesystem::path file = previousRunFile();
  if (file.empty()) return nullptr;
  std::error_code ignored;
  std::filesystem::create_directories(file.parent_path(), ignored);
  try {
    return std::make_unique<RecordWriter>(file, RecordWriter::Existing::kReplaceAll);  // the last run to begin counts
  } catch (const CommandError& problem) {
    tellLastRunIsLost(problem.what(), err);
    return nullptr;
  }
}

std::string problemOf(const RecordWriter& record) {
  return "the record '" + record.file().string() + "' cannot be written: " + record.problem();
}

}  // namespace

EventPipeline::EventPipeline(const EventPipelineOptions& options, Console& console)
    : console_(console),
      tellsRecord_(options.tellsRecord),
      logLimit_(options.logLimit),
      logCap_(options.logLimit),
      report_(options.report, console) {
  if (!options.record.empty()) {
    const auto existing = options.replacesRecord ? RecordWriter::Existing::kReplace : RecordWriter::Existing::kRefuse;
    records_.push_back(std::make_unique<RecordWriter>(options.record, existing));
  }
  required_ = records_.size();
  if (options.keepsLastRun) {
    if (std::unique_ptr<RecordWriter> last = lastRunRecord(console.err)) records_.push_back(std::move(last));
  }
  if (options.systemLog) systemLog_ = systemLogOfThisMachine();
}

void EventPipeline::onEvent(const RunEvent& event) {
  const std::lock_guard lock(mutex_);
  if (std::holds_alternative<DiagnosticStarted>(event)) logCap_ = LogCap(logLimit_);
  if (!isLeftOut(event)) pass(event);
}

bool EventPipeline::isLeftOut(const RunEvent& event) {
  const auto* const logged = std::get_if<Logged>(&event);
  if (logged == nullptr || logged->isOfHost) return false;
  lastLine_ = logged->line.time;
  return !logCap_.admits(logged->line.text.size());
}

void EventPipeline::pass(const RunEvent& event) {
  if (!records_.empty()) {
    // Formats the line once for all records: a run may have a million log lines.
    const std::string line = recordLine(event, recorded_++);
    for (const std::unique_ptr<RecordWriter>& record : records_) record->onEvent(event, line);
  }
  builder_.onEvent(event);
  if (const auto* const logged = std::get_if<Logged>(&event); logged != nullptr && systemLog_ != nullptr) {
    systemLog_->write(logged->line.level, sharedLog().subsystem(), sharedLog().category(), logged->line.text);
  }
  report_.onEvent(event);
  if (std::holds_alternative<DiagnosticEnded>(event)) report_.addRecord(builder_.takeRecord());
  if (std::holds_alternative<RunEnded>(event)) {
    ended_ = true;
    for (std::size_t i = required_; i < records_.size(); ++i) {
      if (!records_[i]->problem().empty()) tellLastRunIsLost(problemOf(*records_[i]), console_.err);
    }
    if (tellsRecord_) tellRecord();
  }
}

void EventPipeline::tellRecord() {
  const RecordWriter& record = *records_.front();
  if (record.problem().empty())
    console_.err << "Recorded in " << printable(record.file().string()) << '\n' << std::flush;
}

void EventPipeline::endDiagnostic() {
  const std::lock_guard lock(mutex_);
  endOpenDiagnostic();
}

void EventPipeline::endOpenDiagnostic() {
  if (logCap_.leftOut() > 0) pass(leftOutLine(logCap_.leftOut(), lastLine_));
  for (std::size_t i = 0; i < required_; ++i) {
    const RecordWriter& record = *records_[i];
    if (record.problem().empty()) continue;
    pass(Failed{std::nullopt, hostError(HostErrorCode::kNotRecorded, problemOf(record))});
  }
  for (const RunEvent& event : builder_.ending(dateNow())) pass(event);
}

void EventPipeline::requireRecords() const {
  for (std::size_t i = 0; i < required_; ++i) {
    if (!records_[i]->problem().empty()) throw CommandError(ExitCode::kCannotWrite, problemOf(*records_[i]));
  }
}

void EventPipeline::interruptRun() {
  if (ended_) return;
  std::string running;
  if (builder_.isOpen()) {
    running = builder_.record().name;
    const std::optional<Stage> stage = builder_.stage();
    pass(
        Failed{stage ? stage : Stage::kDescribe, hostError(HostErrorCode::kInterrupted, running + " was interrupted")});
    endOpenDiagnostic();
  }
  pass(RunEnded{running, dateNow()});
}

void EventPipeline::tellInterrupt(Stage stage, std::chrono::nanoseconds grace) {
  const std::lock_guard lock(mutex_);
  report_.tellInterrupt(stage, grace);
}

void EventPipeline::tellRemark(const std::string& remark) {
  const std::lock_guard lock(mutex_);
  report_.tellRemark(remark);
}

void EventPipeline::interruptAndLeave(const std::function<void()>& leave) {
  const std::unique_lock lock(mutex_, kMaxWaitOfInterrupt);
  if (lock.owns_lock()) interruptRun();
  leave();
}

}  // namespace quazor
