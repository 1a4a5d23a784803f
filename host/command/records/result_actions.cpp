// failures, drift, capability and gauge.
#include "contract/message_format.h"
#include "host/command/records/records_command.h"
#include "host/statistics/capability.h"
#include "host/statistics/control_rules.h"
#include "host/statistics/gauge.h"
#include "host/statistics/proportion.h"
#include "host/statistics/trend.h"
#include "host/store/questions.h"
#include "host/store/summaries.h"
#include "host/text/table.h"

#include <algorithm>
#include <iterator>
#include <map>

namespace quazor {

namespace {

Summary totalOf(const std::vector<DaySummary>& days) {
  Summary total;
  for (const DaySummary& one : days) total.merge(one.summary);
  return total;
}

// The days of one result with one limit at one station.
struct Series {
  const StoredCharacteristic* of;
  std::string station;
  std::vector<DaySummary> days{};
  std::vector<BrokenRule> broken{};
  std::optional<ControlChart> chart{};
  std::optional<Trend> trend{};
};

std::vector<Series> seriesOf(Database& store, const std::vector<StoredCharacteristic>& all, const Filter& filter) {
  std::vector<Series> series;
  for (const StoredCharacteristic& one : all) {
    std::map<std::string, Series> stations;
    for (DaySummary& day : summariesOf(store, one.id, filter)) {
      if (day.summary.values.count() == 0) continue;
      stations.try_emplace(day.station, Series{&one, day.station}).first->second.days.push_back(std::move(day));
    }
    for (auto& [station, found] : stations) {
      std::vector<Moments> values;
      for (const DaySummary& day : found.days) values.push_back(day.summary.values);
      found.chart = controlChart(values);
      if (found.chart) {
        found.broken = brokenRules(found.chart->distances);
        std::vector<double> means;
        for (const Moments& day : values) means.push_back(day.mean());
        found.trend = trendOf(means);
      }
      series.push_back(std::move(found));
    }
  }
  return series;
}

std::string signalsOf(const Series& series) {
  std::string text;
  for (const BrokenRule& one : series.broken) {
    text += formatMessage("%@rule %@ on %@", text.empty() ? "" : ", ", one.rule, series.days[one.point].day);
  }
  return text;
}

AnswerTable daysTable(const Series& series) {
  AnswerTable table{"days", {"day", "station", "values", "mean", "deviation", "low", "high", "distance"}};
  for (std::size_t i = 0; i < series.days.size(); ++i) {
    const DaySummary& day = series.days[i];
    const Moments& values = day.summary.values;
    table.rows.push_back({day.day, day.station, countCell(values.count()), values.mean(), values.deviation(),
                          values.low(), values.high(),
                          series.chart ? AnswerCell(series.chart->distances[i]) : AnswerCell()});
  }
  return table;
}

}  // namespace

std::string limitText(const Characteristic& of) {
  if (!of.lower && !of.upper) return {};
  return (of.lower ? (of.lowerOpen ? "(" : "[") + defaultText(*of.lower) : "(") + ", " +
         (of.upper ? defaultText(*of.upper) + (of.upperOpen ? ")" : "]") : ")");
}

Answer failuresAnswer(Database& store, const Filter& filter) {
  AnswerTable table{"failures", {"failed", "judged", "rate", "low", "high", "share", "diagnostic", "result", "limit"}};
  std::vector<std::pair<StoredCharacteristic, Summary>> failed;
  std::uint64_t all = 0;
  for (StoredCharacteristic& one : characteristicsOf(store, filter)) {
    const Summary total = totalOf(summariesOf(store, one.id, filter));
    all += total.failed;
    if (total.failed > 0) failed.emplace_back(std::move(one), total);
  }
  std::stable_sort(failed.begin(), failed.end(),
                   [](const auto& a, const auto& b) { return a.second.failed > b.second.failed; });
  std::uint64_t soFar = 0;
  for (const auto& [one, total] : failed) {
    const std::uint64_t judged = total.passed + total.failed;
    const Interval interval = wilsonInterval(total.failed, judged);
    soFar += total.failed;
    table.rows.push_back({countCell(total.failed), countCell(judged),
                          static_cast<double>(total.failed) / static_cast<double>(judged), interval.low, interval.high,
                          static_cast<double>(soFar) / static_cast<double>(all), one.of.diagnostic, one.of.name,
                          limitText(one.of)});
  }
  AnswerTable errors{"errors", {"runs", "diagnostic", "domain", "code", "message"}};
  if (filter.result.empty()) {
    for (const ErrorCount& one : errorsOf(store, filter)) {
      errors.rows.push_back({countCell(one.runs), one.diagnostic, one.domain, one.code, one.message});
    }
  }
  Answer answer;
  if (table.rows.empty()) answer.before.emplace_back("No result failed its limit.");
  if (!table.rows.empty()) {
    answer.after.emplace_back(
        "Low and high are the 95 % interval of the rate; share is that of all failures, with the rows above.");
  }
  if (!errors.rows.empty()) answer.after.emplace_back("Errors are neither passes nor failures: no rate counts them.");
  answer.tables = {std::move(table), std::move(errors)};
  return answer;
}

Answer driftAnswer(Database& store, const Filter& filter) {
  const std::vector<StoredCharacteristic> all = characteristicsOf(store, filter);
  std::vector<Series> series = seriesOf(store, all, filter);
  Answer answer;
  if (series.size() == 1) {
    const Series& only = series.front();
    answer.before.push_back(formatMessage("%@ %@ %@, in %@", only.of->of.diagnostic, only.of->of.name,
                                          limitText(only.of->of),
                                          only.of->of.unit.empty() ? "no unit" : only.of->of.unit));
    for (const BrokenRule& one : only.broken) {
      answer.after.push_back(formatMessage("Not stable: %@ (rule %@, first on %@).", textOfRule(one.rule), one.rule,
                                           only.days[one.point].day));
    }
    if (!only.chart) answer.after.emplace_back("One day, or values without spread, show no drift.");
    if (only.chart && only.broken.empty()) answer.after.emplace_back("Stable: no rule of control charts is broken.");
    answer.tables.push_back(daysTable(only));
    return answer;
  }
  const std::size_t found = series.size();
  std::erase_if(series, [](const Series& one) { return !one.chart; });
  // Of many charts, some have a trend by chance.
  const double limit = chanceLimit(series.size());
  const auto drifts = [limit](const Series& one) { return one.trend && one.trend->chance < limit; };
  std::stable_sort(series.begin(), series.end(), [&](const Series& a, const Series& b) {
    return std::pair(drifts(a), a.broken.size()) > std::pair(drifts(b), b.broken.size());
  });
  AnswerTable table{"drift",
                    {"drifts", "chance", "signals", "diagnostic", "result", "limit", "station", "days", "mean",
                     "first_day", "last_day"}};
  for (const Series& one : series) {
    const std::string direction = !drifts(one) ? "" : one.trend->tau > 0 ? "up" : "down";
    table.rows.push_back({direction, one.trend ? AnswerCell(one.trend->chance) : AnswerCell(), signalsOf(one),
                          one.of->of.diagnostic, one.of->of.name, limitText(one.of->of), one.station,
                          countCell(one.days.size()), one.chart->centre, one.days.front().summary.values.mean(),
                          one.days.back().summary.values.mean()});
  }
  answer.tables.push_back(std::move(table));
  const auto broken =
      std::count_if(series.begin(), series.end(), [](const Series& one) { return !one.broken.empty(); });
  answer.after.push_back(
      series.empty()
          ? "No result of the store has values of several days."
          : formatMessage("%@ of %@ charts drift: their days go up or down by more than chance explains. %@ break a "
                          "rule of control charts.",
                          std::count_if(series.begin(), series.end(), drifts), series.size(), broken));
  if (broken > 0) answer.after.emplace_back("--result, --diagnostic and --station show the days of one of them.");
  if (found > series.size()) {
    answer.after.push_back(countText(found - series.size(), "result") +
                           " of one day or without spread left out: they show no drift.");
  }
  return answer;
}

Answer capabilityAnswer(Database& store, const Filter& filter) {
  AnswerTable table{
      "capability",
      {"diagnostic", "result", "limit", "unit", "runs", "mean", "deviation", "within", "cpk", "ppk", "why_not"}};
  const bool showsAll = !filter.result.empty() || !filter.diagnostic.empty();
  std::size_t hidden = 0;
  for (const StoredCharacteristic& one : characteristicsOf(store, filter)) {
    std::vector<CapabilityGroup> groups;
    for (const DaySummary& day : summariesOf(store, one.id, filter)) {
      groups.push_back({day.station, day.day, day.summary.values, day.summary.runs, day.summary.fractional});
    }
    if (groups.empty()) continue;
    const Capability found = capabilityOf(groups, one.of.lower, one.of.upper);
    if (!found.refusal.empty() && !showsAll) {
      ++hidden;
      continue;
    }
    std::uint64_t runs = 0;
    for (const CapabilityGroup& group : groups) runs += group.runs;
    table.rows.push_back({one.of.diagnostic, one.of.name, limitText(one.of), one.of.unit, countCell(runs),
                          found.values.mean(), found.values.deviation(), found.within, cellOf(found.cpk),
                          cellOf(found.ppk), found.refusal});
  }
  Answer answer;
  if (!table.rows.empty()) {
    answer.after.emplace_back("Cpk is from the deviation within station and day, Ppk from that of all values.");
  }
  if (hidden > 0) {
    answer.after.push_back(countText(hidden, "result") +
                           " without a figure; --diagnostic or --result shows the reason of each.");
  }
  answer.tables.push_back(std::move(table));
  return answer;
}

Answer gaugeAnswer(Database& store, const Filter& filter) {
  AnswerTable table{"gauge",
                    {"diagnostic", "result", "limit", "phones", "stations", "repetitions", "repeatability",
                     "reproducibility", "gauge", "part_to_part", "share", "why_not"}};
  for (const StoredCharacteristic& one : characteristicsOf(store, filter)) {
    const GaugeResult found = gaugeStudy(readingsOf(store, one.id, filter));
    std::vector<AnswerCell> row{one.of.diagnostic, one.of.name, limitText(one.of)};
    if (found.study) {
      const GaugeStudy& study = *found.study;
      row.insert(row.end(), {countCell(study.parts), countCell(study.places), countCell(study.repetitions),
                             study.repeatability, study.reproducibility, study.gauge, study.partToPart, study.share});
    } else {
      row.resize(table.columns.size() - 1);
    }
    row.emplace_back(found.refusal);
    table.rows.push_back(std::move(row));
  }
  Answer answer;
  if (table.rows.empty()) answer.before.emplace_back("No result has such a name.");
  if (!table.rows.empty()) {
    answer.after.emplace_back(
        "Repeatability, reproducibility, gauge and part to part are variances; share is that of the gauge's deviation "
        "in "
        "the total one.");
  }
  answer.tables.push_back(std::move(table));
  return answer;
}

}  // namespace quazor
