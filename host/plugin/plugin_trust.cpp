#include "host/plugin/plugin_trust.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <deque>
#include <iterator>
#include <string>
#include <system_error>

namespace quazor {

namespace {

namespace fs = std::filesystem;

constexpr int kMaxLinks = 40;  // as many as the kernel follows
constexpr mode_t kOthersMayWrite = S_IWGRP | S_IWOTH;

// A file or folder that others than its owner may write.
struct WritablePlace {
  fs::path path;
  mode_t mode;
};

std::string octal(mode_t mode) {
  char text[] = "0000";
  for (int i = 3; i >= 0; --i, mode >>= 3U) text[i] = static_cast<char>('0' + (mode & 7U));
  return text;
}

// Follows a path as the kernel does, and checks every file, folder and link on the way.
// Thread: one at a time.
class PathCheck {
 public:
  explicit PathCheck(const std::vector<uid_t>& owners) : owners_(owners) {}

  // Returns false with errno if the path leads nowhere.
  bool follow(const fs::path& absolute) {
    enqueue(absolute.relative_path());
    fs::path at = absolute.root_path();
    if (!look(at)) return false;
    while (!names_.empty()) {
      const fs::path name = names_.front();
      names_.pop_front();
      if (name.empty() || name == ".") continue;
      if (name == "..") {
        at = at.parent_path();
        continue;
      }
      const fs::path next = at / name;
      if (!look(next)) return false;
      if (!S_ISLNK(status_.st_mode)) {
        at = next;
        continue;
      }
      std::error_code error;
      const fs::path target = fs::read_symlink(next, error);
      errno = error ? error.value() : ELOOP;
      if (error || ++links_ > kMaxLinks) return false;
      if (target.is_absolute()) at = target.root_path();
      enqueue(target.relative_path());
    }
    return true;
  }

  // In the order in which they were found.
  const std::vector<WritablePlace>& writable() const { return writable_; }

 private:
  void enqueue(const fs::path& names) { names_.insert(names_.begin(), names.begin(), names.end()); }

  // Returns false with errno if there is nothing.
  bool look(const fs::path& place) {
    if (::lstat(place.c_str(), &status_) != 0) return false;
    if (std::find(owners_.begin(), owners_.end(), status_.st_uid) == owners_.end()) {
      throw InputError(formatMessage(
          "may be changed by others: '%@' belongs to user %@, who is neither root, nor the user of quazor, nor the "
          "owner of the program; copy the plug-in to a folder of yours",
          place.string(), static_cast<std::uint64_t>(status_.st_uid)));
    }
    const mode_t mode = status_.st_mode;
    const bool isLink = S_ISLNK(mode);  // nobody can write to a link; its mode means nothing
    const bool isSticky = S_ISDIR(mode) && (mode & S_ISVTX) != 0;
    if (!isLink && !isSticky && (mode & kOthersMayWrite) != 0) {
      const bool isKnown = std::any_of(writable_.begin(), writable_.end(),
                                       [&place](const WritablePlace& other) { return other.path == place; });
      if (!isKnown) writable_.push_back({place, mode});
    }
    return true;
  }

  const std::vector<uid_t>& owners_;
  std::deque<fs::path> names_;  // still to be followed
  struct stat status_ {};       // of the last place
  int links_ = 0;
  std::vector<WritablePlace> writable_;
};

// A word for a shell.
std::string quoted(const std::string& text) {
  std::string word = "'";
  for (const char unit : text) word += unit == '\'' ? std::string("'\\''") : std::string(1, unit);
  return word + "'";
}

}  // namespace

std::vector<uid_t> trustedOwners() {
  std::vector<uid_t> owners = {0, ::geteuid()};
  struct stat program {};
  if (::stat("/proc/self/exe", &program) == 0) owners.push_back(program.st_uid);
  return owners;
}

void validateTrust(const fs::path& file, const std::vector<uid_t>& owners) {
  std::error_code error;
  const fs::path absolute = fs::absolute(file, error);
  PathCheck check(owners);
  if (error || !check.follow(absolute)) {
    const int why = error ? error.value() : errno;
    struct stat ignored {};
    // The kernel can reach files that a path does not lead to, for example by /proc/PID/fd.
    if (::stat(file.c_str(), &ignored) != 0) return;
    throw InputError(std::string("cannot be followed to its place, to see who may change it: ") + std::strerror(why));
  }
  const std::vector<WritablePlace>& writable = check.writable();
  if (writable.empty()) return;
  const auto mayEverybody = [](const WritablePlace& place) { return (place.mode & S_IWOTH) != 0; };
  std::string command = std::any_of(writable.begin(), writable.end(), mayEverybody) ? "chmod go-w" : "chmod g-w";
  for (const WritablePlace& place : writable) command += " " + quoted(place.path.string());
  const WritablePlace& first = writable.front();
  throw InputError(formatMessage("may be changed by others: %@ may write to '%@' (mode %@); this ends it: %@",
                                 mayEverybody(first) ? "everybody" : "its group", first.path.string(),
                                 octal(first.mode), command));
}

void requireTrustedPlugins(const std::vector<fs::path>& files) {
  const std::vector<uid_t> owners = trustedOwners();
  for (const fs::path& file : files) {
    try {
      validateTrust(file, owners);
    } catch (const InputError& problem) {
      throw CommandError(ExitCode::kCannotRead, "the plug-in '" + file.string() + "' " + problem.what());
    }
  }
}

}  // namespace quazor
