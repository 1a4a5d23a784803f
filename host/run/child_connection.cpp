#include "host/run/child_connection.h"

#include "base/json/json_limits.h"
#include "base/json/json_line.h"
#include "base/text/input_error.h"
#include "contract/value.h"

#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

std::string secondsText(std::chrono::nanoseconds time) {
  return defaultText(std::chrono::duration<double>(time).count()) + " s";
}

}  // namespace

ConnectionWriter::ConnectionWriter(int descriptor, std::string token, SharedCounter& lost)
    : descriptor_(descriptor), token_(std::move(token)), lost_(lost), owner_(::getpid()) {
  ::fstat(descriptor_, &connection_);
}

bool ConnectionWriter::isOverwritten() const {
  struct stat now {};
  return ::fstat(descriptor_, &now) != 0 || now.st_dev != connection_.st_dev || now.st_ino != connection_.st_ino;
}

// Its exit code says nothing: a plug-in may choose any.
void ConnectionWriter::endWithout() const {
  lost_.set(1);
  ::_exit(EXIT_FAILURE);
}

void ConnectionWriter::say(const Json& json) const {
  if (::getpid() != owner_) ::_exit(EXIT_FAILURE);
  if (isOverwritten()) endWithout();
  const std::string line = token_ + json.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
  std::string_view left = line;
  while (!left.empty()) {
    const ssize_t written = ::write(descriptor_, left.data(), left.size());
    if (written < 0 && errno != EINTR) endWithout();
    if (written > 0) left.remove_prefix(static_cast<std::size_t>(written));
  }
}

Json documentIn(std::string_view line, std::string_view token) {
  if (!line.starts_with(token)) throw InputError("the line does not begin with the connection's token");
  return parseJsonLine(line.substr(token.size()));
}

bool endedWell(const Supervised& supervised) {
  return supervised.how == SupervisionEnd::kEnded && supervised.end && !supervised.end->bySignal &&
         supervised.end->number == 0;
}

DiagnosticErrorPtr errorOf(const Supervised& supervised, const std::string& during, std::chrono::nanoseconds deadline) {
  const std::string stuck = supervised.end ? std::string() : "; its process could not be killed";
  switch (supervised.how) {
    case SupervisionEnd::kDeadline:
      return hostError(HostErrorCode::kDeadline, during + " exceeded its deadline of " + secondsText(deadline) + stuck);
    case SupervisionEnd::kInterrupted:
      return hostError(HostErrorCode::kInterrupted, during + " was interrupted" + stuck);
    case SupervisionEnd::kLineTooLong:
      return hostError(HostErrorCode::kConnectionLost, during + " wrote more than " + std::to_string(kMaxLine >> 20U) +
                                                           " MiB in one line on its process's connection to quazor" +
                                                           stuck);
    case SupervisionEnd::kGuardLost:
      return hostError(HostErrorCode::kConnectionLost, during + " lost the process that guards its own" + stuck);
    case SupervisionEnd::kConnectionLost: break;
    case SupervisionEnd::kEnded: {
      const ProcessEnd& end = *supervised.end;
      if (end.bySignal) {
        return hostError(HostErrorCode::kCrashed, during + " crashed: its process was terminated by " + textOf(end));
      }
      if (supervised.lostConnection) break;
      return hostError(HostErrorCode::kExited, during + " ended its own process with " + textOf(end));
    }
  }
  return hostError(HostErrorCode::kConnectionLost,
                   during + " closed or overwrote its process's connection to quazor" + stuck);
}

}  // namespace quazor
