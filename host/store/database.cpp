#include "host/store/database.h"

#include <sqlite3.h>

#include <cmath>
#include <utility>

namespace quazor {

namespace {

constexpr int kMaxWait = 60'000;  // milliseconds

ExitCode codeOf(int failure, ExitCode otherwise) {
  switch (failure) {
    case SQLITE_FULL:
    case SQLITE_IOERR:
    case SQLITE_READONLY:
    case SQLITE_BUSY: return ExitCode::kCannotWrite;
    case SQLITE_NOTADB:
    case SQLITE_CORRUPT: return ExitCode::kCannotRead;
    default: return otherwise;
  }
}

std::string reasonOf(sqlite3* handle, int failure) {
  if (failure == SQLITE_BUSY) return "another quazor has been writing it for more than a minute";
  return handle == nullptr ? "there is no memory" : sqlite3_errmsg(handle);
}

}  // namespace

Database::Database(std::filesystem::path file, Access access)
    : file_(std::move(file)), code_(access == Access::kCreate ? ExitCode::kCannotWrite : ExitCode::kCannotRead) {
  const int create = access == Access::kCreate ? SQLITE_OPEN_CREATE : 0;
  const int failure = sqlite3_open_v2(file_.c_str(), &handle_, SQLITE_OPEN_READWRITE | create, nullptr);
  if (failure != SQLITE_OK) {
    const std::string why = reasonOf(handle_, failure);
    sqlite3_close(handle_);
    throw CommandError(code_, "the store '" + file_.string() + "' cannot be opened: " + why);
  }
  sqlite3_busy_timeout(handle_, kMaxWait);
}

Database::~Database() { sqlite3_close(handle_); }

void Database::fail() const {
  const int failure = sqlite3_errcode(handle_);
  const ExitCode code = codeOf(failure, code_);
  throw CommandError(code, "the store '" + file_.string() + "' cannot be " +
                               (code == ExitCode::kCannotWrite ? "written: " : "read: ") + reasonOf(handle_, failure));
}

void Database::execute(const char* sql) {
  if (sqlite3_exec(handle_, sql, nullptr, nullptr, nullptr) != SQLITE_OK) fail();
}

std::int64_t Database::number(const char* sql) {
  Statement statement(*this, sql);
  return statement.step() ? statement.integer() : 0;
}

std::int64_t Database::lastRow() const { return sqlite3_last_insert_rowid(handle_); }

int Database::changed() const { return sqlite3_changes(handle_); }

Statement::Statement(Database& database, const std::string& sql) : database_(database) {
  if (sqlite3_prepare_v2(database.handle_, sql.c_str(), -1, &handle_, nullptr) != SQLITE_OK) database.fail();
}

Statement::~Statement() { sqlite3_finalize(handle_); }

Statement& Statement::bind(std::int64_t number) {
  if (sqlite3_bind_int64(handle_, ++parameter_, number) != SQLITE_OK) database_.fail();
  return *this;
}

Statement& Statement::bind(std::string_view text) {
  const auto size = static_cast<sqlite3_uint64>(text.size());
  if (sqlite3_bind_text64(handle_, ++parameter_, text.data(), size, SQLITE_TRANSIENT, SQLITE_UTF8) != SQLITE_OK) {
    database_.fail();
  }
  return *this;
}

Statement& Statement::bind(std::optional<double> number) {
  const bool isNumber = number && std::isfinite(*number);
  ++parameter_;
  const int failure =
      isNumber ? sqlite3_bind_double(handle_, parameter_, *number) : sqlite3_bind_null(handle_, parameter_);
  if (failure != SQLITE_OK) database_.fail();
  return *this;
}

Statement& Statement::bindBytes(std::string_view bytes) {
  const auto size = static_cast<sqlite3_uint64>(bytes.size());
  if (sqlite3_bind_blob64(handle_, ++parameter_, bytes.data(), size, SQLITE_TRANSIENT) != SQLITE_OK) database_.fail();
  return *this;
}

bool Statement::step() {
  column_ = 0;
  const int outcome = sqlite3_step(handle_);
  if (outcome != SQLITE_ROW && outcome != SQLITE_DONE) database_.fail();
  return outcome == SQLITE_ROW;
}

void Statement::run() {
  while (step()) continue;
  reset();
}

void Statement::reset() {
  sqlite3_reset(handle_);
  parameter_ = 0;
}

std::int64_t Statement::integer() { return sqlite3_column_int64(handle_, column_++); }

double Statement::real() { return sqlite3_column_double(handle_, column_++); }

std::optional<double> Statement::optionalReal() {
  const int column = column_++;
  if (sqlite3_column_type(handle_, column) == SQLITE_NULL) return std::nullopt;
  return sqlite3_column_double(handle_, column);
}

std::string Statement::text() {
  const int column = column_++;
  const auto* const begin = reinterpret_cast<const char*>(sqlite3_column_text(handle_, column));
  return begin == nullptr ? std::string()
                          : std::string(begin, static_cast<std::size_t>(sqlite3_column_bytes(handle_, column)));
}

Transaction::Transaction(Database& database) : database_(database) { database_.execute("BEGIN IMMEDIATE"); }

Transaction::~Transaction() {
  if (!open_) return;
  try {
    database_.execute("ROLLBACK");
  } catch (const CommandError&) {  // SQLite has undone it already, or will when the file is opened again
  }
}

void Transaction::commit() {
  database_.execute("COMMIT");
  open_ = false;
}

}  // namespace quazor
