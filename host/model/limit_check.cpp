#include "host/model/limit_check.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/diagnostic_record.h"
#include "host/model/trials.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <optional>
#include <sstream>

namespace quazor {

namespace {

bool holds(LimitOperator comparison, double value, double other, double tolerance) {
  switch (comparison) {
    case LimitOperator::kLess: return isInsideUpper(value, other, true);
    case LimitOperator::kLessOrEqual: return isInsideUpper(value, other, false);
    case LimitOperator::kGreater: return isInsideLower(value, other, true);
    case LimitOperator::kGreaterOrEqual: return isInsideLower(value, other, false);
    case LimitOperator::kEqual: break;
  }
  return isInsideLower(value, other - tolerance, false) && isInsideUpper(value, other + tolerance, false);
}

// Performs one comparison, with one overload per kind of condition. They return why it is impossible, or nothing.
class Comparison {
 public:
  Comparison(LimitCheck& check, const std::vector<JudgedResult>& results)
      : check_(check), measured_(check.result.measurement()), results_(results) {}

  std::string operator()(const NumberCondition& condition) {
    if (std::string problem = validate(condition.unit); !problem.empty()) return problem;
    check_.passed = holds(condition.comparison, measured_.value(), condition.number, condition.tolerance);
    return {};
  }

  std::string operator()(const IntervalCondition& condition) {
    if (std::string problem = validate(condition.unit); !problem.empty()) return problem;
    const double value = measured_.value();
    check_.passed = isInsideLower(value, condition.lower, condition.lowerOpen) &&
                    isInsideUpper(value, condition.upper, condition.upperOpen);
    return {};
  }

  std::string operator()(const RelationCondition& condition) {
    const JudgedResult* other = nullptr;
    for (const JudgedResult& one : results_) {
      if (one.result.name() != condition.other) continue;
      if (other != nullptr) return formatMessage("several results have the name '%@'", condition.other);
      other = &one;
    }
    if (other == nullptr) return formatMessage("there is no result '%@'", condition.other);
    const Measurement& measured = other->result.measurement();
    if (std::string problem = validate(measured.unit().symbol()); !problem.empty()) return problem;
    if (!std::isfinite(measured.value())) {
      return formatMessage("the value of %@ is %@", condition.other, measured.value());
    }
    check_.passed = holds(condition.comparison, measured_.value(), measured.value(), condition.tolerance);
    return {};
  }

 private:
  std::string validate(const std::optional<std::string>& unit) const {
    if (unit && *unit != measured_.unit().symbol()) {
      return formatMessage("the limit is in '%@' but the value is in '%@'", *unit, measured_.unit().symbol());
    }
    if (!std::isfinite(measured_.value())) return formatMessage("the value is %@", measured_.value());
    return {};
  }

  LimitCheck& check_;
  const Measurement measured_;
  const std::vector<JudgedResult>& results_;
};

LimitCheck compared(const UserLimit& limit, std::size_t index, const std::vector<JudgedResult>& results) {
  const QZMeasuredResult& result = results[index].result;
  LimitCheck check{limit, result, index};
  const std::string why = std::visit(Comparison(check, results), limit.condition);
  if (why.empty()) return check;
  check.skipped = results[index].verdict == ResultVerdict::kError;
  check.problem =
      check.skipped
          ? formatMessage("the result %@ was not compared with the limit '%@': it cannot be judged by its own limit",
                          result.name(), canonicalText(limit))
          : formatMessage("the result %@ cannot be compared with the limit '%@': %@", result.name(),
                          canonicalText(limit), why);
  return check;
}

bool fitsAny(const UserLimit& limit, const DiagnosticRecord& record) {
  return std::any_of(record.measuredResults.begin(), record.measuredResults.end(),
                     [&limit](const JudgedResult& one) { return matchesName(limit.result, one.result.name()); });
}

}  // namespace

ResultVerdict LimitCheck::verdict() const {
  if (passed || !counts()) return ResultVerdict::kPass;
  return problem.empty() ? ResultVerdict::kFail : ResultVerdict::kError;
}

std::string_view LimitCheck::verdictName() const {
  if (!passed && skipped) return nameOf(Verdict::kSkip);
  return warns() ? nameOf(LimitSeverity::kWarn) : nameOf(verdict());
}

bool appliesTo(const UserLimit& limit, const std::string& diagnostic) {
  return limit.diagnostic.empty() || matchesName(limit.diagnostic, diagnostic);
}

std::vector<UserLimit> limitsFor(const std::string& diagnostic, const std::vector<UserLimit>& limits) {
  std::vector<UserLimit> wanted;
  std::copy_if(limits.begin(), limits.end(), std::back_inserter(wanted),
               [&diagnostic](const UserLimit& limit) { return appliesTo(limit, diagnostic); });
  return wanted;
}

std::vector<UserLimit> limitsFitting(const std::string& result, const std::vector<UserLimit>& limits) {
  std::vector<UserLimit> fitting;
  std::copy_if(limits.begin(), limits.end(), std::back_inserter(fitting),
               [&result](const UserLimit& limit) { return matchesName(limit.result, result); });
  return fitting;
}

std::vector<LimitCheck> limitChecksOf(const DiagnosticRecord& record) {
  std::vector<LimitCheck> checks;
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    for (const UserLimit& limit : limitsFitting(record.measuredResults[i].result.name(), record.limits)) {
      checks.push_back(compared(limit, i, record.measuredResults));
    }
  }
  return checks;
}

