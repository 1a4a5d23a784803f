// An oracle for verdicts, implemented differently from the judge.
#pragma once

#include "host/model/judge.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace quazor {

// One bound of a limit as plain numbers.
struct OracleBound {
  bool isThere = false;
  double value = 0;
  bool open = false;
  bool isUsable = true;  // finite and in the unit of the value
};

inline OracleBound oracleBound(const std::shared_ptr<const QZBound>& bound, const Measurement& measured) {
  if (bound == nullptr) return {};
  const bool sameUnit = bound->value().unit().symbol() == measured.unit().symbol();
  return {true, bound->value().value(), bound->open(), sameUnit && std::isfinite(bound->value().value())};
}

struct OracleResult {
  bool isLimited = false;
  bool isJudgeable = false;
  bool isInside = false;
};

inline OracleResult oracleResult(const QZMeasuredResult& result) {
  if (!result.limit()) return {};
  const double value = result.measurement().value();
  const OracleBound low = oracleBound(result.limit()->lowerBound(), result.measurement());
  const OracleBound high = oracleBound(result.limit()->upperBound(), result.measurement());
  OracleResult judged;
  judged.isLimited = low.isThere || high.isThere;
  judged.isJudgeable = low.isUsable && high.isUsable && std::isfinite(value);
  if (low.isThere && high.isThere && !(low.value < high.value)) {
    judged.isJudgeable = judged.isJudgeable && low.value == high.value && !low.open && !high.open;
  }
  const bool aboveLow = !low.isThere || (low.open ? value > low.value : value >= low.value);
  const bool belowHigh = !high.isThere || (high.open ? value < high.value : value <= high.value);
  judged.isInside = aboveLow && belowHigh;
  return judged;
}

// PASS if and only if there is at least one result, every limited one is finite, inside its bounds and in their unit,
// there was no error and the run was completed.
inline Verdict oracleVerdict(const std::vector<QZMeasuredResult>& results, bool hasError, bool completed) {
  if (hasError || !completed || results.empty()) return Verdict::kError;
  const auto all = [&results](auto&& holds) {
    return std::all_of(results.begin(), results.end(), [&holds](const QZMeasuredResult& result) {
      const OracleResult judged = oracleResult(result);
      return !judged.isLimited || holds(judged);
    });
  };
  if (!all([](const OracleResult& one) { return one.isJudgeable; })) return Verdict::kError;
  return all([](const OracleResult& one) { return one.isInside; }) ? Verdict::kPass : Verdict::kFail;
}

}  // namespace quazor
