// Plug-ins that misbehave when they are loaded. MISBEHAVIOUR is the name of a function in this file.
#include "tests/misbehaving/misbehaviour.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

namespace quazor::misbehaving {

namespace {

[[maybe_unused]] void leave() { std::exit(0); }

[[maybe_unused]] void throwException() { throw std::runtime_error("the lamp is out"); }

// The size in bytes of the file named in the environment is the number of processes that loaded this plug-in.
[[maybe_unused]] void crashAfterTheFirstTime() {
  const int file = ::open(std::getenv("MISBEHAVIOUR_STATE"), O_CREAT | O_APPEND | O_WRONLY | O_CLOEXEC, 0600);
  if (::write(file, "x", 1) == 1 && ::lseek(file, 0, SEEK_END) > 1) crash();
  ::close(file);
}

[[gnu::constructor]] void registerAll() {
  addDiagnostic("LoadedWithMisbehaviour", {});
  MISBEHAVIOUR();
}

}  // namespace

}  // namespace quazor::misbehaving
