#include "host/store/import.h"

#include "base/text/sha256.h"
#include "host/record/verification.h"
#include "host/store/summaries.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

// A batch is some tenths of a second of work: that much is repeated after a kill.
constexpr std::size_t kBatch = 200;

std::string contentOf(const std::filesystem::path& file) {
  const auto refuse = [&file](const std::string& why) {
    throw CommandError(ExitCode::kCannotRead, "the record '" + file.string() + "' cannot be read: " + why);
  };
  std::error_code ignored;
  if (std::filesystem::exists(file, ignored) && !std::filesystem::is_regular_file(file, ignored)) {
    refuse("it is no regular file");
  }
  std::ifstream stream(file, std::ios::binary);
  if (!stream) refuse(std::strerror(errno));
  std::ostringstream content;
  content << stream.rdbuf();
  if (stream.bad()) refuse("it cannot be read to its end");
  return content.str();
}

}  // namespace

Importer::Importer(Database& store, std::function<void(const std::filesystem::path&, const std::string&)> tell)
    : store_(store),
      tell_(std::move(tell)),
      findDigest_(store, "SELECT 1 FROM run WHERE digest = ?"),
      insertRun_(store,
                 "INSERT INTO run(digest, run, date, day, kind, station, serial, host, phone, program, file, events, "
                 "whole, counted, verdict) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      insertTag_(store, "INSERT INTO tag VALUES(?, ?, ?)"),
      insertEntry_(store, "INSERT INTO entry VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      insertResult_(store, "INSERT INTO result VALUES(?, ?, ?, ?, ?)") {}

bool Importer::isKnown(const std::string& digest) {
  if (digests_.contains(digest)) return true;
  const bool found = findDigest_.bindBytes(digest).step();
  findDigest_.reset();
  return found;
}

void Importer::add(const std::filesystem::path& file) {
  try {
    const std::string content = contentOf(file);
    std::string digest = sha256(content);
    if (isKnown(digest)) {
      ++counts_.known;
      return;
    }
    std::istringstream stream(content);
    StoredRecord stored = readRecord(stream, file);
    const std::vector<std::string> problems = problemsOfRecord(stored);
    if (!problems.empty()) {
      ++counts_.wrong;
      tell_(file, problems.front());
      return;
    }
    digests_.insert(digest);
    batch_.push_back(rowsOf(std::move(stored), file, std::move(digest)));
  } catch (const RecordDefect& defect) {
    ++counts_.wrong;
    tell_(file, defect.what());
    return;
  } catch (const CommandError& refusal) {
    if (refusal.code() != ExitCode::kCannotRead) throw;
    ++counts_.unreadable;
    tell_(file, refusal.what());
    return;
  }
  if (batch_.size() >= kBatch) finish();
}

void Importer::finish() {
  if (batch_.empty()) return;
  const std::vector<RunRows> batch = std::exchange(batch_, {});
  digests_.clear();
  summaries_.clear();
  ImportCounts counts = counts_;
  Transaction transaction(store_);
  for (const RunRows& rows : batch) {
    const Place place = isKnown(rows.digest) ? Place::kTaken : placeOf(rows);
    if (place == Place::kFree) insert(rows);
    if (place == Place::kOfOther) tell_(rows.file, "the store has another record of this run");
    ++(place == Place::kTaken     ? counts.known
       : place == Place::kOfOther ? counts.wrong
       : rows.whole               ? counts.imported
                                  : counts.incomplete);
  }
  mergeSummaries();
  transaction.commit();
  counts_ = counts;
}

Importer::Place Importer::placeOf(const RunRows& rows) {
  if (rows.run.empty()) return Place::kFree;
  Statement find(store_, "SELECT id, whole, events FROM run WHERE run = ?");
  if (!find.bind(rows.run).step()) return Place::kFree;
  const std::int64_t id = find.integer();
  if (find.integer() != 0) return rows.whole ? Place::kOfOther : Place::kTaken;
  // A record only grows: the shorter one is its beginning.
  if (find.integer() >= rows.events) return Place::kTaken;
  for (const char* const sql :
       {"DELETE FROM tag WHERE run = ?", "DELETE FROM entry WHERE run = ?", "DELETE FROM run WHERE id = ?"}) {
    Statement(store_, sql).bind(id).run();
  }
  return Place::kFree;
}

void Importer::insert(const RunRows& rows) {
  insertRun_.bindBytes(rows.digest).bind(rows.run).bind(rows.date).bind(rows.day).bind(rows.kind).bind(rows.station);
  insertRun_.bind(rows.serial).bind(rows.host).bind(rows.phone).bind(rows.program).bind(rows.file).bind(rows.events);
  insertRun_.bind(std::int64_t{rows.whole}).bind(std::int64_t{rows.counted}).bind(rows.verdict).run();
  const std::int64_t run = store_.lastRow();
  for (const auto& [key, value] : rows.tags) insertTag_.bind(run).bind(key).bind(value).run();
  std::int64_t number = 0;
  for (const EntryRow& one : rows.entries) {
    insertEntry_.bind(run).bind(++number).bind(one.diagnostic).bind(one.verdict).bind(one.attempt);
    insertEntry_.bind(one.repetition).bind(one.domain);
    one.code ? insertEntry_.bind(*one.code) : insertEntry_.bind(std::optional<double>());
    insertEntry_.bind(one.message).run();
  }
  insertResults(run, rows);
}

void Importer::insertResults(std::int64_t run, const RunRows& rows) {
  std::set<std::int64_t> withValue;
  for (const ResultRow& one : rows.results) {
    const std::int64_t characteristic = idOf(one.of);
    insertResult_.bind(characteristic).bind(run).bind(one.number).bind(one.value).bind(one.verdict).run();
    Summary& summary = summaries_[{characteristic, rows.day, rows.station}];
    summary.add(one.value, one.verdict);
    if (one.value && withValue.insert(characteristic).second) ++summary.runs;
  }
}

std::int64_t Importer::idOf(const Characteristic& of) {
  const auto [known, isNew] = characteristics_.emplace(of, 0);
  if (!isNew) return known->second;
  Statement find(store_,
                 "SELECT id FROM characteristic WHERE diagnostic = ? AND name = ? AND unit = ? AND lower IS ? AND "
                 "lower_open = ? AND upper IS ? AND upper_open = ? AND limits = ?");
  find.bind(of.diagnostic).bind(of.name).bind(of.unit).bind(of.lower).bind(std::int64_t{of.lowerOpen});
  find.bind(of.upper).bind(std::int64_t{of.upperOpen}).bind(of.limits);
  if (find.step()) return known->second = find.integer();
  Statement insert(store_,
                   "INSERT INTO characteristic(diagnostic, name, unit, lower, lower_open, upper, upper_open, limits) "
                   "VALUES(?, ?, ?, ?, ?, ?, ?, ?)");
  insert.bind(of.diagnostic).bind(of.name).bind(of.unit).bind(of.lower).bind(std::int64_t{of.lowerOpen});
  insert.bind(of.upper).bind(std::int64_t{of.upperOpen}).bind(of.limits).run();
  return known->second = store_.lastRow();
}

void Importer::mergeSummaries() {
  Statement find(store_, std::string("SELECT ") + kSummaryColumns +
                             " FROM summary WHERE characteristic = ? AND day = ? AND station = ?");
  Statement write(store_, "INSERT OR REPLACE INTO summary VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
  for (auto& [key, added] : summaries_) {
    Summary all;
    if (find.bind(key.characteristic).bind(key.day).bind(key.station).step()) all = nextSummary(find);
    find.reset();
    all.merge(added);
    const auto signedOf = [](std::uint64_t number) { return static_cast<std::int64_t>(number); };
    write.bind(key.characteristic).bind(key.day).bind(key.station).bind(signedOf(all.runs));
    write.bind(signedOf(all.values.count())).bind(std::optional(all.values.mean()));
    write.bind(std::optional(all.values.squares())).bind(std::optional(all.values.low()));
    write.bind(std::optional(all.values.high())).bind(signedOf(all.fractional)).bind(signedOf(all.passed));
    write.bind(signedOf(all.failed)).run();
  }
}

}  // namespace quazor
