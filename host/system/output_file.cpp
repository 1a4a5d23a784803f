#include "host/system/output_file.h"

#include "contract/message_format.h"
#include "host/error/exit_code.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>
#include <system_error>

namespace quazor {

namespace {

constexpr mode_t kMode = 0666;  // reduced by the umask

[[noreturn]] void refuse(const std::filesystem::path& file, const std::string& why) {
  throw CommandError(ExitCode::kCannotWrite, "the output file '" + file.string() + "' cannot be written: " + why);
}

[[noreturn]] void refuse(const std::filesystem::path& file, int errorNumber) {
  refuse(file, std::strerror(errorNumber));
}

// Writes all of the text and closes the descriptor. Returns 0 or an error number.
int writeAndClose(int descriptor, std::string_view text) {
  int failure = 0;
  while (!text.empty() && failure == 0) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written >= 0) {
      text.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EINTR) {
      failure = errno;
    }
  }
  if (::close(descriptor) != 0 && failure == 0) failure = errno;
  return failure;
}

int writeDirectly(const std::filesystem::path& file, std::string_view text) {
  const int descriptor = ::open(file.c_str(), O_WRONLY | O_CLOEXEC);
  return descriptor < 0 ? errno : writeAndClose(descriptor, text);
}

int replaceFile(const std::filesystem::path& file, std::string_view text, bool exists, mode_t permissions) {
  std::filesystem::path temporary = file;
  temporary += formatMessage(".%@.tmp", ::getpid());
  const int descriptor = ::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode);
  if (descriptor < 0) return errno;
  int failure = exists && ::fchmod(descriptor, permissions) != 0 ? errno : 0;
  if (failure == 0) {
    failure = writeAndClose(descriptor, text);
  } else {
    ::close(descriptor);
  }
  if (failure == 0 && std::rename(temporary.c_str(), file.c_str()) != 0) failure = errno;
  if (failure != 0) ::unlink(temporary.c_str());
  return failure;
}

}  // namespace

void validateOutputFile(const std::filesystem::path& file) {
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) refuse(file, "it is a directory");
  if (exists && !S_ISREG(status.st_mode)) {
    if (::access(file.c_str(), W_OK) != 0) refuse(file, errno);
    return;
  }
  std::error_code error;
  std::filesystem::path directory = std::filesystem::weakly_canonical(file, error).parent_path();
  if (error) refuse(file, error.message());
  if (directory.empty()) directory = ".";
  if (::stat(directory.c_str(), &status) != 0) refuse(file, errno);
  if (!S_ISDIR(status.st_mode)) refuse(file, ENOTDIR);
  if (::access(directory.c_str(), W_OK | X_OK) != 0) refuse(file, errno);
}

void writeOutputFile(const std::filesystem::path& file, std::string_view text) {
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) refuse(file, "it is a directory");
  int failure = 0;
  if (exists && !S_ISREG(status.st_mode)) {
    failure = writeDirectly(file, text);
  } else {
    std::error_code error;
    const std::filesystem::path target = std::filesystem::weakly_canonical(file, error);
    failure = replaceFile(error ? file : target, text, exists, status.st_mode & 07777U);
  }
  if (failure != 0) refuse(file, failure);
}

}  // namespace quazor
