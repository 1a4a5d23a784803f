#include "backends/threads/system_log.h"

#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <utility>

namespace quazor {

namespace {

constexpr char kIdentifier[] = "quazor";

int priorityOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError: return LOG_ERR;
    case LogLevel::kDefault: return LOG_NOTICE;
    case LogLevel::kDebug: return LOG_DEBUG;
  }
  return LOG_NOTICE;
}

// Cuts between UTF-8 characters: all but the first byte of one, three at most, are 10xxxxxx.
std::string_view cut(std::string_view text, std::size_t size) {
  if (text.size() <= size) return text;
  for (int i = 0; i < 3 && (static_cast<unsigned char>(text[size]) & 0xC0U) == 0x80U; ++i) --size;
  return text.substr(0, size);
}

// A value with line breaks carries its length, as 64 bits, little-endian; any other ends at the line's end.
void appendField(std::string& datagram, std::string_view name, std::string_view value) {
  datagram += name;
  if (value.find('\n') == std::string_view::npos) {
    datagram += '=';
  } else {
    datagram += '\n';
    for (unsigned shift = 0; shift < 64; shift += 8) {
      datagram += static_cast<char>(static_cast<std::uint64_t>(value.size()) >> shift & 0xFFU);
    }
  }
  datagram += value;
  datagram += '\n';
}

int openSocket() {
  const int descriptor = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (descriptor < 0) return -1;
  // A journal that has stopped reading must not stop the diagnostics: then the line is dropped.
  const timeval longest_wait{0, 100'000};
  ::setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &longest_wait, sizeof longest_wait);
  return descriptor;
}

void systemSyslog(int priority, const std::string& line) { ::syslog(priority | LOG_USER, "%s", line.c_str()); }

}  // namespace

SystemLog::SystemLog() : SystemLog("/run/systemd/journal/socket", systemSyslog) {
  ::openlog(kIdentifier, LOG_PID, LOG_USER);
}

SystemLog::SystemLog(std::string_view socket_path, Syslog syslog)
    : socket_path_(socket_path), syslog_(std::move(syslog)), socket_(openSocket()) {}

SystemLog::~SystemLog() {
  if (socket_ >= 0) ::close(socket_);
}

void SystemLog::write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  text = cut(text, kLongestText);
  std::string datagram;
  appendField(datagram, "MESSAGE", text);
  appendField(datagram, "PRIORITY", std::to_string(priorityOf(level)));
  appendField(datagram, "SYSLOG_IDENTIFIER", kIdentifier);
  appendField(datagram, "QUAZOR_SUBSYSTEM", subsystem);
  appendField(datagram, "QUAZOR_CATEGORY", category);
  if (!sendToJournal(datagram)) syslog_(priorityOf(level), std::string(category) + ": " + std::string(text));
}

// True when the journal is there, even if it did not take the line in time.
bool SystemLog::sendToJournal(std::string_view datagram) const {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (socket_ < 0 || socket_path_.size() >= sizeof address.sun_path) return false;
  std::memcpy(address.sun_path, socket_path_.data(), socket_path_.size());
  ssize_t sent = 0;
  do {
    sent = ::sendto(socket_, datagram.data(), datagram.size(), MSG_NOSIGNAL,
                    reinterpret_cast<const sockaddr*>(&address), sizeof address);
  } while (sent < 0 && errno == EINTR);
  return sent >= 0 || errno == EAGAIN;
}

}  // namespace quazor
