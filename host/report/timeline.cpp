#include "host/report/timeline.h"

#include "host/model/trials.h"
#include "host/record/value_json.h"
#include "host/report/run_identity.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <optional>
#include <string_view>
#include <utility>
#include <variant>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

using std::chrono::nanoseconds;

// The rows of a diagnostic; the streams follow, each with a row of its own.
constexpr int kWholeRow = 0;
constexpr int kStageRow = 1;
constexpr int kLogRow = 2;
constexpr int kFirstStreamRow = 3;

// U+FFFD replaces invalid UTF-8.
std::string textOf(const Json& json) { return json.dump(-1, ' ', false, nlohmann::detail::error_handler_t::replace); }

std::string quoted(const std::string& text) { return textOf(Json(text)); }

// Microseconds, the unit of the format, without loss: a double has not enough digits for long runs.
std::string microseconds(nanoseconds time) {
  const std::int64_t count = time.count();
  const std::string digits = std::to_string(1000 + std::abs(count % 1000)).substr(1);
  return (count < 0 && count > -1000 ? "-" : "") + std::to_string(count / 1000) + "." + digits;
}

// The sum, or the latest or earliest time that there is: a record may hold any times.
nanoseconds sumOf(nanoseconds one, nanoseconds other) {
  nanoseconds::rep sum = 0;
  const bool isTooLarge = __builtin_add_overflow(one.count(), other.count(), &sum);
  if (isTooLarge) return other.count() < 0 ? nanoseconds::min() : nanoseconds::max();
  return nanoseconds(sum);
}

nanoseconds between(Date begin, Date end) { return sumOf(end.time_since_epoch(), -begin.time_since_epoch()); }

}  // namespace

// Thread: one at a time.
class Timeline::Writer {
 public:
  Writer(const TimelinePart& part, std::size_t most) : part_(part), most_(most) {}

  void add(const RunEvent& event) {
    if (isTooLarge_) return;
    std::visit([this](const auto& one) { take(one); }, event);
  }

  const std::string& finish() {
    if (!isFinished_) addEnd();
    isFinished_ = true;
    if (isTooLarge_) {
      throw TimelineTooLarge("the time line is longer than " + std::to_string(most_ / 1'000'000) + " MB");
    }
    return text_;
  }

  bool isEmpty() const { return isEmpty_; }
  nanoseconds end() const { return end_; }

 private:
  // The diagnostic that is running; its times are those of the time line.
  struct Running {
    int process = 0;
    DiagnosticStarted began;
    nanoseconds begin{};
    nanoseconds zero{};    // of the phone's clock
    nanoseconds cursor{};  // the end of the last stage
    nanoseconds latest{};
    std::optional<StageStarted> stage;
    std::map<Stage, nanoseconds> ends;
    std::optional<Failed> failure;
    std::optional<Skip> skip;
    std::map<std::string, int> streams;
    std::map<std::string, std::uint64_t> steps;
  };

  void addEnd() {
    if (!run_) {
      text_ = "{\"traceEvents\":[]}\n";
      return;
    }
    if (diagnostic_) endDiagnostic(std::nullopt);
    addRow(0, kWholeRow, "run");
    addProcess(0, "quazor");
    addDuration({0, kWholeRow}, nanoseconds(0), end_, "run", textOf(runJson(*run_)));
    text_ += "\n]}\n";
  }

  struct Row {
    int process;
    int row;
  };

  void take(const RunStarted& run) {
    run_ = run;
    text_ = "{\"displayTimeUnit\":\"ms\",\"otherData\":" + textOf(runJson(run)) + ",\"traceEvents\":[";
  }

  void take(const DiagnosticStarted& began) {
    if (!run_) return;
    if (diagnostic_) endDiagnostic(std::nullopt);
    diagnostic_ = std::make_unique<Running>();
    Running& running = *diagnostic_;
    running.process = ++processes_;
    running.began = began;
    running.begin = std::max(between(run_->date, began.date), end_);
    running.zero = running.cursor = running.latest = running.begin;
    DiagnosticRecord named;
    named.trial = {began.attempt, 0, began.repetition, 0};
    addProcess(running.process, began.name + trialSuffix(named));
    addRow(running.process, kWholeRow, "diagnostic");
    addRow(running.process, kStageRow, "stages");
    addRow(running.process, kLogRow, "log");
  }

  void take(const StageStarted& stage) {
    if (diagnostic_) diagnostic_->stage = stage;
  }

  void take(const StageEnded& stage) {
    if (!diagnostic_ || !diagnostic_->stage) return;
    const nanoseconds byWall = between(diagnostic_->stage->date, stage.date);
    endStage(stage.duration.value_or(byWall), "{}");
    // The phone's clock is that of the experiment, which the plug-in makes once it is loaded.
    if (stage.stage == Stage::kLoad) diagnostic_->zero = diagnostic_->cursor;
  }

