// The exit codes of quazor, and the exception for a command that cannot be executed.
// docs/exit_codes.md is the public list.
#pragma once

#include "base/text/input_error.h"

#include <string>

namespace quazor {

// The codes from 64 on are those of the system's sysexits.h.
enum class ExitCode : int {
  kAllPassed = 0,
  kFailed = 1,         // a diagnostic failed its limits: the hardware is faulty
  kError = 2,          // a diagnostic ended in an error: the state of the hardware is unknown
  kIncomplete = 3,     // a record is correct as far as it goes, but its run did not end
  kUsage = 64,         // the command line is invalid
  kCannotRead = 66,    // a plug-in, scenario or profile cannot be read, loaded or used
  kInternal = 70,      // a defect of quazor
  kCannotWrite = 73,   // the report cannot be written
  kInterrupted = 130,  // by Ctrl-C
};

// A command that is rejected before any device is accessed. what() is one user-readable sentence.
//
// Thread: any
class CommandError : public InputError {
 public:
  CommandError(ExitCode code, const std::string& text) : InputError(text), code_(code) {}

  ExitCode code() const { return code_; }

 private:
  ExitCode code_;
};

}  // namespace quazor
