// Plug-ins that misbehave when they are loaded. MISBEHAVIOUR is the name of a function in this file,
// and DIAGNOSTIC that of the diagnostic.
#include "tests/misbehaving/misbehaviour.h"

#include <fcntl.h>
#include <sys/types.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>
#include <string_view>
#include <thread>

namespace quazor::misbehaving {

namespace {

[[maybe_unused]] void leave() { std::exit(0); }

[[maybe_unused]] void throwException() { throw std::runtime_error("the lamp is out"); }

// The size in bytes of the file named in the environment is the number of processes that loaded this plug-in.
[[maybe_unused]] void crashAfter(off_t times) {
  const int file = ::open(std::getenv("MISBEHAVIOUR_STATE"), O_CREAT | O_APPEND | O_WRONLY | O_CLOEXEC, 0600);
  if (::write(file, "x", 1) == 1 && ::lseek(file, 0, SEEK_END) > times) crash();
  ::close(file);
}

[[maybe_unused]] void crashAfterTheFirstTime() { crashAfter(1); }
[[maybe_unused]] void crashAfterTheSecondTime() { crashAfter(2); }

[[maybe_unused]] void abortLater() {
  std::thread([] {
    ::usleep(300'000);
    std::abort();
  }).detach();
}

[[maybe_unused]] void takeASecond() { ::sleep(1); }

[[maybe_unused]] void changeDirectory() {
  if (::chdir("/") != 0) crash();
}

// Claims to every descriptor that the command is refused, with exit code 0, and that it registers nothing.
[[maybe_unused]] void forgeScan() {
  constexpr std::string_view kLines =
      "{\"says\":\"refused\",\"code\":0,\"text\":\"nothing to do\"}\n{\"says\":\"registered\",\"registrations\":[]}\n";
  for (int descriptor = STDERR_FILENO + 1; descriptor < 1024; ++descriptor) {
    static_cast<void>(::write(descriptor, kLines.data(), kLines.size()) < 0);
  }
}

[[gnu::constructor]] void registerAll() {
  addDiagnostic(DIAGNOSTIC, {});
  MISBEHAVIOUR();
}

}  // namespace

}  // namespace quazor::misbehaving
