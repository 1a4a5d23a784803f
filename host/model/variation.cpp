#include "host/model/variation.h"

#include "host/model/limit_check.h"
#include "host/model/trials.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <map>
#include <tuple>
#include <utility>

namespace quazor {

namespace {

struct RepeatedValue {
  double value = 0;
  std::uint64_t repetition = 0;
  std::uint64_t seed = 0;
};

// All values of one result.
struct Series {
  std::string name;
  std::string unit;
  std::vector<RepeatedValue> values;
  std::optional<QZLimit> limit;
  std::vector<UserLimit> userLimits;
};

// The series of one diagnostic. A name that occurs again in an entry, or another unit, is another series.
// Thread: one at a time.
class SeriesOfDiagnostic {
 public:
  void add(const DiagnosticRecord& record) {
    std::map<std::string, std::size_t> seen;
    if (record.experimentOnly) {
      for (const auto& [name, measurement] : record.measurements) seriesFor(seen, name, measurement, record);
    }
    for (const JudgedResult& one : record.measuredResults) {
      Series& series = seriesFor(seen, one.result.name(), one.result.measurement(), record);
      if (!series.limit) series.limit = one.result.limit();
      series.userLimits = limitsFitting(one.result.name(), record.limits);
    }
  }

  const std::vector<Series>& all() const { return series_; }

 private:
  using Key = std::tuple<std::string, std::size_t, std::string>;

  // The series of the measurement, which is added to it.
  Series& seriesFor(std::map<std::string, std::size_t>& seen, const std::string& name, const Measurement& measurement,
                    const DiagnosticRecord& record) {
    const std::string& unit = measurement.unit().symbol();
    const auto [place, isNew] = places_.emplace(Key{name, seen[name]++, unit}, series_.size());
    if (isNew) series_.push_back({name, unit, {}, std::nullopt, {}});
    Series& series = series_[place->second];
    series.values.push_back({measurement.value(), record.trial.repetition, record.seed});
    return series;
  }

  std::map<Key, std::size_t> places_;
  std::vector<Series> series_;
};

bool isSame(double one, double other) { return one == other || (std::isnan(one) && std::isnan(other)); }

bool varies(const Series& series) {
  return std::any_of(series.values.begin(), series.values.end(),
                     [&series](const RepeatedValue& one) { return !isSame(one.value, series.values.front().value); });
}

bool isLess(double one, double other) {  // a value that is not a number is greatest
  return std::isnan(one) || std::isnan(other) ? !std::isnan(one) : one < other;
}

// How often each value occurs.
using Counts = std::map<double, std::size_t, decltype(&isLess)>;

Counts countsOf(const std::vector<RepeatedValue>& values) {
  Counts counts(&isLess);
  for (const RepeatedValue& one : values) ++counts[one.value];
  return counts;
}

// The most frequent value, the first one of several, if at least half of the values are that.
std::optional<double> frequentValueOf(const std::vector<RepeatedValue>& values, const Counts& counts) {
  const auto found = std::find_if(values.begin(), values.end(),
                                  [&](const RepeatedValue& one) { return counts.at(one.value) * 2 >= values.size(); });
  return found == values.end() ? std::nullopt : std::optional(found->value);
}

// Null if no value is rare.
const RepeatedValue* outlierOf(const std::vector<RepeatedValue>& values, double median) {
  const Counts counts = countsOf(values);
  const double usual = frequentValueOf(values, counts).value_or(median);
  const auto distanceOf = [usual](const RepeatedValue& one) {
    if (isSame(one.value, usual)) return 0.0;
    return std::isfinite(one.value) && std::isfinite(usual) ? std::abs(one.value / 2 - usual / 2)  // cannot overflow
                                                            : std::numeric_limits<double>::infinity();
  };
  const RepeatedValue* outlier = nullptr;
  for (const RepeatedValue& one : values) {
    const bool isRare = counts.at(one.value) * 4 <= values.size();
    if (isRare && (outlier == nullptr || distanceOf(one) > distanceOf(*outlier))) outlier = &one;
  }
  return outlier;
}

// Of the finite values; there may be none.
void summarizeFinite(const std::vector<RepeatedValue>& values, VaryingResult& result) {
  std::vector<RepeatedValue> finite;
  std::copy_if(values.begin(), values.end(), std::back_inserter(finite),
               [](const RepeatedValue& one) { return std::isfinite(one.value); });
  if (finite.empty()) return;
  std::stable_sort(finite.begin(), finite.end(),
                   [](const RepeatedValue& a, const RepeatedValue& b) { return a.value < b.value; });
  const std::size_t middle = finite.size() / 2;
  const bool isOdd = finite.size() % 2 == 1;
  result.minimum = finite.front().value;
  result.minimumRepetition = finite.front().repetition;
  result.maximum = finite.back().value;
  const auto first = std::find_if(finite.begin(), finite.end(),
                                  [&result](const RepeatedValue& one) { return one.value == result.maximum; });
  result.maximumRepetition = first->repetition;
  // The sum of two values may overflow.
  result.median = isOdd ? finite[middle].value : finite[middle - 1].value / 2 + finite[middle].value / 2;
}

VaryingResult summaryOf(const Series& series) {
  constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
  VaryingResult result{series.name, series.unit,  series.values.size(), kNone, kNone, kNone, 0, 0, 0,
                       0,           series.limit, series.userLimits};
  summarizeFinite(series.values, result);
  if (const RepeatedValue* const outlier = outlierOf(series.values, result.median)) {
    result.outlierRepetition = outlier->repetition;
    result.outlierSeed = outlier->seed;
  }
  return result;
}

void count(VerdictCounts& counts, const DiagnosticRecord& record) {
  switch (record.verdict) {
    case Verdict::kPass: ++(isFlaky(record) ? counts.flaky : counts.passed); return;
    case Verdict::kFail: ++counts.failed; return;
    case Verdict::kError: ++counts.errors; return;
    case Verdict::kSkip: break;
  }
  ++counts.skipped;
}

}  // namespace

VerdictCounts verdictCountsOf(const std::vector<DiagnosticRecord>& records, std::optional<std::uint64_t> repetition) {
  VerdictCounts counts;
  for (std::size_t i = 0; i < records.size(); ++i) {
    if (repetition && records[i].trial.repetition != *repetition) continue;
    if (!hasLaterAttempt(records, i)) count(counts, records[i]);
  }
  return counts;
}

std::vector<DiagnosticVariation> variationOf(const std::vector<DiagnosticRecord>& records) {
  std::vector<DiagnosticVariation> variations;
  std::vector<SeriesOfDiagnostic> series;
  std::map<std::string, std::size_t> places;
  for (std::size_t i = 0; i < records.size(); ++i) {
    const DiagnosticRecord& record = records[i];
    if (record.trial.repetition == 0) continue;
    const auto [place, isNew] = places.emplace(record.name, variations.size());
    if (isNew) {
      variations.push_back({record.name, {}, {}, 0});
      series.emplace_back();
    }
    if (!hasLaterAttempt(records, i)) count(variations[place->second].verdicts, record);
    if (record.error == nullptr) series[place->second].add(record);
  }
  for (std::size_t i = 0; i < variations.size(); ++i) {
    for (const Series& one : series[i].all()) {
      if (varies(one)) {
        variations[i].varying.push_back(summaryOf(one));
      } else {
        ++variations[i].constant;
      }
    }
  }
  return variations;
}

}  // namespace quazor
