// list, show, yield and flaky.
#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/command/records/records_command.h"
#include "host/statistics/proportion.h"
#include "host/store/questions.h"
#include "host/text/table.h"

namespace quazor {

namespace {

std::string outcomeOf(const RunLine& run) { return run.whole ? run.verdict : "not whole"; }

std::vector<AnswerCell> yieldRow(const Yield& yield, const std::string& station, AnswerCell chance) {
  const std::uint64_t judged = yield.passed + yield.failed;
  const Interval interval = wilsonInterval(yield.passed, judged);
  const auto ofJudged = [judged](double rate) { return judged == 0 ? AnswerCell() : AnswerCell(rate); };
  const double rate = judged == 0 ? 0 : static_cast<double>(yield.passed) / static_cast<double>(judged);
  return {station,
          countCell(yield.passed),
          countCell(yield.failed),
          countCell(yield.neither),
          ofJudged(rate),
          ofJudged(interval.low),
          ofJudged(interval.high),
          std::move(chance),
          countCell(yield.runs),
          countCell(yield.unnamed)};
}

}  // namespace

Answer listAnswer(Database& store, const Filter& filter) {
  AnswerTable table{"runs", {"number", "date", "verdict", "kind", "station", "serial", "host", "run", "file"}};
  for (const RunLine& run : runsOf(store, filter)) {
    table.rows.push_back(
        {run.number, run.date, outcomeOf(run), run.kind, run.station, run.serial, run.host, run.run, run.file});
  }
  const std::string total = countText(table.rows.size(), "run");
  return {{}, {std::move(table)}, {total}};
}

Answer showAnswer(Database& store, const std::string& name) {
  const RunDetails run = runNamed(store, name);
  AnswerTable facts{"run", {"fact", "value"}};
  const auto add = [&facts](const char* fact, const std::string& value) { facts.rows.push_back({fact, value}); };
  add("number", std::to_string(run.line.number));
  add("run", run.line.run);
  add("date", run.line.date);
  add("verdict", outcomeOf(run.line));
  add("kind", run.line.kind);
  add("counted in rates", run.line.counted ? "yes" : "no");
  add("host", run.line.host);
  add("phone", run.line.phone);
  add("record", run.line.file);
  for (const auto& [key, value] : run.tags) facts.rows.push_back({"tag " + key, value});
  AnswerTable entries{"diagnostics", {"diagnostic", "verdict", "attempt", "repetition", "domain", "code", "message"}};
  for (const EntryRow& one : run.entries) {
    entries.rows.push_back({one.diagnostic, one.verdict, one.attempt > 0 ? AnswerCell(one.attempt) : AnswerCell(),
                            one.repetition > 0 ? AnswerCell(one.repetition) : AnswerCell(), one.domain,
                            one.code ? AnswerCell(*one.code) : AnswerCell(), one.message});
  }
  AnswerTable results{"results", {"diagnostic", "result", "value", "unit", "limit", "verdict"}};
  for (const ResultRow& one : run.results) {
    results.rows.push_back(
        {one.of.diagnostic, one.of.name, cellOf(one.value), one.of.unit, limitText(one.of), one.verdict});
  }
  return {{}, {std::move(facts), std::move(entries), std::move(results)}, {}};
}

Answer yieldAnswer(Database& store, const Filter& filter, const std::string& tag) {
  const Yields yields = yieldOf(store, filter, tag);
  const bool isByStation = tag == "station";
  AnswerTable table{"yield",
                    {isByStation ? "station" : "group", "passed", "failed", "neither", "first_pass_yield", "low",
                     "high", "chance", "runs", "no_serial"}};
  std::uint64_t passed = 0;
  std::uint64_t failed = 0;
  for (const Yield& one : yields.stations) {
    passed += one.passed;
    failed += one.failed;
  }
  const std::uint64_t judged = passed + failed;
  const double rate = judged == 0 ? 0 : static_cast<double>(failed) / static_cast<double>(judged);
  std::vector<std::string> low;
  for (const Yield& one : yields.stations) {
    const double chance = chanceOfAtLeast(one.failed, one.passed + one.failed, rate);
    if (chance < chanceLimit(yields.stations.size())) low.push_back(one.station.empty() ? "(none)" : one.station);
    table.rows.push_back(yieldRow(one, one.station, chance));
  }
  if (yields.stations.size() != 1) table.rows.push_back(yieldRow(yields.all, "(all)", {}));
  Answer answer{{}, {std::move(table)}, {}};
  answer.after.emplace_back(
      "Passed, failed and neither (an error, or skipped) are phones in their first run; low and high are the 95 % "
      "interval of the yield.");
  if (yields.stations.size() > 1) {
    answer.after.push_back((low.empty() ? "No yield is lower than chance explains."
                                        : "Lower than chance explains: " + listText(low) + ".") +
                           " Chance is how probable so many failures are if all are alike.");
  }
  if (yields.all.unnamed > 0) {
    answer.after.push_back(countText(yields.all.unnamed, "run") +
                           " without the tag serial=NUMBER: no yield counts what nobody can tell apart.");
  }
  if (yields.uncounted > 0) {
    answer.after.push_back(countText(yields.uncounted, "run") +
                           " left out: not come to the end, of experiments, or an analysis.");
  }
  return answer;
}

Answer flakyAnswer(Database& store, const Filter& filter) {
  AnswerTable table{"flaky",
                    {"serial", "diagnostic", "result", "limit", "passed", "failed", "failed_at", "first", "last"}};
  for (const FlakyPhone& one : flakyPhones(store, filter)) {
    table.rows.push_back({one.serial, one.of.diagnostic, one.of.name, limitText(one.of), countCell(one.passed),
                          countCell(one.failed), listText(one.stations), one.first, one.last});
  }
  Answer answer{{}, {}, {}};
  if (table.rows.empty()) {
    answer.before.emplace_back("No phone has passed and failed the same limit without a repair between.");
  } else {
    answer.after.emplace_back(
        "Each passed and failed the same limit. After a repair: quazor records mark --serial NUMBER --repaired");
  }
  answer.tables.push_back(std::move(table));
  return answer;
}

}  // namespace quazor
