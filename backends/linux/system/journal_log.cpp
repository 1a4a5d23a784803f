#include "backends/linux/system/journal_log.h"

#include "backends/log/system_log.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

namespace quazor {
namespace {

constexpr timeval kMaxWait{0, 100'000};

// A value with line breaks is preceded by its length, 64 bits little-endian; any other value ends at the line end.
void appendField(std::string& fields, std::string_view name, std::string_view value) {
  fields += name;
  if (value.find('\n') == std::string_view::npos) {
    fields += '=';
  } else {
    fields += '\n';
    for (unsigned shift = 0; shift < 64; shift += 8) {
      fields += static_cast<char>(static_cast<std::uint64_t>(value.size()) >> shift & 0xFFU);
    }
  }
  fields += value;
  fields += '\n';
}

std::string fieldsOf(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  std::string fields;
  appendField(fields, "MESSAGE", text);
  appendField(fields, "PRIORITY", std::to_string(SystemLog::priorityOf(level)));
  appendField(fields, "SYSLOG_IDENTIFIER", SystemLog::kIdentifier);
  appendField(fields, "SUBSYSTEM", subsystem);
  appendField(fields, "CATEGORY", category);
  return fields;
}

FileDescriptor openSocket() {
  FileDescriptor made(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  ::setsockopt(made.get(), SOL_SOCKET, SO_SNDTIMEO, &kMaxWait, sizeof kMaxWait);
  return made;
}

// A sealed file in memory; none if the system cannot create it.
FileDescriptor sealedFile(const std::string& content) {
  FileDescriptor file(::memfd_create("quazor log line", MFD_CLOEXEC | MFD_ALLOW_SEALING));
  std::size_t written = 0;
  while (written < content.size()) {
    const ssize_t size = ::write(file.get(), content.data() + written, content.size() - written);
    if (size <= 0) return {};
    written += static_cast<std::size_t>(size);
  }
  if (::fcntl(file.get(), F_ADD_SEALS, F_SEAL_SEAL | F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE) != 0) return {};
  return file;
}

}  // namespace

JournalLog::JournalLog(std::shared_ptr<LogBackend> fallback, std::string_view socketPath)
    : fallback_(std::move(fallback)), socketPath_(socketPath), socket_(openSocket()) {}

void JournalLog::write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  switch (send(fieldsOf(level, subsystem, category, text), dropped_.load() == 0)) {
    case Outcome::kTaken: tellWhatWasDropped(subsystem, category); break;
    case Outcome::kDropped: ++dropped_; break;
    case Outcome::kRefused: fallback_->write(level, subsystem, category, text); break;
  }
}

void JournalLog::tellWhatWasDropped(std::string_view subsystem, std::string_view category) {
  const std::uint64_t dropped = dropped_.exchange(0);
  if (dropped == 0) return;
  const std::string text = "the journal did not accept " + std::to_string(dropped) + " log lines before this one";
  if (send(fieldsOf(LogLevel::kError, subsystem, category, text), false) != Outcome::kTaken) dropped_ += dropped;
}

JournalLog::Outcome JournalLog::send(const std::string& fields, bool mayWait) const {
  const int flags = MSG_NOSIGNAL | (mayWait ? 0 : MSG_DONTWAIT);
  iovec part{const_cast<char*>(fields.data()), fields.size()};  // sendmsg() only reads it
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  const Outcome outcome = sendMessage(message, flags);
  const bool isTooLong = outcome == Outcome::kRefused && (errno == EMSGSIZE || errno == ENOBUFS);
  return isTooLong ? sendAsFile(fields, flags) : outcome;
}

// A message that exceeds a datagram is sent as a file, whose descriptor accompanies an empty datagram.
JournalLog::Outcome JournalLog::sendAsFile(const std::string& fields, int flags) const {
  const FileDescriptor file = sealedFile(fields);
  if (!file) return Outcome::kRefused;
  const int carried = file.get();
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof carried)] = {};
  msghdr message{};
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  cmsghdr* const header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof carried);
  std::memcpy(CMSG_DATA(header), &carried, sizeof carried);
  return sendMessage(message, flags);
}

// Returns kRefused and sets errno if there is no journal or it cannot accept the message.
JournalLog::Outcome JournalLog::sendMessage(msghdr& message, int flags) const {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (socketPath_.size() >= sizeof address.sun_path) {
    errno = ENAMETOOLONG;
    return Outcome::kRefused;
  }
  std::memcpy(address.sun_path, socketPath_.data(), socketPath_.size());
  message.msg_name = &address;
  message.msg_namelen = sizeof address;
  ssize_t sent = 0;
  do {
    sent = ::sendmsg(socket_.get(), &message, flags);
  } while (sent < 0 && errno == EINTR);
  message.msg_name = nullptr;  // `address` goes out of scope
  if (sent >= 0) return Outcome::kTaken;
  return errno == EAGAIN ? Outcome::kDropped : Outcome::kRefused;
}

}  // namespace quazor
