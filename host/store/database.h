// An SQLite database, whose errors are CommandErrors.
#pragma once

#include "host/error/exit_code.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

struct sqlite3;
struct sqlite3_stmt;

namespace quazor {

class Statement;

// An open database file. Several processes may have it open; one that writes waits for the others, up to a minute.
// Thread: one at a time.
class Database {
 public:
  enum class Access { kExisting, kCreate };

  // Throws a CommandError: kCannotRead if an existing file is wanted and cannot be opened, kCannotWrite if it cannot be
  // created.
  Database(std::filesystem::path file, Access access);
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;
  ~Database();

  // Executes statements without parameters and results. Throws like Statement::step().
  void execute(const char* sql);
  // The one number that the statement gives.
  std::int64_t number(const char* sql);
  std::int64_t lastRow() const;
  // How many rows the last statement changed.
  int changed() const;

  const std::filesystem::path& file() const { return file_; }

 private:
  friend class Statement;

  // Throws the CommandError for what SQLite said last.
  [[noreturn]] void fail() const;

  const std::filesystem::path file_;
  const ExitCode code_;
  sqlite3* handle_ = nullptr;
};

// A prepared statement. Columns and parameters are taken in their order.
// Thread: one at a time.
class Statement {
 public:
  // `database` is borrowed. Throws like step().
  Statement(Database& database, const std::string& sql);
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;
  ~Statement();

  Statement& bind(std::int64_t number);
  Statement& bind(std::string_view text);
  // A number that is not finite becomes NULL, as does nothing.
  Statement& bind(std::optional<double> number);
  Statement& bindBytes(std::string_view bytes);

  // True if there is a row. Throws a CommandError: kCannotWrite if the disk is full, the file cannot be written or
  // another process keeps it too long, kCannotRead if it is no database or damaged.
  bool step();
  // Executes it to its end and prepares it for other parameters.
  void run();
  // For other parameters.
  void reset();

  // The next column of the current row.
  std::int64_t integer();
  double real();
  std::optional<double> optionalReal();
  std::string text();

 private:
  Database& database_;
  sqlite3_stmt* handle_ = nullptr;
  int parameter_ = 0;
  int column_ = 0;
};

// A transaction, which is undone unless it is committed. Waits until no other process writes.
// Thread: one at a time.
class Transaction {
 public:
  // `database` is borrowed.
  explicit Transaction(Database& database);
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  ~Transaction();

  void commit();

 private:
  Database& database_;
  bool open_ = true;
};

}  // namespace quazor
