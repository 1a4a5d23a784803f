#include "host/store/run_rows.h"

#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/text/timestamp.h"

#include <cmath>
#include <map>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kDayLength = 10;  // of "2026-11-21"

std::string tagOf(const RunStarted& began, const char* key) {
  const std::string* const value = began.tags.find(key);
  return value == nullptr ? std::string() : *value;
}

// Takes the bound if it is the narrower one; of two equal bounds, an open one is.
void narrowLower(Characteristic& of, const QZBound& bound) {
  const double value = bound.value().value();
  if (of.lower && (value < *of.lower || (value == *of.lower && !bound.open()))) return;
  of.lower = value;
  of.lowerOpen = bound.open();
}

void narrowUpper(Characteristic& of, const QZBound& bound) {
  const double value = bound.value().value();
  if (of.upper && (value > *of.upper || (value == *of.upper && !bound.open()))) return;
  of.upper = value;
  of.upperOpen = bound.open();
}

void narrow(Characteristic& of, const std::optional<QZLimit>& limit) {
  if (!limit) return;
  if (limit->lowerBound() != nullptr) narrowLower(of, *limit->lowerBound());
  if (limit->upperBound() != nullptr) narrowUpper(of, *limit->upperBound());
}

Characteristic characteristicOf(const DiagnosticRecord& record, const QZMeasuredResult& result,
                                const std::vector<LimitCheck>& checks) {
  Characteristic of{record.name, result.name(), result.measurement().unit().symbol()};
  narrow(of, result.limit());
  for (const LimitCheck& check : checks) {
    if (!check.counts()) continue;
    narrow(of, boundsOf(check));
    of.limits += (of.limits.empty() ? "" : "; ") + canonicalText(check.limit);
  }
  return of;
}

void addResults(RunRows& rows, const DiagnosticRecord& record, std::map<Characteristic, std::int64_t>& numbers) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    const std::vector<LimitCheck> own = checks.empty() ? checks : checksOfResult(checks, i);
    ResultRow row{characteristicOf(record, one.result, own), 0, std::nullopt, std::string(nameOf(verdictOf(one, own)))};
    row.number = ++numbers[row.of];
    const double value = one.result.measurement().value();
    if (std::isfinite(value)) row.value = value;
    rows.results.push_back(std::move(row));
  }
}

EntryRow entryOf(const DiagnosticRecord& record) {
  EntryRow entry{record.name,
                 std::string(nameOf(record.verdict)),
                 static_cast<std::int64_t>(record.trial.attempt),
                 static_cast<std::int64_t>(record.trial.repetition),
                 {},
                 std::nullopt,
                 {}};
  if (record.error != nullptr) {
    entry.domain = record.error->domain();
    entry.code = record.error->code();
    entry.message = record.error->localizedDescription();
  }
  return entry;
}

}  // namespace

RunRows rowsOf(StoredRecord stored, const std::filesystem::path& file, std::string digest) {
  RunRows rows;
  rows.digest = std::move(digest);
  rows.file = file.string();
  rows.events = static_cast<std::int64_t>(stored.events.size());
  const RecordedRun run = recordedRunOf(std::move(stored));
  const RunStarted& began = run.began;
  rows.run = began.id;
  rows.date = timestampText(began.date);
  rows.day = rows.date.substr(0, kDayLength);
  rows.kind = began.ofExperiments ? "experiments" : began.analyzed ? "analysis" : "run";
  rows.station = tagOf(began, "station");
  rows.serial = tagOf(began, "serial");
  rows.host = began.host;
  rows.phone = began.phone;
  rows.program = began.program;
  rows.tags = began.tags;
  rows.whole = run.ended && !run.ended->interrupted;
  if (rows.whole && !run.records.empty() && !began.ofExperiments) {
    rows.verdict = nameOf(runVerdictOf(run.records, began.acceptFlaky));
  }
  rows.counted = !rows.verdict.empty() && rows.kind == "run";
  std::map<Characteristic, std::int64_t> numbers;
  for (const DiagnosticRecord& record : run.records) {
    rows.entries.push_back(entryOf(record));
    const bool isKnown = record.verdict == Verdict::kPass || record.verdict == Verdict::kFail;
    if (rows.counted && isKnown) addResults(rows, record, numbers);
  }
  return rows;
}

}  // namespace quazor
