// ReplacementFile: a file that is written under another name and then put in its place at once.
#pragma once

#include <sys/stat.h>

#include <filesystem>

namespace quazor {

// A new file in the folder of its target, .NAME.quazor-PID.tmp, locked (flock) while this object lives. A process that
// was killed may have left such a file, which nobody locks any more; it is removed when the target is replaced again.
// Thread: one at a time.
class ReplacementFile {
 public:
  // `target` must not be a symbolic link, which would be replaced itself. Throws std::system_error if the file cannot
  // be created.
  explicit ReplacementFile(std::filesystem::path target);
  ReplacementFile(const ReplacementFile&) = delete;
  ReplacementFile& operator=(const ReplacementFile&) = delete;
  // Removes the file unless it is in place. Closes the descriptor.
  ~ReplacementFile();

  int descriptor() const { return descriptor_; }
  // Gives it the owner, group and permissions of the file that it will replace; the group gets no permissions if it
  // would be another one. Returns 0 or an error number: EPERM if the owner is another user and this one is not root.
  int inherit(const struct stat& replaced) const;
  // Puts it in place. Returns 0 or an error number: EEXIST if there is a file and `mayReplace` is false.
  int putInPlace(bool mayReplace);

 private:
  void removeLeftOver() const;
  bool create();

  const std::filesystem::path target_;
  const std::filesystem::path name_;
  int descriptor_ = -1;
  bool isInPlace_ = false;
};

// Why a file that belongs to another user is not replaced.
inline constexpr const char* kOfAnotherUser = "it belongs to another user; remove it first, or name another file";

// True if the descriptor is that of the file.
bool isSameFile(int descriptor, const std::filesystem::path& file);

}  // namespace quazor
