#include "host/run/log_limit.h"

#include "host/text/timestamp.h"

#include <string>
#include <utility>
#include <variant>

namespace quazor {

bool LogCap::admits(std::size_t bytes) {
  if (leftOut_ > 0 || limit_.lines == 0 || bytes > limit_.bytes) {
    ++leftOut_;
    return false;
  }
  --limit_.lines;
  limit_.bytes -= bytes;
  return true;
}

void LimitedLog::onEvent(const RunEvent& event) {
  const auto* const logged = std::get_if<Logged>(&event);
  if (logged != nullptr) lastLine_ = logged->line.time;
  if (logged == nullptr || cap_.admits(logged->line.text.size())) {
    events_.onEvent(event);
  } else {
    leftOut_.set(cap_.leftOut());
  }
}

Logged leftOutLine(std::uint64_t count, std::chrono::nanoseconds time) {
  std::string text =
      std::to_string(count) + (count == 1 ? " more log line was" : " more log lines were") + " left out (--log-limit)";
  return {{time, LogLevel::kDefault, std::move(text), dateNow()}, true};
}

}  // namespace quazor
