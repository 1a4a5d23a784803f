#include "host/system/output_file.h"

#include "contract/message_format.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <system_error>

namespace quazor {

namespace {

constexpr mode_t kMode = 0666;  // less the umask

std::string errorNumberText() { return std::strerror(errno); }

// Writes all of the text and closes the descriptor; the empty text on success.
std::string writeAndClose(int descriptor, std::string_view text) {
  std::string problem;
  while (!text.empty() && problem.empty()) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written >= 0) {
      text.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EINTR) {
      problem = errorNumberText();
    }
  }
  if (::close(descriptor) != 0 && problem.empty()) problem = errorNumberText();
  return problem;
}

std::string writeDirectly(const std::filesystem::path& file, std::string_view text) {
  const int descriptor = ::open(file.c_str(), O_WRONLY | O_CLOEXEC);
  return descriptor < 0 ? errorNumberText() : writeAndClose(descriptor, text);
}

std::string replaceFile(const std::filesystem::path& file, std::string_view text, bool exists, mode_t permissions) {
  std::filesystem::path temporary = file;
  temporary += formatMessage(".%@.tmp", ::getpid());
  const int descriptor = ::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode);
  if (descriptor < 0) return errorNumberText();
  std::string problem;
  if (exists && ::fchmod(descriptor, permissions) != 0) problem = errorNumberText();
  if (problem.empty()) {
    problem = writeAndClose(descriptor, text);
  } else {
    ::close(descriptor);
  }
  if (problem.empty() && std::rename(temporary.c_str(), file.c_str()) != 0) problem = errorNumberText();
  if (!problem.empty()) ::unlink(temporary.c_str());
  return problem;
}

}  // namespace

std::string problemOfOutputFile(const std::filesystem::path& file) {
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) return "it is a directory";
  if (exists && !S_ISREG(status.st_mode)) return ::access(file.c_str(), W_OK) == 0 ? "" : errorNumberText();
  std::error_code error;
  std::filesystem::path directory = std::filesystem::weakly_canonical(file, error).parent_path();
  if (error) return error.message();
  if (directory.empty()) directory = ".";
  if (::stat(directory.c_str(), &status) != 0) return errorNumberText();
  if (!S_ISDIR(status.st_mode)) return std::strerror(ENOTDIR);
  return ::access(directory.c_str(), W_OK | X_OK) == 0 ? "" : errorNumberText();
}

std::string writeOutputFile(const std::filesystem::path& file, std::string_view text) {
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) return "it is a directory";
  if (exists && !S_ISREG(status.st_mode)) return writeDirectly(file, text);
  std::error_code error;
  const std::filesystem::path target = std::filesystem::weakly_canonical(file, error);
  return replaceFile(error ? file : target, text, exists, status.st_mode & 07777U);
}

}  // namespace quazor