bool hasFailedResult(const DiagnosticRecord& record) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  return std::any_of(record.measuredResults.begin(), record.measuredResults.end(),
                     [](const JudgedResult& one) { return one.verdict == ResultVerdict::kFail; }) ||
         std::any_of(checks.begin(), checks.end(),
                     [](const LimitCheck& check) { return check.verdict() == ResultVerdict::kFail; });
}

ResultVerdict verdictOf(const JudgedResult& one, const std::vector<LimitCheck>& checksOfIt) {
  ResultVerdict verdict = one.verdict;
  for (const LimitCheck& check : checksOfIt) {
    const ResultVerdict added = check.verdict();
    const bool isStricter = verdict == ResultVerdict::kNone || added == ResultVerdict::kError ||
                            (added == ResultVerdict::kFail && verdict == ResultVerdict::kPass);
    if (isStricter) verdict = added;
  }
  return verdict;
}

std::vector<LimitCheck> checksOfResult(const std::vector<LimitCheck>& checks, std::size_t index) {
  std::vector<LimitCheck> wanted;
  std::copy_if(checks.begin(), checks.end(), std::back_inserter(wanted),
               [index](const LimitCheck& check) { return check.index == index; });
  return wanted;
}

bool areOnSameResults(const UserLimit& one, const UserLimit& other, const std::vector<DiagnosticRecord>& records) {
  if (one.diagnostic == other.diagnostic && one.result == other.result) return true;
  bool areSome = false;
  for (const DiagnosticRecord& record : records) {
    for (const JudgedResult& judged : record.measuredResults) {
      const auto fits = [&record, &judged](const UserLimit& limit) {
        return appliesTo(limit, record.name) && matchesName(limit.result, judged.result.name());
      };
      if (fits(one) != fits(other)) return false;
      areSome = areSome || fits(one);
    }
  }
  return areSome;
}

std::size_t warningsIn(const std::vector<LimitCheck>& checks) {
  return static_cast<std::size_t>(
      std::count_if(checks.begin(), checks.end(), [](const LimitCheck& one) { return one.warns(); }));
}

void addBounds(const std::optional<QZLimit>& limit, std::vector<double>& thresholds) {
  if (!limit) return;
  for (const auto& bound : {limit->lowerBound(), limit->upperBound()}) {
    if (bound != nullptr) thresholds.push_back(bound->value().value());
  }
}

std::optional<QZLimit> boundsOf(const LimitCheck& check) {
  if (std::holds_alternative<RelationCondition>(check.limit.condition)) return std::nullopt;
  QZLimit bounds(labelOf(check.limit));
  const QZUnit& unit = check.result.measurement().unit();
  const auto bound = [&unit](double value, bool open) {
    // A tolerance may reach beyond the largest double; nothing lies there.
    return std::isfinite(value) ? std::make_shared<const QZBound>(Measurement(value, unit), open) : nullptr;
  };
  if (const auto* const interval = std::get_if<IntervalCondition>(&check.limit.condition)) {
    bounds.setLowerBound(bound(interval->lower, interval->lowerOpen));
    bounds.setUpperBound(bound(interval->upper, interval->upperOpen));
    return bounds;
  }
  const auto& condition = std::get<NumberCondition>(check.limit.condition);
  switch (condition.comparison) {
    case LimitOperator::kLess: bounds.setUpperBound(bound(condition.number, true)); break;
    case LimitOperator::kLessOrEqual: bounds.setUpperBound(bound(condition.number, false)); break;
    case LimitOperator::kGreater: bounds.setLowerBound(bound(condition.number, true)); break;
    case LimitOperator::kGreaterOrEqual: bounds.setLowerBound(bound(condition.number, false)); break;
    case LimitOperator::kEqual:
      bounds.setLowerBound(bound(condition.number - condition.tolerance, false));
      bounds.setUpperBound(bound(condition.number + condition.tolerance, false));
      break;
  }
  return bounds;
}

