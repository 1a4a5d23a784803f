#include "host/system/replacement_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

namespace fs = std::filesystem;

constexpr mode_t kMode = 0666;    // reduced by the umask
constexpr mode_t kModes = 07777;  // all that chmod(2) sets
constexpr int kMaxAttempts = 100;
constexpr std::string_view kEnd = ".tmp";

std::string beginningOfName(const fs::path& target) { return "." + target.filename().string() + ".quazor-"; }

fs::path folderOf(const fs::path& target) { return target.has_parent_path() ? target.parent_path() : fs::path("."); }

bool isNameOf(std::string_view name, std::string_view beginning) {
  if (name.size() <= beginning.size() + kEnd.size() || !name.starts_with(beginning) || !name.ends_with(kEnd))
    return false;
  const std::string_view number = name.substr(beginning.size(), name.size() - beginning.size() - kEnd.size());
  return number.find_first_not_of("0123456789") == std::string_view::npos;
}

// Removes the file if no living process has locked it.
void removeIfLeftOver(const fs::path& file) {
  struct stat status {};
  if (::lstat(file.c_str(), &status) != 0) return;
  if (!S_ISREG(status.st_mode)) {
    ::unlink(file.c_str());  // somebody planted it: it cannot have been made here
    return;
  }
  const int descriptor = ::open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
  if (descriptor < 0) return;
  if (::flock(descriptor, LOCK_EX | LOCK_NB) == 0 && isSameFile(descriptor, file)) ::unlink(file.c_str());
  ::close(descriptor);
}

}  // namespace

bool isSameFile(int descriptor, const fs::path& file) {
  struct stat open {};
  struct stat named {};
  return ::fstat(descriptor, &open) == 0 && ::lstat(file.c_str(), &named) == 0 && open.st_dev == named.st_dev &&
         open.st_ino == named.st_ino;
}

ReplacementFile::ReplacementFile(fs::path target)
    : target_(std::move(target)),
      name_(folderOf(target_) / (beginningOfName(target_) + std::to_string(::getpid()) + std::string(kEnd))) {
  removeLeftOver();
  for (int i = 0; i < kMaxAttempts; ++i) {
    if (create()) return;
    if (errno != EEXIST) break;
    removeIfLeftOver(name_);
  }
  throw std::system_error(errno, std::generic_category());
}

ReplacementFile::~ReplacementFile() {
  if (!isInPlace_) ::unlink(name_.c_str());
  ::close(descriptor_);
}

// Removes what earlier processes left behind.
void ReplacementFile::removeLeftOver() const {
  const std::string beginning = beginningOfName(target_);
  std::error_code ignored;
  for (fs::directory_iterator entry(folderOf(target_), ignored); entry != fs::directory_iterator();
       entry.increment(ignored)) {
    if (isNameOf(entry->path().filename().string(), beginning)) removeIfLeftOver(entry->path());
  }
}

// Returns false with errno; EEXIST if a file of that name is there.
bool ReplacementFile::create() {
  descriptor_ = ::open(name_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode);
  if (descriptor_ < 0) return false;
  // Another process may just be looking whether this file is a leftover, and may have removed it.
  const bool isLocked = ::flock(descriptor_, LOCK_EX | LOCK_NB) == 0 || errno != EWOULDBLOCK;
  if (isLocked && isSameFile(descriptor_, name_)) return true;
  ::close(descriptor_);
  errno = EEXIST;
  return false;
}

int ReplacementFile::inherit(const struct stat& replaced) const {
  struct stat own {};
  if (::fstat(descriptor_, &own) != 0) return errno;
  mode_t mode = replaced.st_mode & kModes;
  if (own.st_uid != replaced.st_uid) {
    if (::fchown(descriptor_, replaced.st_uid, replaced.st_gid) != 0) return errno;
  } else if (own.st_gid != replaced.st_gid && ::fchown(descriptor_, own.st_uid, replaced.st_gid) != 0) {
    mode &= ~mode_t{S_IRWXG | S_ISGID};  // they were meant for another group
  }
  return ::fchmod(descriptor_, mode) == 0 ? 0 : errno;
}

int ReplacementFile::putInPlace(bool mayReplace) {
  bool isDone = false;
  if (!mayReplace) {
    isDone = ::renameat2(AT_FDCWD, name_.c_str(), AT_FDCWD, target_.c_str(), RENAME_NOREPLACE) == 0;
    if (!isDone && errno != EINVAL && errno != ENOSYS) return errno;  // these two: the file system cannot do it
  }
  if (!isDone && std::rename(name_.c_str(), target_.c_str()) != 0) return errno;
  isInPlace_ = true;
  return 0;
}

}  // namespace quazor
