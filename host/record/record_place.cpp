#include "host/record/record_place.h"

#include "host/error/exit_code.h"
#include "host/text/timestamp.h"

#include <string>
#include <string_view>
#include <system_error>

namespace quazor {

namespace {

constexpr std::string_view kToSeconds = "2026-11-21T01:08:00";

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

}  // namespace quazor
