#include "host/system/output_file.h"

#include "host/error/exit_code.h"
#include "host/system/own_descriptor.h"
#include "host/system/replacement_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <string>
#include <system_error>

namespace quazor {

namespace {

[[noreturn]] void refuse(const std::filesystem::path& file, const std::string& why) {
  throw CommandError(ExitCode::kCannotWrite, "the output file '" + file.string() + "' cannot be written: " + why);
}

[[noreturn]] void refuse(const std::filesystem::path& file, int errorNumber) {
  refuse(file, std::strerror(errorNumber));
}

// Writes all of the text. Returns 0 or an error number.
int writeAll(int descriptor, std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written >= 0) {
      text.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

int writeAndClose(int descriptor, std::string_view text) {
  int failure = writeAll(descriptor, text);
  if (::close(descriptor) != 0 && failure == 0) failure = errno;
  return failure;
}

// Writes to a device, a pipe or a socket.
int writeDirectly(const std::filesystem::path& file, std::string_view text) {
  const int descriptor = ::open(file.c_str(), O_WRONLY | O_CLOEXEC);
  return descriptor < 0 ? errno : writeAndClose(descriptor, text);
}

int writeToOwn(int number, std::string_view text) {
  const int descriptor = writableCopyOf(number);
  return descriptor < 0 ? errno : writeAndClose(descriptor, text);
}

// `replaced` is null for a new file.
int replaceFile(const std::filesystem::path& file, std::string_view text, const struct stat* replaced) {
  try {
    ReplacementFile replacement(file);
    int failure = replaced == nullptr ? 0 : replacement.inherit(*replaced);
    if (failure == 0) failure = writeAll(replacement.descriptor(), text);
    return failure == 0 ? replacement.putInPlace(true) : failure;
  } catch (const std::system_error& problem) {
    return problem.code().value();
  }
}

}  // namespace

void validateOutputFile(const std::filesystem::path& file) {
  if (const std::optional<int> number = ownDescriptor(file)) {
    const int copy = writableCopyOf(*number);
    if (copy < 0) refuse(file, errno);
    ::close(copy);
    return;
  }
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) refuse(file, "it is a directory");
  if (exists && !S_ISREG(status.st_mode)) {
    if (::access(file.c_str(), W_OK) != 0) refuse(file, errno);
    return;
  }
  if (exists && ::geteuid() != 0 && status.st_uid != ::geteuid()) refuse(file, kOfAnotherUser);
  std::error_code error;
  std::filesystem::path directory = std::filesystem::weakly_canonical(file, error).parent_path();
  if (error) refuse(file, error.message());
  if (directory.empty()) directory = ".";
  if (::stat(directory.c_str(), &status) != 0) refuse(file, errno);
  if (!S_ISDIR(status.st_mode)) refuse(file, ENOTDIR);
  if (::access(directory.c_str(), W_OK | X_OK) != 0) refuse(file, errno);
}

void writeOutputFile(const std::filesystem::path& file, std::string_view text) {
  if (const std::optional<int> number = ownDescriptor(file)) {
    if (const int failure = writeToOwn(*number, text); failure != 0) refuse(file, failure);
    return;
  }
  struct stat status {};
  const bool exists = ::stat(file.c_str(), &status) == 0;
  if (exists && S_ISDIR(status.st_mode)) refuse(file, "it is a directory");
  int failure = 0;
  if (exists && !S_ISREG(status.st_mode)) {
    failure = writeDirectly(file, text);
  } else {
    std::error_code error;
    const std::filesystem::path target = std::filesystem::weakly_canonical(file, error);
    failure = replaceFile(error ? file : target, text, exists ? &status : nullptr);
    if (failure == EPERM && exists && status.st_uid != ::geteuid()) refuse(file, kOfAnotherUser);
  }
  if (failure != 0) refuse(file, failure);
}

}  // namespace quazor
