#include "host/system/child_process.h"

#include "host/system/write_signals.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

// High enough to avoid descriptors that a plug-in opens, or closes by mistake.
constexpr int kConnection = 250;

[[noreturn]] void refuse(const char* what) { throw std::system_error(errno, std::generic_category(), what); }

// A pipe from the child; reading does not block. Closes the ends that it still has.
// Thread: the one that made it.
class Pipe {
 public:
  Pipe() {
    if (::pipe2(ends_, O_CLOEXEC) != 0) refuse("making a pipe");
    ::fcntl(ends_[0], F_SETFL, O_NONBLOCK);
  }
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;
  ~Pipe() {
    if (ends_[0] >= 0) ::close(ends_[0]);
    ::close(ends_[1]);
  }

  int writeEnd() const { return ends_[1]; }
  int takeReadEnd() { return std::exchange(ends_[0], -1); }

 private:
  int ends_[2] = {-1, -1};
};

// The last descriptor if the limit on descriptors is lower than kConnection.
int numberOfConnection() {
  rlimit limit{};
  ::getrlimit(RLIMIT_NOFILE, &limit);
  return static_cast<int>(std::min<rlim_t>(kConnection, limit.rlim_cur - 1));
}

// What PR_GET_DUMPABLE told when it was first asked for.
int isParentDumpable() {
  static const int dumpable = ::prctl(PR_GET_DUMPABLE);
  return dumpable;
}

// Returns the descriptor of the child's end of the connection.
int becomeChild(const WatchedSignals& signals, const Pipe& connection, const Pipe& output,
                std::optional<std::uint64_t> memory) {
  ::setsid();  // detaches the child from its parent's terminal
  ::prctl(PR_SET_DUMPABLE, isParentDumpable());
  const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
  ::dup2(nothing, STDIN_FILENO);
  ::dup2(output.writeEnd(), STDOUT_FILENO);
  ::dup2(output.writeEnd(), STDERR_FILENO);
  const int number = numberOfConnection();
  ::dup3(connection.writeEnd(), number, O_CLOEXEC);
  ::syscall(SYS_close_range, 3, number - 1, 0);
  ::syscall(SYS_close_range, number + 1, ~0U, 0);
  if (memory) {
    const rlimit limit{*memory, *memory};
    ::setrlimit(RLIMIT_AS, &limit);
  }
  signals.restore();
  restoreWriteSignals();
  return number;
}

// An exception must terminate the child: it must not propagate to callers that belong to the parent's copy.
void doWork(const std::function<void(int)>& body, int connection) noexcept { body(connection); }

}  // namespace

ChildProcess::ChildProcess(const WatchedSignals& signals, const std::function<void(int)>& body,
                           std::optional<std::uint64_t> memory, IsCleanupProcess isCleanupProcess) {
  Pipe connection;
  Pipe output;
  std::fflush(nullptr);
  // From now on other processes of the user, such as the child, may neither trace this one nor open its descriptors.
  isParentDumpable();
  ::prctl(PR_SET_DUMPABLE, 0);
  const auto child = [&] {
    doWork(body, becomeChild(signals, connection, output, memory));
    ::_exit(EXIT_SUCCESS);
  };
  guard_.emplace(child, isCleanupProcess);
  connection_ = connection.takeReadEnd();
  output_ = output.takeReadEnd();
}

ChildProcess::~ChildProcess() {
  ::close(connection_);
  ::close(output_);
}

}  // namespace quazor
