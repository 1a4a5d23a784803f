#include "host/plugin/shared_object.h"

#include "base/text/input_error.h"

#include <elf.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <system_error>

namespace quazor {

namespace {

constexpr const char* kTruncated = "is a truncated shared object";

bool readAt(std::ifstream& file, std::uint64_t offset, void* bytes, std::size_t count) {
  file.seekg(static_cast<std::streamoff>(offset));
  file.read(static_cast<char*>(bytes), static_cast<std::streamsize>(count));
  return file.good();
}

bool isWithin(std::uint64_t offset, std::uint64_t count, std::uint64_t size) {
  return offset <= size && count <= size - offset;
}

// True if the file contains every segment that its headers list.
bool hasAllSegments(std::ifstream& file, std::uint64_t size) {
  Elf64_Ehdr header;
  if (!readAt(file, 0, &header, sizeof header)) return false;
  if (header.e_phentsize != sizeof(Elf64_Phdr)) return true;  // left to the linker
  for (std::uint64_t i = 0; i < header.e_phnum; ++i) {
    const std::uint64_t offset = header.e_phoff + i * sizeof(Elf64_Phdr);
    Elf64_Phdr segment;
    if (!isWithin(offset, sizeof segment, size) || !readAt(file, offset, &segment, sizeof segment)) return false;
    if (segment.p_type == PT_LOAD && !isWithin(segment.p_offset, segment.p_filesz, size)) return false;
  }
  return true;
}

}  // namespace

void validateSharedObject(const std::filesystem::path& path) {
  std::error_code error;
  const std::filesystem::file_status status = std::filesystem::status(path, error);
  if (status.type() == std::filesystem::file_type::not_found) throw InputError("does not exist");
  if (error) throw InputError("cannot be read: " + error.message());
  if (std::filesystem::is_directory(status)) throw InputError("is a directory");
  if (!std::filesystem::is_regular_file(status)) throw InputError("is not a file");
  const std::uint64_t size = std::filesystem::file_size(path, error);
  if (error) throw InputError("cannot be read: " + error.message());
  std::ifstream file(path, std::ios::binary);
  if (!file) throw InputError(std::string("cannot be read: ") + std::strerror(errno));
  unsigned char identity[EI_NIDENT] = {};
  if (!readAt(file, 0, identity, SELFMAG) || std::memcmp(identity, ELFMAG, SELFMAG) != 0) {
    throw InputError("is not a shared object");
  }
  if (!readAt(file, 0, identity, EI_NIDENT)) throw InputError(kTruncated);
  if (identity[EI_CLASS] != ELFCLASS64) return;  // another architecture: left to the linker
  if (!hasAllSegments(file, size)) throw InputError(kTruncated);
}

}  // namespace quazor
