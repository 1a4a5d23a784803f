#include "host/store/questions.h"

#include "contract/message_format.h"
#include "host/text/name_pattern.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <map>
#include <optional>
#include <set>

namespace quazor {

namespace {

const std::string kRunColumns =
    "id, run, date, kind, station, serial, host, phone, file, whole, counted, verdict FROM run ";

RunLine nextRun(Statement& row) {
  RunLine line;
  line.number = row.integer();
  for (std::string* const text :
       {&line.run, &line.date, &line.kind, &line.station, &line.serial, &line.host, &line.phone, &line.file}) {
    *text = row.text();
  }
  line.whole = row.integer() != 0;
  line.counted = row.integer() != 0;
  line.verdict = row.text();
  return line;
}

// Binds what a question about runs has: days, station and serial number.
const std::string kOfRuns = std::string(kOfDayAndStation) + " AND (? = 0 OR serial = ?)";
Statement& bindRuns(Statement& statement, const Filter& filter) {
  bindDayAndStation(statement, filter).bind(std::int64_t{filter.serial.has_value()});
  return statement.bind(filter.serial.value_or(""));
}

void count(Yield& yield, const std::string& verdict, std::uint64_t number) {
  (verdict == "pass" ? yield.passed : verdict == "fail" ? yield.failed : yield.neither) += number;
}

std::vector<EntryRow> entriesOf(Database& store, std::int64_t run) {
  Statement rows(store,
                 "SELECT diagnostic, verdict, attempt, repetition, domain, ifnull(code, 0), message FROM entry "
                 "WHERE run = ? ORDER BY number");
  rows.bind(run);
  std::vector<EntryRow> entries;
  while (rows.step()) {
    EntryRow& one = entries.emplace_back();
    one.diagnostic = rows.text();
    one.verdict = rows.text();
    one.attempt = rows.integer();
    one.repetition = rows.integer();
    one.domain = rows.text();
    const std::int64_t code = rows.integer();
    if (!one.domain.empty()) one.code = code;
    one.message = rows.text();
  }
  return entries;
}

std::vector<ResultRow> resultsOf(Database& store, std::int64_t run) {
  Statement rows(store,
                 "SELECT number, value, verdict FROM result WHERE characteristic = ? AND run = ? ORDER BY number");
  std::vector<ResultRow> results;
  for (const StoredCharacteristic& one : characteristicsOf(store, {})) {
    rows.bind(one.id).bind(run);
    while (rows.step()) {
      ResultRow& row = results.emplace_back(ResultRow{one.of, rows.integer(), std::nullopt, {}});
      row.value = rows.optionalReal();
      row.verdict = rows.text();
    }
    rows.reset();
  }
  return results;
}

// The results of one phone for one characteristic, in their order, and what became of them since the last repair.
// Thread: one at a time.
class Flips {
 public:
  explicit Flips(std::set<std::string> repairs) : repairs_(std::move(repairs)) {}

  // `date` is that of the run.
  void add(const std::string& date, const std::string& verdict, const std::string& station) {
    const auto isRepaired = [&](const std::string& repair) { return last_ < repair && repair <= date; };
    if (!last_.empty() && std::any_of(repairs_.begin(), repairs_.end(), isRepaired)) take();
    if (first_.empty()) first_ = date;
    last_ = date;
    passed_ += verdict == "pass" ? 1 : 0;
    if (verdict != "fail") return;
    ++failed_;
    stations_.insert(station);
  }

  // The last stretch between two repairs that had both verdicts.
  std::optional<FlakyPhone> found() {
    take();
    return found_;
  }

 private:
  void take() {
    if (passed_ > 0 && failed_ > 0) {
      found_ = FlakyPhone{{}, {}, passed_, failed_, {stations_.begin(), stations_.end()}, first_, last_};
    }
    passed_ = failed_ = 0;
    stations_.clear();
    first_.clear();
  }

