#include "tests/fuzz/fuzzing.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

namespace quazor {

void require(bool holds, const char* rule) {
  if (holds) return;
  std::fprintf(stderr, "broken: %s\n", rule);
  std::abort();
}

MemoryFile::MemoryFile(const char* name)
    : descriptor_(memfd_create(name, 0)), path_("/proc/self/fd/" + std::to_string(descriptor_)) {
  require(descriptor_ >= 0, "a file in memory can be created");
}

MemoryFile::~MemoryFile() { ::close(descriptor_); }

void MemoryFile::write(const std::uint8_t* data, std::size_t size) const {
  require(::ftruncate(descriptor_, 0) == 0 && ::pwrite(descriptor_, data, size, 0) == static_cast<ssize_t>(size),
          "a file in memory can be written");
}

std::vector<std::string> linesOf(std::string_view text) {
  std::vector<std::string> lines;
  while (!text.empty()) {
    const std::size_t end = text.find('\n');
    lines.emplace_back(text.substr(0, end));
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
  }
  return lines;
}

void requireLine(std::string_view text) {
  require(!text.empty(), "a line says something");
  require(text.find('\n') == std::string_view::npos, "a line has no line end in it");
}

}  // namespace quazor
