// Records: files with all events of a run, one a line. docs/record_format.md is the public description.
#pragma once

#include "host/model/run_event.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// The version of the form of records.
inline constexpr int kRecordFormat = 1;

// The line of a record that holds the event, with the line's end. `sequence` is the number of events before it.
std::string recordLine(const RunEvent& event, std::uint64_t sequence);

// Writes a record while the run goes on. A line is handed to the system as a whole before onEvent() returns, so that
// what has been taken is in the file whatever happens to this process, and a file that was cut off ends in a line
// without an end.
// Thread: one at a time.
class RecordWriter final : public RunEventSink {
 public:
  // A new file takes the place of one of that name at once. Throws a CommandError (kCannotWrite) when it cannot be
  // made.
  explicit RecordWriter(std::filesystem::path file);
  ~RecordWriter() override;

  // After a failure nothing more is written.
  void onEvent(const RunEvent& event) override { onEvent(event, recordLine(event, taken_)); }
  // The same for who has the line already: it is the event's in all records of one run.
  void onEvent(const RunEvent& event, const std::string& line);

  const std::filesystem::path& file() const { return file_; }
  // Why something could not be written; the empty text when all was.
  const std::string& problem() const { return problem_; }

 private:
  void write(const std::string& line);

  const std::filesystem::path file_;
  int descriptor_ = -1;
  std::uint64_t taken_ = 0;
  std::string problem_;
};

// What a file holds.
struct StoredRecord {
  std::vector<RunEvent> events;
  bool cutOff = false;  // its last line has no end, and is not among the events
};

// Throws a CommandError (kCannotRead) that names file and line when the file cannot be read or is no record.
StoredRecord readRecord(const std::filesystem::path& file);

// The diagnostics of a record that it does not hold to the end have the verdict kError.
struct RecordedRun {
  RunStarted began;
  std::vector<DiagnosticRecord> records;
  std::optional<RunEnded> ended;  // nothing: the run did not come to its end
};

// The run that a record holds, as far as it came. Throws the Refusals of readRecord.
RecordedRun runIn(const std::filesystem::path& file);

}  // namespace quazor