  void take(const Logged& logged) {
    if (!diagnostic_) return;
    const std::string& text = logged.line.text;
    const nanoseconds at = seen(logged.line.time);
    std::string arguments = "{\"level\":" + quoted(std::string(nameOf(logged.line.level)));
    const std::size_t line = text.find('\n');
    if (line != std::string::npos) arguments += ",\"text\":" + quoted(text);
    addInstant({diagnostic_->process, kLogRow}, at, text.substr(0, line), arguments + "}");
  }

  void take(const MeasurementsAdded& added) {
    if (!diagnostic_) return;
    for (const auto& [name, measurement] : added.measurements) {
      const Row row{diagnostic_->process, kWholeRow};
      const Json arguments = {{measurement.unit().symbol(), numberJson(measurement.value())}};
      const std::string text = textOf(arguments);
      // What is no number is no point of a counter's curve.
      if (std::isfinite(measurement.value())) {
        addAt("C", row, diagnostic_->cursor, name, text);
      } else {
        addInstant(row, diagnostic_->cursor, name, text);
      }
    }
  }

  void take(const FramesTraced& traced) {
    if (!diagnostic_) return;
    const bool isOfTasks = traced.kind == TracedKind::kTasks;
    const std::string rows = isOfTasks ? "tasks" : "frames";
    const std::string name = rows + " of " + traced.stream;
    const auto next = kFirstStreamRow + static_cast<int>(diagnostic_->streams.size());
    const auto [found, isNew] = diagnostic_->streams.try_emplace(name, next);
    const Row row{diagnostic_->process, found->second};
    if (isNew) addRow(row.process, row.row, name);
    const nanoseconds first =
        traced.frames.empty() ? diagnostic_->latest : seen(nanoseconds(traced.frames[0].delivered));
    if (std::uint64_t& step = diagnostic_->steps[name]; step != traced.step) {
      if (step != 0 || traced.step != 1) {
        addInstant(row, first, "from here, 1 of " + std::to_string(traced.step) + " " + rows + " is recorded", "{}");
      }
      step = traced.step;
    }
    for (const TracedFrame& frame : traced.frames) {
      if (isOfTasks) {
        addTask(row, frame);
        continue;
      }
      std::string arguments = "{\"latency\":" + microseconds(nanoseconds(frame.delivered - frame.captured));
      if (frame.returned) {
        arguments += ",\"held\":" + microseconds(nanoseconds(*frame.returned - frame.delivered));
      }
      addInstant(row, seen(nanoseconds(frame.delivered)), "frame " + std::to_string(frame.number), arguments + "}");
    }
    if (traced.lost > 0) {
      addInstant(row, diagnostic_->latest, std::to_string(traced.lost) + " " + rows + " could not be recorded", "{}");
    }
  }

  void addTask(Row row, const TracedFrame& task) {
    const nanoseconds begun = seen(nanoseconds(task.delivered));
    const std::string name = "thread " + std::to_string(task.number);
    std::string arguments = "{\"waited\":" + microseconds(nanoseconds(task.delivered - task.captured));
    if (!task.returned) return addInstant(row, begun, name + ", not ended", arguments + "}");
    arguments += ",\"ran\":" + microseconds(nanoseconds(*task.returned - task.delivered)) + "}";
    addDuration(row, begun, seen(nanoseconds(*task.returned)), name, arguments);
  }

  void take(const Failed& failure) {
    if (diagnostic_ && !diagnostic_->failure) diagnostic_->failure = failure;
  }

  void take(const DiagnosticSkipped& skipped) {
    if (diagnostic_) diagnostic_->skip = skipped.skip;
  }

  void take(const DiagnosticEnded& ended) {
    if (!diagnostic_) return;
    const nanoseconds byWall = between(diagnostic_->began.date, ended.date);
    diagnostic_->latest = std::max(diagnostic_->latest, sumOf(diagnostic_->begin, byWall));
    endDiagnostic(ended.verdict);
  }

  void take(const RunEnded& ended) {
    if (run_) end_ = std::max(end_, between(run_->date, ended.date));
  }

  void take(const AuxiliaryDataAdded& /*added*/) {}
  void take(const ResultsReported& /*reported*/) {}
  void take(const FaultsCounted& /*counted*/) {}
  void take(const Heartbeat& /*heartbeat*/) {}
  void take(const DiagnosticCompleted& /*completed*/) {}

  // A moment by the phone's clock.
  nanoseconds seen(nanoseconds byPhone) {
    const nanoseconds at = sumOf(diagnostic_->zero, byPhone);
    diagnostic_->latest = std::max(diagnostic_->latest, at);
    return at;
  }

