// Records: files with all events of a run, one per line. docs/record_format.md is the public description.
#pragma once

#include "host/error/exit_code.h"
#include "host/model/run_event.h"
#include "host/system/replacement_file.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <istream>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The first version of the record format that is still read.
inline constexpr int kFirstRecordFormat = 1;

// Returns the record line of the event, including the line end. `sequence` is the number of events before it.
std::string recordLine(const RunEvent& event, std::uint64_t sequence);

// Writes a record during a run. onEvent() writes each line with one system call before it returns, so the file contains
// all events so far even if this process is killed, and only the last line of the file can be incomplete.
// Thread: one at a time.
class RecordWriter final : public RunEventSink {
 public:
  // What happens to a file that exists already. kReplace refuses only a record that another writer has not finished,
  // and keeps owner and permissions. kReplaceAll replaces whatever is at the place, also a link or a pipe, which
  // somebody may have planted there.
  enum class Existing { kRefuse, kReplace, kReplaceAll };

  // Creates the file, which is locked until the writer ends. An existing one is replaced atomically, as soon as the
  // first event is written. Writes to what is no regular file, and to the descriptor that /dev/stdout and its like
  // name, as it is. Throws a CommandError (kCannotWrite) if it cannot be created: of several writers of one file, all
  // but one.
  explicit RecordWriter(std::filesystem::path file, Existing existing = Existing::kRefuse);
  ~RecordWriter() override;

  // After a failure nothing more is written. Throws a CommandError (kCannotWrite) if a file was to be replaced and the
  // first event cannot be written; the file is then unchanged.
  void onEvent(const RunEvent& event) override { onEvent(event, recordLine(event, taken_)); }
  // Writes a line that was already formatted. The line of an event is the same in all records of a run.
  void onEvent(const RunEvent& event, const std::string& line);

  const std::filesystem::path& file() const { return file_; }
  // Why writing failed; empty if everything was written.
  const std::string& problem() const { return problem_; }

 private:
  [[noreturn]] void refuse(const std::string& why) const;
  void create(const std::filesystem::path& target);
  void createReplacement(const std::filesystem::path& target);
  bool inheritOld() const;
  void putInPlace();
  void write(const std::string& line);

  const std::filesystem::path file_;
  std::filesystem::path target_;                // what the replacement will replace
  std::optional<ReplacementFile> replacement_;  // until it is in place
  int descriptor_ = -1;
  std::uint64_t taken_ = 0;
  std::string problem_;
};

// The content of a record file.
struct StoredRecord {
  std::vector<RunEvent> events;
  bool cutOff = false;  // the last line is incomplete and not included in the events
};

// A line of a record that is wrong. Thread: any.
class RecordDefect : public CommandError {
 public:
  using CommandError::CommandError;
};

// Throws a CommandError (kCannotRead) that names the file if it cannot be read, has no complete line or says a version
// that this program does not know, and a RecordDefect (kCannotRead) that names file and line if a line is wrong.
// `onProgress`, which may throw, is called now and then with the number of bytes that were read.
StoredRecord readRecord(const std::filesystem::path& file,
                        const std::function<void(std::uint64_t bytes)>& onProgress = nullptr);

// The same for what was read of `file` already.
StoredRecord readRecord(std::istream& content, const std::filesystem::path& file,
                        const std::function<void(std::uint64_t bytes)>& onProgress = nullptr);

// True if the first line of the file is that of a record. False for a file that cannot be read.
bool isRecord(const std::filesystem::path& file);

// From the frame at this index on, one of `step` frames is told.
struct TracedStep {
  std::size_t first = 0;
  std::uint64_t step = 1;
};

// The frames of a stream, or the tasks of a queue, in one run of a diagnostic.
struct RecordedStream {
  std::string name;
  std::vector<TracedFrame> frames;  // in the order of their delivery
  std::uint64_t lost = 0;
  std::vector<TracedStep> steps{};  // ascending
  TracedKind kind = TracedKind::kFrames;

  // The step at the frame with that index.
  std::uint64_t stepAt(std::size_t index) const;
};

// Moves the frames to the stream of that name, a new one at first. All are of one kind.
void addFrames(std::vector<RecordedStream>& streams, FramesTraced&& event);

// The run stored in a record. Incomplete diagnostics have the verdict kError.
struct RecordedRun {
  RunStarted began;
  std::vector<DiagnosticRecord> records;
  std::optional<RunEnded> ended;                       // nothing: the run did not end
  bool isLastOpen = false;                             // the diagnostic of the last record did not end
  std::vector<std::vector<RecordedStream>> streams{};  // those of each of the records
  std::vector<std::vector<RecordedStream>> queues{};   // likewise
};

// The run that the events tell, whose first is a RunStarted.
RecordedRun recordedRunOf(StoredRecord stored);

// The run in a record, which may be incomplete. Throws like readRecord() and, for a folder, refuseFolderAsRecord().
RecordedRun runIn(const std::filesystem::path& file);

}  // namespace quazor
