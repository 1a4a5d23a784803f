// SystemLog: log lines for the system's own log.
#pragma once

#include "frame/log_channel.h"

#include <functional>
#include <string>
#include <string_view>

namespace quazor {

// Sends each line to the system journal, in the journal's native protocol
// (https://systemd.io/JOURNAL_NATIVE_PROTOCOL/): one datagram with the fields MESSAGE, PRIORITY, SYSLOG_IDENTIFIER
// ("quazor"), QUAZOR_SUBSYSTEM and QUAZOR_CATEGORY. Where there is no journal the line goes to syslog(3), as
// "category: text". Each line is tried anew, so that a journal that is restarted is found again.
class SystemLog final : public LogBackend {
 public:
  // Texts are cut to this many bytes, between characters: a datagram has to hold them.
  static constexpr std::size_t kLongestText = 48 * 1024;

  // Stands in for syslog(3) in tests. `priority` is a level of syslog(3): LOG_ERR, LOG_NOTICE or LOG_DEBUG.
  using Syslog = std::function<void(int priority, const std::string& line)>;

  SystemLog();
  // `socket_path` is where the journal listens; at most 107 bytes, as the system has it, else it counts as absent.
  SystemLog(std::string_view socket_path, Syslog syslog);
  ~SystemLog() override;

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  bool sendToJournal(std::string_view datagram) const;

  const std::string socket_path_;
  const Syslog syslog_;
  const int socket_;  // -1 when the system refused one
};

}  // namespace quazor
