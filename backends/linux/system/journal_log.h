// JournalLog: log lines for the system's journal.
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "contract/log_channel.h"

#include <sys/socket.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

namespace quazor {

// Sends each line to the system's journal by its own protocol (https://systemd.io/JOURNAL_NATIVE_PROTOCOL/), with the
// fields MESSAGE, PRIORITY (a level of syslog(3)), SYSLOG_IDENTIFIER ("quazor"), SUBSYSTEM and CATEGORY. Texts go as
// they are: of any length, with line breaks, and also bytes that are no UTF-8, which journalctl shows with --all only.
//
// libsystemd's sd_journal_sendv() is not used because, measured with version 252, it blocks for as long as a journal
// does not read and returns success where there is no journal, so that lines could neither be dropped nor go to the
// fallback.
//
// Each line tries to connect again, so a restarted journal is found. A journal that has stopped reading costs one
// line a tenth of a second; from then on lines that it does not take at once are dropped, and their number is told
// when it takes lines again.
// Thread: any.
class JournalLog final : public LogBackend {
 public:
  static constexpr std::string_view kSocket = "/run/systemd/journal/socket";

  // `fallback` gets the lines for which there is no journal, or none that takes them; it must not be null. `socketPath`
  // is where the journal listens; one of more than 107 bytes is that of no socket.
  explicit JournalLog(std::shared_ptr<LogBackend> fallback, std::string_view socketPath = kSocket);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  enum class Outcome { kTaken, kDropped, kRefused };

  Outcome send(const std::string& fields, bool mayWait) const;
  Outcome sendAsFile(const std::string& fields, int flags) const;
  Outcome sendMessage(msghdr& message, int flags) const;
  void tellWhatWasDropped(std::string_view subsystem, std::string_view category);

  const std::shared_ptr<LogBackend> fallback_;
  const std::string socketPath_;
  const FileDescriptor socket_;            // none when the system refused one
  std::atomic<std::uint64_t> dropped_{0};  // lines, since the journal took one
};

}  // namespace quazor
