#include "host/record/record_file.h"

#include "base/json/json_limits.h"
#include "base/json/json_line.h"
#include "base/text/input_error.h"
#include "host/error/exit_code.h"
#include "host/model/record_builder.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"
#include "host/system/own_descriptor.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <optional>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

[[noreturn]] void refuseLine(const std::filesystem::path& file, std::uint64_t line, const std::string& why) {
  throw RecordDefect(ExitCode::kCannotRead,
                     "the record '" + file.string() + "', line " + std::to_string(line) + ": " + why);
}

// A descriptor that is closed at the end.
class Descriptor {
 public:
  explicit Descriptor(int number) : number_(number) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor() {
    if (number_ >= 0) ::close(number_);
  }

  int number() const { return number_; }

 private:
  const int number_;
};

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

RunEvent eventInLine(const std::filesystem::path& file, std::uint64_t sequence, const std::string& line) {
  try {
    Json json = parseJsonLine(line);
    if (sequence == 0) {
      const Json& format = memberOf(json, "record");
      if (!format.is_number_unsigned() || format < kFirstRecordFormat || format > kRecordFormat) {
        throw InputError("the record has format " + format.dump() + ", but this program reads formats " +
                         std::to_string(kFirstRecordFormat) + " to " + std::to_string(kRecordFormat));
      }
      if (format == kFirstRecordFormat) addWhatFormat1Lacks(json);
    }
    if (memberOf(json, "sequence") != sequence) {
      throw InputError("the sequence number is " + memberOf(json, "sequence").dump() + " instead of " +
                       std::to_string(sequence) + "; a line is missing or has been moved");
    }
    return eventFrom(json);
  } catch (const InputError& problem) {
    refuseLine(file, sequence + 1, problem.what());
  }
}

}  // namespace

std::string recordLine(const RunEvent& event, std::uint64_t sequence) {
  Json line = {{"sequence", sequence}};
  if (sequence == 0) line["record"] = kRecordFormat;
  line.update(eventJson(event));
  return line.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
}

RecordWriter::RecordWriter(std::filesystem::path file, Unfinished unfinished) : file_(std::move(file)) {
  if (unfinished == Unfinished::kReplace) {
    create(file_, unfinished);
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
  // Resolves a symbolic link, because a rename would replace the link itself.
  const std::filesystem::path canonical = std::filesystem::weakly_canonical(file_, error);
  create(error ? file_ : canonical, unfinished);
}

void RecordWriter::refuse(const std::string& why) const {
  throw CommandError(ExitCode::kCannotWrite, "the record '" + file_.string() + "' cannot be written: " + why);
}

void RecordWriter::create(const std::filesystem::path& target, Unfinished unfinished) {
  try {
    ReplacementFile created(target);
    if (const int failure = unfinished == Unfinished::kReplace ? created.putInPlace(true) : replace(target, created);
        failure != 0) {
      refuse(std::strerror(failure));
    }
    descriptor_ = ::fcntl(created.descriptor(), F_DUPFD_CLOEXEC, 0);  // keeps the lock
  } catch (const std::system_error& problem) {
    refuse(std::strerror(problem.code().value()));
  }
}

// Puts the new file in the place of a record that nobody is writing. Returns 0 or an error number.
int RecordWriter::replace(const std::filesystem::path& target, ReplacementFile& created) const {
  for (;;) {
    const Descriptor old(::open(target.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    if (old.number() >= 0) {
      if (::flock(old.number(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK)
        refuse("another process is writing it");
      if (!isSameFile(old.number(), target)) continue;  // replaced in the meantime
    }
    struct stat status {};
    const bool exists = ::lstat(target.c_str(), &status) == 0;
    if (exists && created.inherit(status) == EPERM && status.st_uid != ::geteuid()) refuse(kOfAnotherUser);
    const int failure = created.putInPlace(exists);
    if (failure != EEXIST) return failure;  // otherwise created in the meantime
  }
}

RecordWriter::~RecordWriter() { ::close(descriptor_); }

void RecordWriter::onEvent(const RunEvent& event, const std::string& line) {
  ++taken_;
  if (!problem_.empty()) return;
  if (line.size() - 1 > kMaxLine) {
    problem_ = "an event takes more than " + std::to_string(kMaxLine >> 20U) + " MiB";
    return;
  }
  write(line);
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

StoredRecord readRecord(const std::filesystem::path& file) {
  std::ifstream stream(file, std::ios::binary);
  std::error_code ignored;
  if (!stream || std::filesystem::is_directory(file, ignored)) {
    throw CommandError(ExitCode::kCannotRead, "the record '" + file.string() + "' cannot be read: " +
                                                  (stream ? "it is a directory" : std::strerror(errno)));
  }
  StoredRecord stored;
  std::string line;
  while (readLine(stream, line)) {
    if (stream.eof()) {
      stored.cutOff = true;
      break;
    }
    stored.events.push_back(eventInLine(file, stored.events.size(), line));
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

RecordedRun runIn(const std::filesystem::path& file) {
  const StoredRecord stored = readRecord(file);
  RecordedRun run;
  RecordBuilder builder;
  for (const RunEvent& event : stored.events) {
    builder.onEvent(event);
    if (const auto* const began = std::get_if<RunStarted>(&event)) run.began = *began;
    if (const auto* const ended = std::get_if<RunEnded>(&event)) run.ended = *ended;
    if (std::holds_alternative<DiagnosticEnded>(event)) run.records.push_back(builder.takeRecord());
  }
  if (builder.isOpen()) run.records.push_back(builder.takeRecord());
  return run;
}

}  // namespace quazor
