// RunEvent: an event of a run. All reports and records are derived from these events.
#pragma once

#include "contract/results.h"
#include "host/device/traced_frame.h"
#include "host/model/diagnostic_record.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

namespace quazor {

// The run whose record an analysis is of.
struct AnalyzedRun {
  std::string id;  // empty in records of format 1, like the host
  Date date{};
  std::string host;
};

// What was asked for of a diagnostic, whether it is reached or not.
struct PlannedParameters {
  std::string name;
  ResolvedParameters parameters;
};

// The first event: the diagnostics, plug-ins and phone of the run.
struct RunStarted {
  std::string program;  // the version of quazor
  int contract = 0;     // the version of the plug-in contract
  Date date{};
  std::vector<std::string> plugins;  // files
  std::string phone;                 // its scenario or binding
  std::uint64_t seed = 0;
  bool ofExperiments = false;      // true for experiments on their own
  std::vector<std::string> names;  // of the diagnostics or experiments to run
  std::vector<UserLimit> limits{};
  std::string id{};                // random: 128 bits in hexadecimal; empty in records of format 1
  std::string host{};              // the name of the machine; empty in records of format 1
  OrderedMap<std::string> tags{};  // of the user, for example serial=C02X
  // How often a diagnostic is tried, at most, and how often all are run; 0 without these options, also for the analysis
  // of a record, whose entries keep their numbers.
  std::uint64_t attempts = 0;
  std::uint64_t repetitions = 0;
  bool acceptFlaky = false;  // a pass after an error does not make the run an error
  bool traced = false;       // the frames of the cameras are told, too
  bool tracesTasks = false;  // so are the tasks of the plug-in's queues
  // Only of an analysis. If its record is itself that of an analysis, this is the run that measured.
  std::optional<AnalyzedRun> analyzed{};
  // Of each name that can be run, in their order; empty in earlier records.
  std::vector<PlannedParameters> planned{};
};

struct DiagnosticStarted {
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;  // empty for an experiment on its own
  bool experimentOnly = false;
  ResolvedParameters parameters;
  std::uint64_t seed = 0;
  Date date{};
  std::uint64_t attempt = 0;     // from 1; 0: the run does not try again
  std::uint64_t repetition = 0;  // from 1; 0: the run does not repeat
};

struct StageStarted {
  Stage stage;
  Date date{};
};

struct StageEnded {
  Stage stage;
  std::optional<std::chrono::nanoseconds> duration;  // by the phone's clock, if a phone was running
  Date date{};
};

struct Logged {
  LogLine line;
  bool isOfHost = false;  // neither stored nor sent: the host's own lines have limits of their own
};

// Some of the measurements of the experiment's result, in their order.
struct MeasurementsAdded {
  std::vector<std::pair<std::string, Measurement>> measurements;
};

// An entry of the result's auxiliary data.
struct AuxiliaryDataAdded {
  std::string key;
  Value value;
};

// Some of the measured results of the analysis, in their order.
struct ResultsReported {
  std::vector<QZMeasuredResult> results;
};

// A stage failed. Only the first failure of a diagnostic counts.
struct Failed {
  std::optional<Stage> stage;
  DiagnosticErrorPtr error;
};

struct FaultsCounted {
  std::vector<DeclaredFault> faults;
};

// The diagnostic that has begun is not run. Only its end follows.
struct DiagnosticSkipped {
  Skip skip;
};

// A sign that the diagnostic is still running, by the clock of this machine.
struct Heartbeat {
  Stage stage;                         // the current or the last one
  std::chrono::nanoseconds elapsed{};  // since the process of the diagnostic began
  Date date{};
};

// Frames of one stream of the phone, in the order of their delivery, or tasks of one queue, in the order in which they
// begin. The phone and the host tell them, not the plug-in.
struct FramesTraced {
  std::string stream;               // or queue
  std::uint64_t step = 1;           // 1: every frame; 2: every second one
  std::vector<TracedFrame> frames;  // at most kMaxTracedFrames
  std::uint64_t lost = 0;           // for which there was no room, and which were not told before
  TracedKind kind = TracedKind::kFrames;
};

// The plug-in has finished; only the host sends further events of this diagnostic.
struct DiagnosticCompleted {};

struct DiagnosticEnded {
  Verdict verdict = Verdict::kError;
  Date date{};
};

struct RunEnded {
  std::optional<std::string> interrupted;  // the diagnostic that was running at the interruption; empty if none was
  Date date{};
  std::optional<Verdict> verdict{};  // of the run; only if it has attempts or repetitions and was not interrupted
};

using RunEvent = std::variant<RunStarted, DiagnosticStarted, StageStarted, StageEnded, Logged, MeasurementsAdded,
                              AuxiliaryDataAdded, ResultsReported, Failed, FaultsCounted, DiagnosticSkipped, Heartbeat,
                              FramesTraced, DiagnosticCompleted, DiagnosticEnded, RunEnded>;

// Receives the events of a run, in order.
// Thread: one at a time.
class RunEventSink {
 public:
  RunEventSink() = default;
  RunEventSink(const RunEventSink&) = delete;
  RunEventSink& operator=(const RunEventSink&) = delete;
  virtual ~RunEventSink() = default;

  virtual void onEvent(const RunEvent& event) = 0;
};

}  // namespace quazor