  const std::set<std::string> repairs_;
  std::string first_;
  std::string last_;
  std::uint64_t passed_ = 0;
  std::uint64_t failed_ = 0;
  std::set<std::string> stations_;
  std::optional<FlakyPhone> found_;
};

std::set<std::string> repairsOf(Statement& repairs, const std::string& serial) {
  std::set<std::string> dates;
  repairs.bind(serial);
  while (repairs.step()) dates.insert(repairs.text());
  repairs.reset();
  return dates;
}

}  // namespace

std::vector<RunLine> runsOf(Database& store, const Filter& filter) {
  Statement rows(store, "SELECT " + kRunColumns + "WHERE " + kOfRuns + " ORDER BY date DESC, id DESC");
  bindRuns(rows, filter);
  std::vector<RunLine> runs;
  while (rows.step()) runs.push_back(nextRun(rows));
  return runs;
}

RunDetails runNamed(Database& store, const std::string& name) {
  Statement rows(store, "SELECT " + kRunColumns + "WHERE CAST(id AS TEXT) = ? OR substr(run, 1, ?) = ? LIMIT 2");
  rows.bind(name).bind(static_cast<std::int64_t>(name.size())).bind(name);
  if (!rows.step()) {
    throw CommandError(ExitCode::kUsage, "no run in the store has the number '" + name + "' or an ID that begins so");
  }
  RunDetails details{nextRun(rows), {}, {}, {}};
  if (rows.step()) {
    throw CommandError(ExitCode::kUsage, "several runs in the store have the number '" + name +
                                             "' or an ID that begins so; 'quazor records list' shows them");
  }
  Statement tags(store, "SELECT key, value FROM tag WHERE run = ? ORDER BY key");
  tags.bind(details.line.number);
  while (tags.step()) {
    std::string key = tags.text();
    details.tags.emplace_back(std::move(key), tags.text());
  }
  details.entries = entriesOf(store, details.line.number);
  details.results = resultsOf(store, details.line.number);
  return details;
}

Yields yieldOf(Database& store, const Filter& filter, const std::string& tag) {
  const bool isByStation = tag == "station";
  // The station stands in the run's row.
  const std::string group =
      isByStation ? "station" : "ifnull((SELECT value FROM tag WHERE tag.run = run.id AND tag.key = ?), '')";
  const auto bound = [&](Statement& statement) -> Statement& {
    if (!isByStation) statement.bind(tag);
    return bindRuns(statement, filter);
  };
  Yields yields;
  std::map<std::string, Yield> stations;
  Statement runs(
      store, "SELECT counted, " + group + ", count(*), sum(serial = '') FROM run WHERE " + kOfRuns + " GROUP BY 1, 2");
  bound(runs);
  while (runs.step()) {
    const bool isCounted = runs.integer() != 0;
    const std::string station = runs.text();
    const auto number = static_cast<std::uint64_t>(runs.integer());
    const auto unnamed = static_cast<std::uint64_t>(runs.integer());
    if (!isCounted) {
      yields.uncounted += number;
      continue;
    }
    for (Yield* const yield : {&stations[station], &yields.all}) {
      yield->runs += number;
      yield->unnamed += unnamed;
    }
  }
  // With min(), the other columns are those of the row that has it.
  const auto firsts = [&](const std::string& by, const auto& take) {
    Statement rows(store,
                   "SELECT place, verdict, count(*) FROM (SELECT " + group +
                       " AS place, station, verdict, day, serial, min(date) FROM run WHERE counted AND serial <> '' "
                       "GROUP BY " +
                       by + ") WHERE " + kOfRuns + " GROUP BY place, verdict");
    bound(rows);
    while (rows.step()) {
      const std::string station = rows.text();
      const std::string verdict = rows.text();
      take(station, verdict, static_cast<std::uint64_t>(rows.integer()));
    }
  };
  firsts("serial, place", [&](const std::string& station, const std::string& verdict, std::uint64_t number) {
    count(stations[station], verdict, number);
    if (filter.station) count(yields.all, verdict, number);
  });
  if (!filter.station) {
    firsts("serial", [&](const std::string&, const std::string& verdict, std::uint64_t number) {
      count(yields.all, verdict, number);
    });
  }
  for (auto& [station, yield] : stations) {
    yield.station = station;
    yields.stations.push_back(yield);
  }
  return yields;
}

std::vector<ErrorCount> errorsOf(Database& store, const Filter& filter) {
  Statement rows(
      store,
      "SELECT diagnostic, domain, ifnull(code, 0), count(DISTINCT run.id), message FROM entry CROSS JOIN run "
      "ON run.id = entry.run WHERE entry.verdict = 'error' AND whole AND " +
          kOfRuns + " GROUP BY diagnostic, domain, code ORDER BY 4 DESC, diagnostic, domain, code");
  bindRuns(rows, filter);
  std::vector<ErrorCount> errors;
  while (rows.step()) {
    ErrorCount one{rows.text(), {}, 0, 0, {}};
    one.domain = rows.text();
    one.code = rows.integer();
    one.runs = static_cast<std::uint64_t>(rows.integer());
    one.message = rows.text();
    if (filter.diagnostic.empty() || matchesName(filter.diagnostic, one.diagnostic)) errors.push_back(std::move(one));
  }
  return errors;
}

std::vector<FlakyPhone> flakyPhones(Database& store, const Filter& filter) {
  Statement failed(store,
                   "SELECT DISTINCT serial FROM result INDEXED BY result_failed CROSS JOIN run ON run.id = result.run "
                   "WHERE result.verdict = 'fail' AND result.characteristic = ? AND serial <> '' AND " +
                       kOfRuns);
  Statement results(store,
                    "SELECT date, result.verdict, station FROM run CROSS JOIN result ON result.characteristic = ? AND "
                    "result.run = run.id WHERE serial = ? AND serial <> '' AND " +
                        std::string(kOfDayAndStation) + " ORDER BY date, result.number");
  Statement repairs(store, "SELECT date FROM repair WHERE serial = ?");
  std::vector<FlakyPhone> phones;
  for (const StoredCharacteristic& one : characteristicsOf(store, filter)) {
    bindRuns(failed.bind(one.id), filter);
    while (failed.step()) {
      const std::string serial = failed.text();
      Flips flips(repairsOf(repairs, serial));
      bindDayAndStation(results.bind(one.id).bind(serial), filter);
      while (results.step()) {
        const std::string date = results.text();
        const std::string verdict = results.text();
        flips.add(date, verdict, results.text());
      }
      results.reset();
      std::optional<FlakyPhone> phone = flips.found();
      if (!phone) continue;
      phone->serial = serial;
      phone->of = one.of;
      phones.push_back(std::move(*phone));
    }
    failed.reset();
  }
  std::stable_sort(phones.begin(), phones.end(),
                   [](const FlakyPhone& a, const FlakyPhone& b) { return a.last > b.last; });
  return phones;
}

void markRepaired(Database& store, const std::string& serial, const std::string& note) {
  Transaction transaction(store);
  Statement insert(store, "INSERT INTO repair(serial, date, note) VALUES(?, ?, ?)");
  insert.bind(serial).bind(timestampText(dateNow())).bind(note).run();
  transaction.commit();
}

std::vector<GaugeReading> readingsOf(Database& store, std::int64_t characteristic, const Filter& filter) {
  Statement rows(store,
                 "SELECT serial, station, value FROM result CROSS JOIN run ON run.id = result.run WHERE characteristic "
                 "= ? AND serial <> '' AND value IS NOT NULL AND " +
                     kOfRuns + " ORDER BY date, number");
  bindRuns(rows.bind(characteristic), filter);
  std::vector<GaugeReading> readings;
  while (rows.step()) {
    GaugeReading one{rows.text(), {}, 0};
    one.place = rows.text();
    one.value = rows.real();
    readings.push_back(std::move(one));
  }
  return readings;
}

}  // namespace quazor