std::vector<UserLimit> limitsWithoutResult(const std::vector<UserLimit>& limits,
                                           const std::vector<DiagnosticRecord>& records) {
  std::vector<UserLimit> without;
  for (const UserLimit& limit : limits) {
    bool isMeant = false;
    bool wasSkipped = false;
    bool wasMissed = false;  // by a diagnostic that has results
    bool isDecided = false;  // it fits, or the run does not pass anyway
    for (std::size_t i = 0; i < records.size(); ++i) {
      const DiagnosticRecord& record = records[i];
      if (!appliesTo(limit, record.name) || isOfLimit(record) || isSuperseded(records, i)) continue;
      isMeant = true;
      if (record.skip) {
        wasSkipped = true;
        isDecided = isDecided || record.skip->kind == SkipKind::kNotReached;  // after a failure or an error
      } else {
        wasMissed = true;
        isDecided = isDecided || record.error != nullptr || fitsAny(limit, record);
      }
    }
    if (isDecided || (limit.onlyIfSelected && wasSkipped && !wasMissed)) continue;
    if (isMeant || !limit.onlyIfSelected) without.push_back(limit);
  }
  return without;
}

bool isOfLimit(const DiagnosticRecord& record) {
  return record.experimentName.empty() && isHostError(record.error, HostErrorCode::kLimitWithoutResult);
}

namespace {

std::vector<std::string> partsOf(const std::string& name) {
  std::vector<std::string> parts;
  std::istringstream text(name);
  for (std::string part; std::getline(text, part, '.');) parts.push_back(part);
  return parts;
}

// The pattern with those parts between its dots that are no patterns replaced by those of the name, if they are near;
// nothing if it does not fit the name then.
std::optional<std::string> patternNear(const std::vector<std::string>& parts, const std::string& name) {
  const std::vector<std::string> ofName = partsOf(name);
  if (parts.size() != ofName.size()) return std::nullopt;
  std::string near;
  for (std::size_t i = 0; i < parts.size(); ++i) {
    const bool isKept = isPattern(parts[i]);
    if (!isKept && !nearestName(parts[i], {ofName[i]})) return std::nullopt;
    near += (i == 0 ? "" : ".") + (isKept ? parts[i] : ofName[i]);
  }
  return matchesName(near, name) ? std::optional(near) : std::nullopt;
}

}  // namespace

std::string unselectedText(const UserLimit& limit, const std::vector<std::string>& diagnostics) {
  return "no diagnostic was selected that has the name '" + limit.diagnostic + "'" +
         didYouMeanOrPattern(limit.diagnostic, diagnostics);
}

std::string didYouMeanResult(const std::string& asked, const std::vector<std::string>& names) {
  if (!isPattern(asked) && nearestName(asked, names)) return didYouMean(asked, names);
  const bool isLastPart = !isPattern(asked) && asked.find('.') == std::string::npos;
  const std::vector<std::string> parts = partsOf(isLastPart ? "*." + asked : asked);
  std::vector<std::string> near;
  for (const std::string& name : names) {
    if (const std::optional<std::string> one = patternNear(parts, name)) near.push_back(*one);
  }
  const auto nearest = std::min_element(near.begin(), near.end(), [&asked](const auto& one, const auto& other) {
    return editDistance(asked, one) < editDistance(asked, other);
  });
  return nearest == near.end() ? std::string() : "; did you mean '" + *nearest + "'?";
}

DiagnosticErrorPtr errorOfLimitWithoutResult(const UserLimit& limit, const std::vector<DiagnosticRecord>& records) {
  std::vector<std::string> names;
  std::vector<std::string> diagnostics;
  bool isOnlyForSkipped = true;
  for (const DiagnosticRecord& record : records) {
    diagnostics.push_back(record.name);
    if (!appliesTo(limit, record.name) || isOfLimit(record)) continue;
    isOnlyForSkipped = isOnlyForSkipped && record.skip;
    for (const JudgedResult& one : record.measuredResults) names.push_back(one.result.name());
  }
  const bool isMeant = std::any_of(diagnostics.begin(), diagnostics.end(),
                                   [&limit](const std::string& name) { return appliesTo(limit, name); });
  std::string why = !isMeant ? unselectedText(limit, diagnostics)
                    : isOnlyForSkipped
                        ? std::string("every diagnostic for which it is meant was skipped")
                        : "no result has the name '" + limit.result + "'" + didYouMeanResult(limit.result, names);
  return hostError(
      HostErrorCode::kLimitWithoutResult,
      formatMessage("the limit '%@' (%@) was compared with nothing: %@", canonicalText(limit), limit.source, why));
}

}  // namespace quazor
