#include "host/record/record_file.h"

#include "base/json/json_limits.h"
#include "base/json/json_line.h"
#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/model/record_builder.h"
#include "host/record/lossless_json.h"
#include "host/record/record_place.h"
#include "host/record/run_event_json.h"
#include "host/system/own_descriptor.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <functional>
#include <map>
#include <optional>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

constexpr std::size_t kEventsPerProgress = 256;
constexpr mode_t kMode = 0666;  // reduced by the umask
constexpr const char* kBusy = "another process is writing it";
constexpr const char* kExists =
    "it exists already; replace it with --replace, or give each record a name of its own with --record DIR/";

[[noreturn]] void refuseLine(const std::filesystem::path& file, std::uint64_t line, const std::string& why) {
  throw RecordDefect(ExitCode::kCannotRead,
                     "the record '" + file.string() + "', line " + std::to_string(line) + ": " + why);
}

// A descriptor that is closed at the end.
class Descriptor {
 public:
  explicit Descriptor(int number) : number_(number) {}
  Descriptor(Descriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor() {
    if (number_ >= 0) ::close(number_);
  }

  int number() const { return number_; }

 private:
  int number_;
};

// The file, if there is one, locked so that nobody else takes it for a finished record. Refuses one that is being
// written.
template <typename Refuse>
Descriptor lockOld(const std::filesystem::path& file, const Refuse& refuse) {
  for (;;) {
    Descriptor old(::open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    if (old.number() < 0) return old;
    if (::flock(old.number(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK) refuse(kBusy);
    if (isSameFile(old.number(), file)) return old;  // not replaced in the meantime
  }
}

// Reads a line without its line end, like std::getline, but stops after a line that is too long to be accepted.
bool readLine(std::istream& stream, std::string& line) {
  std::array<char, 65536> piece{};
  line.clear();
  while (line.size() <= kMaxLine) {
    stream.getline(piece.data(), piece.size());
    const auto taken = static_cast<std::size_t>(stream.gcount());
    if (stream.good()) {
      line.append(piece.data(), taken - 1);  // without the line end
      return true;
    }
    line.append(piece.data(), taken);
    if (stream.eof()) return !line.empty() && !stream.bad();
    if (stream.bad()) return false;
    stream.clear();  // the piece is full
  }
  return true;
}

void addWhatFormat1Lacks(Json& json) {
  json["limits"] = Json::array();
  json["id"] = "";
  json["host"] = "";
  json["tags"] = Json::array();
}

// Refuses a record of a version that this program does not know. Its events and keys may be others or mean something
// else, so a part of it that seems to be understood could be judged wrongly.
void checkVersion(const std::filesystem::path& file, const Json& json) {
  const Json& version = memberOf(json, "record");
  if (!version.is_number_unsigned() || version < kFirstRecordFormat) {
    throw InputError("the version of the record is " + version.dump() + ", but must be a number from " +
                     std::to_string(kFirstRecordFormat));
  }
  if (version <= kRecordFormatWithTasks) return;
  const auto program = json.find("program");
  const std::string writer = program != json.end() && program->is_string() ? ", " + textFrom(*program) : "";
  throw CommandError(ExitCode::kCannotRead,
                     "the record '" + file.string() + "' says version " + version.dump() +
                         ", but this program reads versions " + std::to_string(kFirstRecordFormat) + " to " +
                         std::to_string(kRecordFormatWithTasks) + "; read it with the quazor that wrote it" + writer +
                         ", or a later one");
}

RunEvent eventInLine(const std::filesystem::path& file, std::uint64_t sequence, const std::string& line) {
  try {
    Json json = parseJsonLine(line);
    if (sequence == 0) {
      checkVersion(file, json);
      if (json["record"] == kFirstRecordFormat) addWhatFormat1Lacks(json);
    }
    if (memberOf(json, "sequence") != sequence) {
      throw InputError("the sequence number is " + memberOf(json, "sequence").dump() + " instead of " +
                       std::to_string(sequence) + "; a line is missing or has been moved");
    }
    return eventFrom(json);
  } catch (const CommandError&) {
    throw;
  } catch (const InputError& problem) {
    refuseLine(file, sequence + 1, problem.what());
  }
}

// Checks frames against the lines before them.
// Thread: one at a time.
class FrameOrder {
 public:
  // Throws InputError.
  void check(const RunEvent& event) {
    if (const auto* const began = std::get_if<RunStarted>(&event)) {
      isTraced_ = began->traced;
      tracesTasks_ = began->tracesTasks;
    }
    if (std::holds_alternative<DiagnosticStarted>(event)) delivered_.clear();
    const auto* const traced = std::get_if<FramesTraced>(&event);
    if (traced == nullptr) return;
    const bool isOfTasks = traced->kind == TracedKind::kTasks;
    if (!(isOfTasks ? tracesTasks_ : isTraced_)) {
      throw InputError(formatMessage("a record has the event '%@' from version %@ on", isOfTasks ? "tasks" : "frames",
                                     isOfTasks ? kRecordFormatWithTasks : kRecordFormatWithFrames));
    }
    if (traced->frames.empty()) return;
    const auto [last, isFirst] =
        delivered_.try_emplace({traced->kind, traced->stream}, traced->frames.front().delivered);
    if (traced->frames.front().delivered < last->second) {
      throw InputError(isOfTasks
                           ? formatMessage("the column \"begun\", entry 1: the task began before the last one of the "
                                           "queue '%@' in an earlier line",
                                           traced->stream)
                           : formatMessage("the column \"delivered\", entry 1: the frame was delivered before the "
                                           "last one of the stream '%@' in an earlier line",
                                           traced->stream));
    }
    last->second = traced->frames.back().delivered;
  }

 private:
  bool isTraced_ = false;
  bool tracesTasks_ = false;
  // The last frame of each stream of the diagnostic, and the last task of each queue.
  std::map<std::pair<TracedKind, std::string>, std::int64_t> delivered_;
};

}  // namespace

std::uint64_t RecordedStream::stepAt(std::size_t index) const {
  const auto after = std::upper_bound(steps.begin(), steps.end(), index,
                                      [](std::size_t at, const TracedStep& one) { return at < one.first; });
  return after == steps.begin() ? 1 : (after - 1)->step;
}

void addFrames(std::vector<RecordedStream>& streams, FramesTraced&& event) {
  auto stream = std::find_if(streams.begin(), streams.end(),
                             [&event](const RecordedStream& one) { return one.name == event.stream; });
  if (stream == streams.end()) stream = streams.insert(streams.end(), {event.stream, {}, 0, {}, event.kind});
  if (stream->steps.empty() || stream->steps.back().step != event.step) {
    stream->steps.push_back({stream->frames.size(), event.step});
  }
  stream->frames.insert(stream->frames.end(), event.frames.begin(), event.frames.end());
  stream->lost += event.lost;
  event.frames = {};
}

namespace {

int formatOf(const RunStarted& began) {
  return began.tracesTasks ? kRecordFormatWithTasks : began.traced ? kRecordFormatWithFrames : kRecordFormat;
}

}  // namespace

std::string recordLine(const RunEvent& event, std::uint64_t sequence) {
  Json line = {{"sequence", sequence}};
  const auto* const began = std::get_if<RunStarted>(&event);
  if (sequence == 0) line["record"] = began == nullptr ? kRecordFormat : formatOf(*began);
  line.update(eventJson(event));
  return line.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
}

RecordWriter::RecordWriter(std::filesystem::path file, Existing existing) : file_(std::move(file)) {
  if (existing == Existing::kReplaceAll) {
    createReplacement(file_);
    if (const int failure = replacement_->putInPlace(true); failure != 0) refuse(std::strerror(failure));
    replacement_.reset();
    return;
  }
  std::error_code error;
  if (std::filesystem::is_directory(file_, error)) refuse("it is a directory");
  const std::optional<int> own = ownDescriptor(file_);
  if (own || (std::filesystem::exists(file_, error) && !std::filesystem::is_regular_file(file_, error))) {
    descriptor_ = own ? writableCopyOf(*own) : ::open(file_.c_str(), O_WRONLY | O_CLOEXEC);
    if (descriptor_ < 0) refuse(std::strerror(errno));
    return;
  }
  if (existing == Existing::kRefuse) {
    create(file_);
    return;
  }
  // Resolves a symbolic link, because a rename would replace the link itself.
  const std::filesystem::path canonical = std::filesystem::weakly_canonical(file_, error);
  createReplacement(error ? file_ : canonical);
  const Descriptor old = lockOld(target_, [this](const char* why) { refuse(why); });
  inheritOld();
}

void RecordWriter::refuse(const std::string& why) const {
  throw CommandError(ExitCode::kCannotWrite, "the record '" + file_.string() + "' cannot be written: " + why);
}

// Of all processes that do this at once, one makes the file.
void RecordWriter::create(const std::filesystem::path& target) {
  descriptor_ = ::open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode);
  if (descriptor_ < 0) refuse(errno == EEXIST ? kExists : std::strerror(errno));
  // Another process that means to replace it may have been quicker.
  const bool isLocked = ::flock(descriptor_, LOCK_EX | LOCK_NB) == 0 || errno != EWOULDBLOCK;
  if (!isLocked || !isSameFile(descriptor_, target)) {
    ::close(descriptor_);
    refuse(kBusy);
  }
}

void RecordWriter::createReplacement(const std::filesystem::path& target) {
  try {
    target_ = target;
    replacement_.emplace(target);
    descriptor_ = ::fcntl(replacement_->descriptor(), F_DUPFD_CLOEXEC, 0);  // keeps the lock
  } catch (const std::system_error& problem) {
    refuse(std::strerror(problem.code().value()));
  }
}

// Returns false if there is no file to be replaced.
bool RecordWriter::inheritOld() const {
  struct stat status {};
  if (::lstat(target_.c_str(), &status) != 0) return false;
  if (replacement_->inherit(status) == EPERM && status.st_uid != ::geteuid()) refuse(kOfAnotherUser);
  return true;
}

// Puts the new file in the place of a record that nobody is writing.
void RecordWriter::putInPlace() {
  for (;;) {
    const Descriptor old = lockOld(target_, [this](const char* why) { refuse(why); });
    const int failure = replacement_->putInPlace(inheritOld());
    if (failure == EEXIST) continue;  // created in the meantime
    if (failure != 0) refuse(std::strerror(failure));
    replacement_.reset();
    return;
  }
}

RecordWriter::~RecordWriter() { ::close(descriptor_); }

void RecordWriter::onEvent(const RunEvent& event, const std::string& line) {
  ++taken_;
  if (!problem_.empty()) return;
  if (line.size() - 1 > kMaxLine) {
    problem_ = "an event takes more than " + std::to_string(kMaxLine >> 20U) + " MiB";
  } else {
    write(line);
  }
  if (replacement_) {
    if (!problem_.empty()) refuse(problem_);
    putInPlace();
  }
  // The outcome of a run must survive a crash of the machine.
  if (std::holds_alternative<RunEnded>(event) && problem_.empty()) ::fdatasync(descriptor_);
}

void RecordWriter::write(const std::string& line) {
  std::string_view left = line;
  while (!left.empty() && problem_.empty()) {
    const ssize_t written = ::write(descriptor_, left.data(), left.size());
    if (written >= 0) {
      left.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EINTR) {
      problem_ = std::strerror(errno);
    }
  }
}

StoredRecord readRecord(const std::filesystem::path& file, const std::function<void(std::uint64_t bytes)>& onProgress) {
  std::ifstream stream(file, std::ios::binary);
  std::error_code ignored;
  if (!stream || std::filesystem::is_directory(file, ignored)) {
    throw CommandError(ExitCode::kCannotRead, "the record '" + file.string() + "' cannot be read: " +
                                                  (stream ? "it is a directory" : std::strerror(errno)));
  }
  return readRecord(stream, file, onProgress);
}

StoredRecord readRecord(std::istream& stream, const std::filesystem::path& file,
                        const std::function<void(std::uint64_t bytes)>& onProgress) {
  StoredRecord stored;
  FrameOrder frames;
  std::string line;
  std::uint64_t bytes = 0;
  while (readLine(stream, line)) {
    bytes += line.size() + 1;
    if (onProgress && stored.events.size() % kEventsPerProgress == 0) onProgress(bytes);
    if (stream.eof()) {
      stored.cutOff = true;
      break;
    }
    stored.events.push_back(eventInLine(file, stored.events.size(), line));
    try {
      frames.check(stored.events.back());
    } catch (const InputError& problem) {
      refuseLine(file, stored.events.size(), problem.what());
    }
  }
  if (stream.bad())
    throw CommandError(ExitCode::kCannotRead, "the record '" + file.string() + "' cannot be read to its end");
  if (stored.events.empty())
    throw CommandError(ExitCode::kCannotRead, "the record '" + file.string() + "' contains no events");
  if (!std::holds_alternative<RunStarted>(stored.events.front())) {
    refuseLine(file, 1, "the first event of a record must be runBegan");
  }
  return stored;
}

bool isRecord(const std::filesystem::path& file) {
  std::error_code ignored;
  if (!std::filesystem::is_regular_file(file, ignored)) return false;
  std::ifstream stream(file, std::ios::binary);
  std::string line;
  if (!readLine(stream, line)) return false;
  try {
    const Json json = parseJsonLine(line);
    return memberOf(json, "sequence") == 0 && memberOf(json, "record").is_number();
  } catch (const InputError&) {
    return false;
  }
}

RecordedRun runIn(const std::filesystem::path& file) {
  refuseFolderAsRecord(file);
  return recordedRunOf(readRecord(file));
}

RecordedRun recordedRunOf(StoredRecord stored) {
  RecordedRun run;
  RecordBuilder builder;
  std::vector<RecordedStream> streams;
  std::vector<RecordedStream> queues;
  const auto take = [&] {
    run.records.push_back(builder.takeRecord());
    run.streams.push_back(std::exchange(streams, {}));
    run.queues.push_back(std::exchange(queues, {}));
  };
  for (RunEvent& event : stored.events) {
    builder.onEvent(event);
    if (auto* const traced = std::get_if<FramesTraced>(&event)) {
      addFrames(traced->kind == TracedKind::kFrames ? streams : queues, std::move(*traced));
    }
    if (const auto* const began = std::get_if<RunStarted>(&event)) run.began = *began;
    if (const auto* const ended = std::get_if<RunEnded>(&event)) run.ended = *ended;
    if (std::holds_alternative<DiagnosticEnded>(event)) take();
  }
  run.isLastOpen = builder.isOpen();
  if (run.isLastOpen) take();
  return run;
}

}  // namespace quazor
