#include "host/command/records/records_command.h"

#include "host/store/questions.h"
#include "host/store/schema.h"
#include "host/text/table.h"

#include <system_error>

namespace quazor {

namespace {

void requireFile(const std::filesystem::path& store) {
  std::error_code ignored;
  if (std::filesystem::exists(store, ignored)) return;
  throw CommandError(ExitCode::kCannotRead,
                     "there is no store '" + store.string() + "'; 'quazor records import' makes it");
}

Answer markAnswer(Database& store, const RecordsRequest& request) {
  const std::string& serial = *request.filter.serial;
  markRepaired(store, serial, request.note);
  AnswerTable table{"repair", {"serial", "note"}};
  table.rows.push_back({serial, request.note});
  std::string told = "The phone '" + serial + "' was repaired now: what it did before does not make it flaky.";
  if (runsOf(store, {{}, {}, {}, serial, {}, {}}).empty()) told += " The store has no run with this serial number.";
  return {{told}, {table}, {}};
}

Answer checkAnswer(Database& store) {
  Answer answer;
  AnswerTable table{"problems", {"problem"}};
  for (const std::string& problem : problemsOfSummaries(store)) table.rows.push_back({problem});
  const bool isDamaged = store.number("SELECT count(*) FROM pragma_integrity_check WHERE integrity_check <> 'ok'") > 0;
  if (isDamaged) table.rows.push_back({"SQLite finds the file damaged (PRAGMA integrity_check)"});
  answer.after.push_back(table.rows.empty() ? "The summary agrees with the results."
                                            : countText(table.rows.size(), "problem") +
                                                  "; a store that is imported again from the records is right");
  answer.tables.push_back(std::move(table));
  return answer;
}

Answer answerTo(const RecordsRequest& request, Database& store) {
  switch (request.action) {
    case RecordsAction::kList: return listAnswer(store, request.filter);
    case RecordsAction::kShow: return showAnswer(store, request.run);
    case RecordsAction::kYield: return yieldAnswer(store, request.filter, request.by);
    case RecordsAction::kFailures: return failuresAnswer(store, request.filter);
    case RecordsAction::kFlaky: return flakyAnswer(store, request.filter);
    case RecordsAction::kDrift: return driftAnswer(store, request.filter);
    case RecordsAction::kCapability: return capabilityAnswer(store, request.filter);
    case RecordsAction::kGauge: return gaugeAnswer(store, request.filter);
    case RecordsAction::kMark: return markAnswer(store, request);
    case RecordsAction::kImport:
    case RecordsAction::kCheck: break;
  }
  return checkAnswer(store);
}

}  // namespace

ExitCode recordsCommand(const RecordsRequest& request, Format format, std::ostream& out, Console& console,
                        WatchedSignals* signals) {
  if (request.action == RecordsAction::kImport) {
    Answer answer;
    const ExitCode code = importRecords(request, answer, console, signals);
    if (format == Format::kText) answer.tables.clear();
    printAnswer(out, answer, format);
    return code;
  }
  requireFile(request.store);
  Database store(request.store, Database::Access::kExisting);
  requireStore(store);
  const Answer answer = answerTo(request, store);
  printAnswer(out, answer, format);
  const bool isWrong = request.action == RecordsAction::kCheck && !answer.tables.front().rows.empty();
  return isWrong ? ExitCode::kFailed : ExitCode::kAllPassed;
}

}  // namespace quazor
