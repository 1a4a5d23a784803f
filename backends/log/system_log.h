// SystemLog: writes to the system log.
#pragma once

#include "contract/log_channel.h"

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>

namespace quazor {

// Passes each line to syslog(3) as "category: text", with the identifier kIdentifier.
// Thread: any.
class SystemLog final : public LogBackend {
 public:
  static constexpr char kIdentifier[] = "quazor";
  // Texts are truncated to this many bytes, between characters. syslog sends each line in one datagram and loses what
  // exceeds it.
  static constexpr std::size_t kMaxTextLength = std::size_t{48} * 1024;

  // Replaces syslog(3) in tests. `priority` is a syslog(3) level.
  using Syslog = std::function<void(int priority, const std::string& line)>;

  SystemLog();
  explicit SystemLog(Syslog syslog);

  // LOG_ERR, LOG_NOTICE or LOG_DEBUG.
  static int priorityOf(LogLevel level);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  const Syslog syslog_;
};

}  // namespace quazor
