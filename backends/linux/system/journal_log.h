// JournalLog: writes to the systemd journal.
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

// Sends each line to the journal with its native protocol (https://systemd.io/JOURNAL_NATIVE_PROTOCOL/) and the fields
// MESSAGE, PRIORITY (a syslog(3) level), SYSLOG_IDENTIFIER ("quazor"), SUBSYSTEM and CATEGORY. Texts are sent
// unchanged: of any length, with line breaks, and with invalid UTF-8, which journalctl shows only with --all.
//
// libsystemd's sd_journal_sendv() is not used because, measured with version 252, it blocks while a journal does not
// read and reports success if there is no journal, so lines could neither be dropped nor go to the fallback.
//
// Each line is sent without a lasting connection, so a restarted journal is found. A journal that has stopped reading
// delays one line by a tenth of a second. After that, lines that it does not accept at once are dropped, and their
// number is logged when it accepts lines again.
// Thread: any.
class JournalLog final : public LogBackend {
 public:
  static constexpr std::string_view kSocket = "/run/systemd/journal/socket";

  // `fallback` receives the lines if there is no journal or it refuses them; it must not be null. `socketPath` is the
  // journal's socket; a path of more than 107 bytes is never one.
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
  const FileDescriptor socket_;            // none if the system refused one
  std::atomic<std::uint64_t> dropped_{0};  // the number of lines since the journal last accepted one
};

}  // namespace quazor
