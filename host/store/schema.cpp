#include "host/store/schema.h"

#include "contract/message_format.h"
#include "host/system/user_directory.h"

#include <iterator>
#include <string>
#include <system_error>

namespace quazor {

namespace {

constexpr std::int64_t kApplication = 0x51755A72;  // "QuZr" in the file's header

// Statement N takes a store from version N to N + 1.
constexpr const char* kMigrations[] = {R"(
CREATE TABLE run(
  id INTEGER PRIMARY KEY,
  digest BLOB NOT NULL UNIQUE,
  run TEXT NOT NULL,
  date TEXT NOT NULL,
  day TEXT NOT NULL,
  kind TEXT NOT NULL CHECK(kind IN ('run', 'experiments', 'analysis')),
  station TEXT NOT NULL,
  serial TEXT NOT NULL,
  host TEXT NOT NULL,
  phone TEXT NOT NULL,
  program TEXT NOT NULL,
  file TEXT NOT NULL,
  events INTEGER NOT NULL,
  whole INTEGER NOT NULL,
  counted INTEGER NOT NULL,
  verdict TEXT NOT NULL CHECK(verdict IN ('pass', 'fail', 'error', 'skip', '')));
CREATE UNIQUE INDEX run_by_run ON run(run) WHERE run <> '';
CREATE INDEX run_by_serial ON run(serial, date, counted, verdict, station, day, id) WHERE serial <> '';
CREATE INDEX run_by_day ON run(day, station, counted, verdict);
CREATE TABLE tag(
  run INTEGER NOT NULL REFERENCES run(id),
  key TEXT NOT NULL,
  value TEXT NOT NULL,
  PRIMARY KEY(run, key)) WITHOUT ROWID;
CREATE TABLE entry(
  run INTEGER NOT NULL REFERENCES run(id),
  number INTEGER NOT NULL,
  diagnostic TEXT NOT NULL,
  verdict TEXT NOT NULL,
  attempt INTEGER NOT NULL,
  repetition INTEGER NOT NULL,
  domain TEXT NOT NULL,
  code INTEGER,
  message TEXT NOT NULL,
  PRIMARY KEY(run, number)) WITHOUT ROWID;
CREATE INDEX entry_in_error ON entry(diagnostic, domain, code, run) WHERE verdict = 'error';
CREATE TABLE characteristic(
  id INTEGER PRIMARY KEY,
  diagnostic TEXT NOT NULL,
  name TEXT NOT NULL,
  unit TEXT NOT NULL,
  lower REAL,
  lower_open INTEGER NOT NULL,
  upper REAL,
  upper_open INTEGER NOT NULL,
  limits TEXT NOT NULL);
CREATE UNIQUE INDEX characteristic_by_name ON characteristic(
  diagnostic, name, unit, ifnull(lower, 'none'), lower_open, ifnull(upper, 'none'), upper_open, limits);
CREATE TABLE result(
  characteristic INTEGER NOT NULL REFERENCES characteristic(id),
  run INTEGER NOT NULL REFERENCES run(id),
  number INTEGER NOT NULL,
  value REAL,
  verdict TEXT NOT NULL CHECK(verdict IN ('pass', 'fail', 'none')),
  PRIMARY KEY(characteristic, run, number)) WITHOUT ROWID;
CREATE INDEX result_failed ON result(characteristic, run) WHERE verdict = 'fail';
CREATE TABLE summary(
  characteristic INTEGER NOT NULL REFERENCES characteristic(id),
  day TEXT NOT NULL,
  station TEXT NOT NULL,
  runs INTEGER NOT NULL,
  n INTEGER NOT NULL,
  mean REAL NOT NULL,
  m2 REAL NOT NULL,
  low REAL NOT NULL,
  high REAL NOT NULL,
  fractional INTEGER NOT NULL,
  passed INTEGER NOT NULL,
  failed INTEGER NOT NULL,
  PRIMARY KEY(characteristic, day, station)) WITHOUT ROWID;
CREATE TABLE repair(
  id INTEGER PRIMARY KEY,
  serial TEXT NOT NULL,
  date TEXT NOT NULL,
  note TEXT NOT NULL);
CREATE INDEX repair_by_serial ON repair(serial, date);
)"};
static_assert(std::size(kMigrations) == kStoreVersion);

[[noreturn]] void refuse(const Database& store, const std::string& why) {
  throw CommandError(ExitCode::kCannotRead, "the store '" + store.file().string() + "' cannot be used: " + why);
}

// The version of the layout; 0 for a new file.
std::int64_t versionOf(Database& store) {
  const std::int64_t version = store.number("PRAGMA user_version");
  const bool isOurs = store.number("PRAGMA application_id") == kApplication;
  const bool isEmpty = store.number("SELECT count(*) FROM sqlite_master") == 0;
  if (!isOurs && !isEmpty) refuse(store, "it is a database of another program");
  if (version > kStoreVersion) {
    refuse(store, formatMessage("it has layout %@, and this quazor knows layouts up to %@; use a newer quazor", version,
                                kStoreVersion));
  }
  return isOurs ? version : 0;
}

}  // namespace

std::filesystem::path usualStore() {
  const std::filesystem::path folder = userDirectory("XDG_DATA_HOME", ".local/share");
  return folder.empty() ? folder : folder / "records.sqlite";
}

void makeFolderOfStore(const std::filesystem::path& store) {
  if (!store.has_parent_path()) return;
  std::error_code error;
  std::filesystem::create_directories(store.parent_path(), error);
  if (!error) return;
  throw CommandError(ExitCode::kCannotWrite,
                     "the folder of the store '" + store.string() + "' cannot be made: " + error.message());
}

void openForImport(Database& store) {
  if (versionOf(store) == kStoreVersion) return;
  Transaction transaction(store);
  // Another process may have been quicker.
  for (std::int64_t version = versionOf(store); version < kStoreVersion; ++version) {
    store.execute(kMigrations[version]);
  }
  store.execute(formatMessage("PRAGMA application_id = %@", kApplication).c_str());
  store.execute(formatMessage("PRAGMA user_version = %@", kStoreVersion).c_str());
  transaction.commit();
}

void requireStore(Database& store) {
  const std::int64_t version = versionOf(store);
  if (version == 0) refuse(store, "it is empty; 'quazor records import' fills it");
  if (version < kStoreVersion) refuse(store, "it has an earlier layout; 'quazor records import' brings it up to date");
}

}  // namespace quazor
