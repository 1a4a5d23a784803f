// Records for tests of reports.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/model/run_event.h"

#include <chrono>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

inline QZMeasuredResult resultWithMinimum(double value, double minimum) {
  QZMeasuredResult result("Count", Measurement(value, QZDimensionlessUnit::frames()));
  QZLimit limit("Enough");
  limit.setLowerBound(std::make_shared<const QZBound>(Measurement(minimum, QZDimensionlessUnit::frames()), false));
  result.setLimit(std::move(limit));
  return result;
}

// A judged result whose limit is an open upper bound alone.
inline JudgedResult resultWithMaximum(double value, double maximum) {
  QZMeasuredResult result("R", Measurement(value, QZDimensionlessUnit::frames()));
  QZLimit limit("L");
  limit.setUpperBound(std::make_shared<const QZBound>(Measurement(maximum, QZDimensionlessUnit::frames()), true));
  result.setLimit(std::move(limit));
  return judgeResult(result);
}

inline std::vector<JudgedResult> judgeResults(const std::vector<QZMeasuredResult>& results) {
  std::vector<JudgedResult> judged;
  for (const QZMeasuredResult& result : results) judged.push_back(judgeResult(result));
  return judged;
}

// A record with a limited result, an informational one, and an entry in every other list.
inline DiagnosticRecord recordOf(const std::string& name, Verdict verdict) {
  using namespace std::chrono_literals;
  DiagnosticRecord record;
  record.name = name;
  record.summary = "Its summary.";
  record.verdict = verdict;
  record.parameters.experiment.push_back({"duration", QZNumberParameter("", true), Value(3), "command line"});
  record.parameters.experiment.push_back({"gain", QZNumberParameter("", false), std::nullopt, ""});
  const double value = verdict == Verdict::kFail ? 89 : 90;
  record.measuredResults = judgeResults(
      {resultWithMinimum(value, 90), QZMeasuredResult("Offset", Measurement(0.5, QZDimensionlessUnit::events()))});
  record.measurements.set("Raw", Measurement(value, QZDimensionlessUnit::frames()));
  record.auxiliaryData.set("bytes", Bytes{0xA5});
  record.log.push_back({250ms, LogLevel::kError, "a line"});
  record.faults.push_back({{{"operation", "CaptureStream.start"}}, 1});
  record.seed = 7;
  record.durations = {0ns, 3s, std::nullopt, 0ns};
  if (verdict == Verdict::kError) {
    const DiagnosticErrorPtr cause = errorWithMessage("Deep", 2, "the cause", nullptr);
    record.error = errorWithMessage("Domain", -1, "it failed", cause);
  }
  return record;
}

// How recordOf("Name", Verdict::kError) reads when it holds nothing but its error.
inline constexpr const char* kTextOfErrorAlone =
    "Name\n"
    "  Its summary.\n"
    "\n"
    "  ERROR\n"
    "    Domain code -1: it failed\n"
    "    caused by Deep code 2: the cause\n"
    "\n";

// A run on a simulated phone.
inline RunStarted startedRun() {
  RunStarted run;
  run.program = "0.1.0";
  run.contract = 2;
  run.plugins = {"p.so"};
  run.phone = "phone.json";
  run.seed = 5;
  return run;
}

}  // namespace quazor
