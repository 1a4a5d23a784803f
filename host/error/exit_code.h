// What quazor tells its caller by its exit code, and the exception that carries a refusal there.
// docs/exit_codes.md is the public list.
#pragma once

#include "base/text/input_error.h"

#include <string>

namespace quazor {

// The codes from 64 on are those of the system's sysexits.h.
enum class ExitCode : int {
  kAllPassed = 0,
  kFailed = 1,         // a diagnostic failed its limits: the hardware's
  kError = 2,          // a diagnostic ended in an error: not known what the hardware is like
  kUsage = 64,         // the command line asks for what there is not
  kCannotRead = 66,    // a plug-in, scenario or profile cannot be read, loaded or used
  kInternal = 70,      // our own fault
  kCannotWrite = 73,   // the report cannot be written
  kInterrupted = 130,  // by Ctrl-C
};

// A request that is refused before anything has been touched. what() is one clear sentence for the user.
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
