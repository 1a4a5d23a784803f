// Plug-ins that misbehave when they are loaded, each in its own way: MISBEHAVIOUR is the name of a function here.
#include "tests/misbehaving/misbehaviour.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

namespace quazor::misbehaving {

namespace {

[[maybe_unused]] void leave() { std::exit(0); }

[[maybe_unused]] void throwException() { throw std::runtime_error("the lamp is out"); }

// The file that the environment names has as many octets as there were processes that loaded this.
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
