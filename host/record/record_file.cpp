#include "host/record/record_file.h"

#include "base/text/input_error.h"
#include "host/error/exit_code.h"
#include "host/model/record_builder.h"
#include "host/record/lossless_json.h"
#include "host/record/run_event_json.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <optional>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

constexpr mode_t kMode = 0666;  // reduced by the umask

[[noreturn]] void refuseLine(const std::filesystem::path& file, std::uint64_t line, const std::string& why) {
  throw CommandError(ExitCode::kCannotRead,
                     "the record '" + file.string() + "', line " + std::to_string(line) + ": " + why);
}

RunEvent eventInLine(const std::filesystem::path& file, std::uint64_t sequence, const std::string& line) {
  try {
    const Json json = Json::parse(line);
    if (sequence == 0) {
      const Json& format = memberOf(json, "record");
      if (format != kRecordFormat) {
        throw InputError("the record has format " + format.dump() + ", but this program reads format " +
                         std::to_string(kRecordFormat));
      }
    }
    if (memberOf(json, "sequence") != sequence) {
      throw InputError("the sequence number is " + memberOf(json, "sequence").dump() + " instead of " +
                       std::to_string(sequence) + "; a line is missing or has been moved");
    }
    return eventFrom(json);
  } catch (const Json::exception&) {
    refuseLine(file, sequence + 1, "not valid JSON");
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

RecordWriter::RecordWriter(std::filesystem::path file) : file_(std::move(file)) {
  const auto refuse = [this](const std::string& why) {
    throw CommandError(ExitCode::kCannotWrite, "the record '" + file_.string() + "' cannot be written: " + why);
  };
  std::error_code ignored;
  if (std::filesystem::is_directory(file_, ignored)) refuse("it is a directory");
  if (std::filesystem::exists(file_, ignored) && !std::filesystem::is_regular_file(file_, ignored)) {
    descriptor_ = ::open(file_.c_str(), O_WRONLY | O_CLOEXEC);
  } else {
    // Resolves a symbolic link, because the rename below would replace the link itself.
    std::error_code error;
    const std::filesystem::path canonical = std::filesystem::weakly_canonical(file_, error);
    const std::filesystem::path target = error ? file_ : canonical;
    std::filesystem::path temporary = target;
    temporary += "." + std::to_string(::getpid()) + ".tmp";
    descriptor_ = ::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode);
    if (descriptor_ >= 0 && std::rename(temporary.c_str(), target.c_str()) != 0) {
      const std::string why = std::strerror(errno);
      ::unlink(temporary.c_str());
      ::close(descriptor_);
      refuse(why);
    }
  }
  if (descriptor_ < 0) refuse(std::strerror(errno));
}

RecordWriter::~RecordWriter() { ::close(descriptor_); }

void RecordWriter::onEvent(const RunEvent& event, const std::string& line) {
  ++taken_;
  if (!problem_.empty()) return;
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
  while (std::getline(stream, line)) {
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
