// What the fuzzers share: assertions, files in memory, and the rules for an input that is refused.
#pragma once

#include "base/text/input_error.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Ends the program, after printing the broken rule, unless it holds. A fuzzer treats that as a crash.
void require(bool holds, const char* rule);

// A file in memory, for readers that take a path.
class MemoryFile {
 public:
  // `name` appears in /proc only.
  explicit MemoryFile(const char* name);
  MemoryFile(const MemoryFile&) = delete;
  MemoryFile& operator=(const MemoryFile&) = delete;
  ~MemoryFile();

  // Replaces the content.
  void write(const std::uint8_t* data, std::size_t size) const;

  const std::string& path() const { return path_; }

 private:
  int descriptor_;
  std::string path_;
};

inline std::string_view asText(const std::uint8_t* data, std::size_t size) {
  return {reinterpret_cast<const char*>(data), size};
}

// The lines of a text, without their line ends.
std::vector<std::string> linesOf(std::string_view text);

// Requires the text to be one line that says something.
void requireLine(std::string_view text);

// What `read` returns, or nothing if it throws the documented error, which says something. Any other exception ends the
// fuzzer.
template <class Read>
auto accepted(Read&& read) -> std::optional<decltype(read())> {
  try {
    return read();
  } catch (const InputError& problem) {
    require(!std::string_view(problem.what()).empty(), "an input is refused with a reason");
  }
  return std::nullopt;
}

// The same for readers of documents, whose reason is one line.
template <class Read>
auto acceptedDocument(Read&& read) {
  return accepted([&] {
    try {
      return read();
    } catch (const InputError& problem) {
      requireLine(problem.what());
      throw;
    }
  });
}

}  // namespace quazor
