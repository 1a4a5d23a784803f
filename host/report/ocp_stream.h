// OcpStream: one test run in the output format of Open Compute Test & Validation, version 2.0, line by line.
#pragma once

#include "contract/value.h"
#include "host/model/run_log.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <string>
#include <vector>

namespace quazor {

// Numbers the lines and dates them: each is as late as it says, and never earlier than the line before it.
// Thread: one at a time.
class OcpStream {
 public:
  // Begins with the format's version. `out` and `log` are borrowed; lines are appended to `out`. The log's lines go out
  // in their order, each before the first artifact that is later, and belong to the run: what its steps were doing then
  // is told by the place alone.
  OcpStream(std::string& out, const std::vector<LogLine>& log, Date begin);

  void addToRun(const char* key, nlohmann::ordered_json artifact, Date date);
  void addToStep(const char* step, const char* key, nlohmann::ordered_json artifact, Date date);
  // Writes what is left of the log, and the end of the run.
  void end(const char* status, const char* result, Date date);

  // The date of the last line.
  Date last() const { return last_; }

 private:
  void writeLogUntil(Date date);
  void writeLogLine();
  void write(const char* key, nlohmann::ordered_json content, Date date);

  std::string& out_;
  const std::vector<LogLine>& log_;
  std::size_t logged_ = 0;  // lines of the log that are written
  std::size_t number_ = 0;  // of the next line
  Date last_;
};

}  // namespace quazor
