// The connection on which a plug-in's process reports to quazor, and what its end means.
#pragma once

#include "host/error/host_error.h"
#include "host/system/shared_counter.h"
#include "host/system/supervision.h"

#include <nlohmann/json.hpp>

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include <sys/stat.h>
#include <sys/types.h>

namespace quazor {

// The child's end of the connection, which carries one JSON document per line.
//
// Every line begins with the connection's token, a randomIdentifier(), so that a plug-in that comes upon the descriptor
// and writes valid JSON to it is not believed.
// Thread: one at a time.
class ConnectionWriter {
 public:
  // `lost`, which is borrowed, becomes 1 when the connection is gone.
  ConnectionWriter(int descriptor, std::string token, SharedCounter& lost);

  // Ends the process if the connection was closed or overwritten, or if this is a copy of the process that a plug-in
  // made.
  void say(const nlohmann::ordered_json& json) const;

 private:
  bool isOverwritten() const;
  [[noreturn]] void endWithout() const;

  const int descriptor_;
  struct stat connection_ {};
  const std::string token_;
  SharedCounter& lost_;
  const pid_t owner_;
};

// The document of a line that begins with the token. Throws InputError if the line is not valid.
nlohmann::ordered_json documentIn(std::string_view line, std::string_view token);

// True if the process ended by itself with exit code 0. What it said counts only then.
bool endedWell(const Supervised& supervised);

// The error for a process that did not end well, or too early, while it was doing `during`, the subject of a sentence.
DiagnosticErrorPtr errorOf(const Supervised& supervised, const std::string& during, std::chrono::nanoseconds deadline);

}  // namespace quazor
