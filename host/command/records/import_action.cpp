#include "contract/message_format.h"
#include "host/command/records/records_command.h"
#include "host/record/record_place.h"
#include "host/report/progress.h"
#include "host/store/import.h"
#include "host/store/schema.h"
#include "host/text/table.h"

#include <chrono>

namespace quazor {

namespace {

std::string totalOf(const ImportCounts& counts, std::size_t records) {
  std::string text = countText(records, "record") + ": " + std::to_string(counts.imported) + " imported";
  const auto add = [&text](std::size_t number, const char* what) {
    if (number > 0) text += formatMessage(", %@ %@", number, what);
  };
  add(counts.incomplete, "imported though the run did not end, so that no rate counts it");
  add(counts.known, "known");
  add(counts.wrong, "refused as wrong");
  add(counts.unreadable, "unreadable");
  return text;
}

}  // namespace

ExitCode importRecords(const RecordsRequest& request, Answer& answer, Console& console, WatchedSignals* signals) {
  const std::vector<std::filesystem::path> files = recordsIn(request.records);
  makeFolderOfStore(request.store);
  Database store(request.store, Database::Access::kCreate);
  openForImport(store);
  AnswerTable refused{"refused", {"file", "reason"}};
  Importer importer(store, [&refused](const std::filesystem::path& file, const std::string& why) {
    refused.rows.push_back({file.string(), why});
  });
  StatusLine line(console.showsProgress ? &console.err : nullptr);
  auto nextUpdate = std::chrono::steady_clock::now() + std::chrono::milliseconds(300);
  std::size_t done = 0;
  for (const std::filesystem::path& file : files) {
    if (signals != nullptr && signals->requestsToEnd() > 0) break;
    importer.add(file);
    ++done;
    const auto now = std::chrono::steady_clock::now();
    if (!line.isShown() || now < nextUpdate) continue;
    nextUpdate = now + std::chrono::milliseconds(100);
    line.show(formatMessage("Importing: %@ of %@ records", done, files.size()));
  }
  importer.finish();
  line.erase();
  const ImportCounts& counts = importer.counts();
  const auto number = [](std::size_t count) { return AnswerCell(static_cast<std::int64_t>(count)); };
  AnswerTable total{"import", {"records", "imported", "incomplete", "known", "wrong", "unreadable"}};
  total.rows.push_back({number(done), number(counts.imported), number(counts.incomplete), number(counts.known),
                        number(counts.wrong), number(counts.unreadable)});
  for (const auto& row : refused.rows) {
    console.err << "quazor: refused: " << printable(std::get<std::string>(row[0])) << ": "
                << printable(std::get<std::string>(row[1])) << '\n';
  }
  answer.after.push_back(totalOf(counts, done));
  answer.tables = {std::move(total), std::move(refused)};
  if (done < files.size()) {
    throw CommandError(ExitCode::kInterrupted,
                       formatMessage("interrupted: %@ of %@ records were imported or known", done, files.size()));
  }
  if (counts.unreadable > 0) return ExitCode::kCannotRead;
  return counts.wrong > 0 ? ExitCode::kFailed : ExitCode::kAllPassed;
}

void requireStoreFor(const std::filesystem::path& file) {
  makeFolderOfStore(file);
  Database store(file, Database::Access::kCreate);
  openForImport(store);
}

std::string importAfterRun(const std::filesystem::path& file, const std::filesystem::path& record) {
  try {
    std::string refusal;
    Database store(file, Database::Access::kCreate);
    openForImport(store);
    Importer importer(store, [&refusal](const std::filesystem::path&, const std::string& why) { refusal = why; });
    importer.add(record);
    importer.finish();
    return refusal;
  } catch (const CommandError& problem) {
    return problem.what();
  }
}

}  // namespace quazor
