// A plug-in whose diagnostics misbehave when they are described.
#include "tests/misbehaving/misbehaviour.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

namespace quazor::misbehaving {

namespace {

// The first process that calls this creates the file named in the environment; the next one crashes.
void crashInTheNextProcess() {
  const int file = ::open(std::getenv("MISBEHAVIOUR_STATE"), O_CREAT | O_EXCL | O_CLOEXEC, 0600);
  if (file < 0) crash();
  ::close(file);
}

[[gnu::constructor]] void registerAll() {
  addDiagnostic("CrashWhenRunIsDescribed", {.inDescription = crashInTheNextProcess});
  addDiagnostic("CrashWhenDescribed", {.inDescription = crash});
  addDiagnostic("ExitWhenDescribed", {.inDescription = [] { std::exit(0); }});
  addDiagnostic("ThrowWhenDescribed", {.inDescription = [] { throw std::runtime_error("the lamp is out"); }});
}

}  // namespace

}  // namespace quazor::misbehaving
