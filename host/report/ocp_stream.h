// OcpStream: one test run in the output format of Open Compute Test & Validation, version 2.0, line by line.
#pragma once

#include "contract/value.h"
#include "host/model/run_log.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <string>
#include <vector>

namespace quazor {

// Numbers the lines and adds their time stamps. A line is never dated earlier than the previous one.
// Thread: one at a time.
class OcpStream {
 public:
  // Writes the format's version first. `out` and `log` are borrowed; lines are appended to `out`. Log lines are merged
  // in order of time and belong to the run rather than to a step.
  OcpStream(std::string& out, const std::vector<LogLine>& log, Date begin);

  void addToRun(const char* key, nlohmann::ordered_json artifact, Date date);
  void addToStep(const char* step, const char* key, nlohmann::ordered_json artifact, Date date);
  // Writes the remaining log lines and the end of the run.
  void end(const char* status, const char* result, Date date);

  // The date of the last line.
  Date last() const { return last_; }

 private:
  void writeLogUntil(Date date);
  void writeLogLine();
  void write(const char* key, nlohmann::ordered_json content, Date date);

  std::string& out_;
  const std::vector<LogLine>& log_;
  std::size_t logged_ = 0;  // the number of log lines written
  std::size_t number_ = 0;  // the sequence number of the next line
  Date last_;
};

}  // namespace quazor
