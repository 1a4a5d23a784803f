#include "host/store/summaries.h"

#include "contract/message_format.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <utility>

namespace quazor {

namespace {

// Both were added in different orders, which rounding shows.
bool isNear(double a, double b, double scale) { return std::abs(a - b) <= 1e-9 * std::max(1.0, scale); }

bool isSame(const Summary& a, const Summary& b) {
  const double size = std::max(std::abs(a.values.low()), std::abs(a.values.high()));
  return a.runs == b.runs && a.values.count() == b.values.count() && a.fractional == b.fractional &&
         a.passed == b.passed && a.failed == b.failed && a.values.low() == b.values.low() &&
         a.values.high() == b.values.high() && isNear(a.values.mean(), b.values.mean(), size) &&
         isNear(a.values.squares(), b.values.squares(), size * size * static_cast<double>(a.values.count()));
}

std::string nameOf(const StoredCharacteristic& one, const DaySummary& at) {
  return formatMessage("%@ %@ (characteristic %@) on %@, station '%@'", one.of.diagnostic, one.of.name, one.id, at.day,
                       at.station);
}

using ByDay = std::map<std::pair<std::string, std::string>, DaySummary>;

ByDay byDay(std::vector<DaySummary> summaries) {
  ByDay days;
  for (DaySummary& one : summaries) days.emplace(std::pair(one.day, one.station), std::move(one));
  return days;
}

}  // namespace

void Summary::add(std::optional<double> value, std::string_view verdict) {
  passed += verdict == "pass" ? 1 : 0;
  failed += verdict == "fail" ? 1 : 0;
  if (!value) return;
  values.add(*value);
  fractional += *value == std::trunc(*value) ? 0 : 1;
}

void Summary::merge(const Summary& other) {
  values.merge(other.values);
  runs += other.runs;
  fractional += other.fractional;
  passed += other.passed;
  failed += other.failed;
}

Summary nextSummary(Statement& row) {
  const auto count = [&row] { return static_cast<std::uint64_t>(row.integer()); };
  Summary summary;
  summary.runs = count();
  const std::uint64_t n = count();
  const double mean = row.real();
  const double squares = row.real();
  const double low = row.real();
  summary.values = Moments(n, mean, squares, low, row.real());
  summary.fractional = count();
  summary.passed = count();
  summary.failed = count();
  return summary;
}

Statement& bindDayAndStation(Statement& statement, const Filter& filter) {
  statement.bind(filter.since).bind(filter.until).bind(filter.until);
  return statement.bind(std::int64_t{filter.station.has_value()}).bind(filter.station.value_or(""));
}

std::vector<StoredCharacteristic> characteristicsOf(Database& store, const Filter& filter) {
  Statement rows(store,
                 "SELECT id, diagnostic, name, unit, lower, lower_open, upper, upper_open, limits FROM characteristic "
                 "ORDER BY diagnostic, name, id");
  std::vector<StoredCharacteristic> found;
  while (rows.step()) {
    StoredCharacteristic one;
    one.id = rows.integer();
    one.of.diagnostic = rows.text();
    one.of.name = rows.text();
    one.of.unit = rows.text();
    one.of.lower = rows.optionalReal();
    one.of.lowerOpen = rows.integer() != 0;
    one.of.upper = rows.optionalReal();
    one.of.upperOpen = rows.integer() != 0;
    one.of.limits = rows.text();
    if (!filter.diagnostic.empty() && !matchesName(filter.diagnostic, one.of.diagnostic)) continue;
    if (!filter.result.empty() && !matchesName(filter.result, one.of.name)) continue;
    found.push_back(std::move(one));
  }
  return found;
}

std::vector<DaySummary> summariesOf(Database& store, std::int64_t characteristic, const Filter& filter) {
  if (filter.serial) return summariesOfResults(store, characteristic, filter);
  Statement rows(store, std::string("SELECT day, station, ") + kSummaryColumns +
                            " FROM summary WHERE characteristic = ? AND " + kOfDayAndStation +
                            " ORDER BY day, station");
  bindDayAndStation(rows.bind(characteristic), filter);
  std::vector<DaySummary> days;
  while (rows.step()) {
    DaySummary one{rows.text(), {}, {}};
    one.station = rows.text();
    one.summary = nextSummary(rows);
    days.push_back(std::move(one));
  }
  return days;
}

std::vector<DaySummary> summariesOfResults(Database& store, std::int64_t characteristic, const Filter& filter) {
  // Without CROSS, SQLite would look through the results of all serial numbers.
  Statement rows(store, std::string("SELECT day, station, run.id, value, result.verdict FROM ") +
                            (filter.serial ? "run CROSS JOIN result" : "result CROSS JOIN run") +
                            " ON result.characteristic = ? AND result.run = run.id WHERE " + kOfDayAndStation +
                            (filter.serial ? " AND serial = ? AND serial <> ''" : "") +
                            " ORDER BY day, station, run.id");
  bindDayAndStation(rows.bind(characteristic), filter);
  if (filter.serial) rows.bind(*filter.serial);
  std::vector<DaySummary> days;
  std::int64_t lastRun = 0;
  while (rows.step()) {
    std::string day = rows.text();
    std::string station = rows.text();
    if (days.empty() || days.back().day != day || days.back().station != station) {
      days.push_back({std::move(day), std::move(station), {}});
    }
    const std::int64_t run = rows.integer();
    const std::optional<double> value = rows.optionalReal();
    days.back().summary.add(value, rows.text());
    if (value && run != std::exchange(lastRun, run)) ++days.back().summary.runs;
  }
  return days;
}

std::vector<std::string> problemsOfSummaries(Database& store) {
  std::vector<std::string> problems;
  for (const StoredCharacteristic& one : characteristicsOf(store, {})) {
    const ByDay kept = byDay(summariesOf(store, one.id, {}));
    const ByDay rebuilt = byDay(summariesOfResults(store, one.id, {}));
    for (const auto& [at, summary] : rebuilt) {
      const auto found = kept.find(at);
      if (found == kept.end()) {
        problems.push_back("the summary lacks " + nameOf(one, summary));
      } else if (!isSame(found->second.summary, summary.summary)) {
        problems.push_back("the summary differs from the results: " + nameOf(one, summary));
      }
    }
    for (const auto& [at, summary] : kept) {
      if (!rebuilt.contains(at))
        problems.push_back("the summary has results that are missing: " + nameOf(one, summary));
    }
  }
  return problems;
}

}  // namespace quazor
