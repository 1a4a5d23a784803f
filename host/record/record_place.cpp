#include "host/record/record_place.h"

#include "base/text/name_list.h"
#include "host/error/exit_code.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <cstddef>
#include <set>
#include <string>
#include <string_view>
#include <system_error>

namespace quazor {

namespace {

constexpr std::string_view kToSeconds = "2026-11-21T01:08:00";

constexpr std::string_view kEnd = ".jsonl";

namespace fs = std::filesystem;

[[noreturn]] void refuseFolder(const fs::path& folder, const std::string& why) {
  throw CommandError(ExitCode::kCannotRead, "the folder '" + folder.string() + "' " + why);
}

// A link that leads nowhere counts: the record that it names is missed.
bool isRecord(const fs::directory_entry& entry) {
  std::error_code ignored;
  const bool isDangling = entry.is_symlink(ignored) && !entry.exists(ignored);
  return entry.path().filename().string().ends_with(kEnd) && (isDangling || entry.is_regular_file(ignored));
}

std::vector<fs::path> recordsInFolder(const fs::path& folder) {
  std::vector<fs::path> files;
  std::error_code error;
  for (fs::recursive_directory_iterator entry(folder, error); !error && entry != fs::recursive_directory_iterator();
       entry.increment(error)) {
    if (isRecord(*entry)) files.push_back(entry->path());
  }
  if (error) refuseFolder(folder, "cannot be read: " + error.message());
  if (files.empty()) refuseFolder(folder, "contains no record: no file in it ends in " + std::string(kEnd));
  std::sort(files.begin(), files.end());
  return files;
}

}  // namespace

bool isFolderOfRecords(const std::filesystem::path& given) {
  std::error_code ignored;
  return !given.empty() && (!given.has_filename() || std::filesystem::is_directory(given, ignored));
}

std::string recordNameOf(const RunStarted& began) {
  std::string date = timestampText(began.date).substr(0, kToSeconds.size());
  std::erase_if(date, [](char unit) { return unit == '-' || unit == ':'; });  // some file systems refuse colons
  return date + "Z-" + began.id + ".jsonl";
}

void makeFolderOfRecords(const std::filesystem::path& folder) {
  std::error_code error;
  std::filesystem::create_directories(folder, error);
  if (!error) return;
  throw CommandError(ExitCode::kCannotWrite,
                     "the folder '" + folder.string() + "' of records cannot be made: " + error.message());
}

std::vector<fs::path> recordsIn(const std::vector<fs::path>& given) {
  std::vector<fs::path> records;
  std::set<fs::path> places;
  const auto add = [&records, &places](const fs::path& file) {
    std::error_code error;
    const fs::path place = fs::weakly_canonical(file, error);
    if (places.insert(error ? file : place).second) records.push_back(file);
  };
  for (const fs::path& one : given) {
    std::error_code ignored;
    if (!fs::is_directory(one, ignored)) {
      add(one);
      continue;
    }
    for (const fs::path& file : recordsInFolder(one)) add(file);
  }
  return records;
}

void refuseFolderAsRecord(const fs::path& given) {
  constexpr std::size_t kMaxListed = 3;
  std::error_code ignored;
  if (!fs::is_directory(given, ignored)) return;
  const std::vector<fs::path> records = recordsInFolder(given);
  const std::vector<std::string> newestFirst(records.rbegin(), records.rend());
  refuseFolder(given, "is not a record; name one of the records in it: " + listText(newestFirst, kMaxListed));
}

}  // namespace quazor
