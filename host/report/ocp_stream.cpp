#include "host/report/ocp_stream.h"

#include "host/text/timestamp.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

std::string_view severityOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError: return "ERROR";
    case LogLevel::kDebug: return "DEBUG";
    case LogLevel::kDefault: break;
  }
  return "INFO";
}

}  // namespace

OcpStream::OcpStream(std::string& out, const std::vector<LogLine>& log, Date begin)
    : out_(out), log_(log), last_(begin) {
  write("schemaVersion", {{"major", 2}, {"minor", 0}}, begin);
}

void OcpStream::addToRun(const char* key, Json artifact, Date date) {
  // Log lines follow the start of the run even if they are older.
  if (number_ > 1) writeLogUntil(date);
  write("testRunArtifact", {{key, std::move(artifact)}}, date);
}

void OcpStream::addToStep(const char* step, const char* key, Json artifact, Date date) {
  writeLogUntil(date);
  write("testStepArtifact", {{"testStepId", step}, {key, std::move(artifact)}}, date);
}

void OcpStream::end(const char* status, const char* result, Date date) {
  while (logged_ < log_.size()) writeLogLine();
  write("testRunArtifact", {{"testRunEnd", {{"status", status}, {"result", result}}}}, date);
}

void OcpStream::writeLogUntil(Date date) {
  while (logged_ < log_.size() && log_[logged_].date < date) writeLogLine();
}

void OcpStream::writeLogLine() {
  const LogLine& line = log_[logged_++];
  write("testRunArtifact", {{"log", {{"severity", severityOf(line.level)}, {"message", line.text}}}}, line.date);
}

void OcpStream::write(const char* key, Json content, Date date) {
  last_ = std::max(last_, date);
  const Json line = {{key, std::move(content)}, {"sequenceNumber", number_++}, {"timestamp", timestampText(last_)}};
  out_ += line.dump(-1, ' ', false, Json::error_handler_t::replace);
  out_ += '\n';
}

}  // namespace quazor