  void endStage(nanoseconds length, const char* arguments) {
    Running& running = *diagnostic_;
    const nanoseconds begin = running.cursor;
    running.cursor = sumOf(begin, std::max(length, nanoseconds(0)));
    running.latest = std::max(running.latest, running.cursor);
    running.ends[running.stage->stage] = running.cursor;
    addDuration({running.process, kStageRow}, begin, running.cursor, std::string(nameOf(running.stage->stage)),
                arguments);
    running.stage.reset();
  }

  void endDiagnostic(std::optional<Verdict> verdict) {
    Running& running = *diagnostic_;
    if (running.stage) endStage(running.latest - running.cursor, R"({"ended":false})");
    Json arguments = {{"verdict", verdict ? Json(nameOf(*verdict)) : Json(nullptr)}, {"seed", running.began.seed}};
    if (running.skip) arguments["skip"] = running.skip->reason;
    if (running.failure) {
      const std::optional<Stage> stage = running.failure->stage;
      const auto end = stage ? running.ends.find(*stage) : running.ends.end();
      arguments["error"] = errorJson(running.failure->error);
      addInstant({running.process, kStageRow}, end == running.ends.end() ? running.latest : end->second, "error",
                 textOf(Json{{"error", arguments["error"]}}));
    }
    addDuration({running.process, kWholeRow}, running.begin, running.latest, running.began.name, textOf(arguments));
    end_ = running.latest;
    diagnostic_.reset();
  }

  void addProcess(int process, const std::string& name) {
    addEvent("M", {process, 0}, R"(,"name":"process_name","args":{"name":)" + quoted(name) + "}");
    addEvent("M", {process, 0},
             R"(,"name":"process_sort_index","args":{"sort_index":)" + std::to_string(process) + "}");
  }

  void addRow(int process, int row, const std::string& name) {
    addEvent("M", {process, row}, R"(,"name":"thread_name","args":{"name":)" + quoted(name) + "}");
  }

  // The row of the whole run is in every part.
  bool isShown(Row row, nanoseconds begin, nanoseconds end) {
    const bool isInPart = end >= part_.from && begin <= part_.to;
    if (isInPart && row.process != 0) isEmpty_ = false;
    return isInPart;
  }

  void addDuration(Row row, nanoseconds begin, nanoseconds end, const std::string& name, const std::string& arguments) {
    if (!isShown(row, begin, end)) return;
    // Viewers turn a duration into a begin and an end and sort these by time. Only whole microseconds add up to the
    // begin of the next duration without a rounding error, and one without length would end too late.
    const auto first = std::chrono::floor<std::chrono::microseconds>(begin);
    const auto length = std::chrono::floor<std::chrono::microseconds>(end) - first;
    if (length.count() == 0) return addInstant(row, begin, name, arguments);
    addEvent("X", row,
             ",\"ts\":" + std::to_string(first.count()) + ",\"dur\":" + std::to_string(length.count()) +
                 ",\"name\":" + quoted(name) + ",\"args\":" + arguments);
  }

  void addInstant(Row row, nanoseconds at, const std::string& name, const std::string& arguments) {
    addAt("i", row, at, name, arguments);
  }

  void addAt(const char* kind, Row row, nanoseconds at, const std::string& name, const std::string& arguments) {
    if (!isShown(row, at, at)) return;
    addEvent(kind, row, ",\"ts\":" + microseconds(at) + ",\"name\":" + quoted(name) + ",\"args\":" + arguments);
  }

  void addEvent(const char* kind, Row row, const std::string& content) {
    if (isTooLarge_) return;
    text_ += text_.ends_with('[') ? "\n" : ",\n";
    text_ += "{\"ph\":\"" + std::string(kind) + "\",\"pid\":" + std::to_string(row.process) +
             ",\"tid\":" + std::to_string(row.row) + content + "}";
    if (text_.size() <= most_) return;
    isTooLarge_ = true;
    text_ = {};
  }

  const TimelinePart part_;
  const std::size_t most_;
  std::optional<RunStarted> run_;
  std::unique_ptr<Running> diagnostic_;
  int processes_ = 0;
  nanoseconds end_{};  // of the last diagnostic, later of the run
  std::string text_;
  bool isTooLarge_ = false;
  bool isFinished_ = false;
  bool isEmpty_ = true;
};

Timeline::Timeline(const TimelinePart& part, std::size_t most) : writer_(std::make_unique<Writer>(part, most)) {}

Timeline::~Timeline() = default;

void Timeline::onEvent(const RunEvent& event) { writer_->add(event); }

const std::string& Timeline::text() { return writer_->finish(); }

bool Timeline::isEmpty() const { return writer_->isEmpty(); }

std::chrono::nanoseconds Timeline::end() const { return writer_->end(); }

std::string timelineText(const std::vector<RunEvent>& events, const TimelinePart& part, std::size_t most) {
  Timeline timeline(part, most);
  for (const RunEvent& event : events) timeline.onEvent(event);
  return timeline.text();
}

}  // namespace quazor
