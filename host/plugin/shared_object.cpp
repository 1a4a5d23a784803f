#include "host/plugin/shared_object.h"

#include "base/text/input_error.h"

#include <elf.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
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

// What decides whether a machine can execute a file; it is at the beginning of Elf32_Ehdr and of Elf64_Ehdr.
struct Architecture {
  unsigned char size = ELFCLASSNONE;  // of an address
  unsigned char order = ELFDATANONE;  // of the bytes in a number
  std::uint16_t machine = EM_NONE;

  bool operator==(const Architecture&) const = default;
};

// Nothing if the file is too short.
std::optional<Architecture> architectureOf(std::ifstream& file) {
  unsigned char header[offsetof(Elf32_Ehdr, e_version)] = {};
  if (!readAt(file, 0, header, sizeof header)) return std::nullopt;
  const unsigned first = header[offsetof(Elf32_Ehdr, e_machine)];
  const unsigned second = header[offsetof(Elf32_Ehdr, e_machine) + 1];
  const unsigned machine = header[EI_DATA] == ELFDATA2MSB ? first << 8U | second : second << 8U | first;
  return Architecture{header[EI_CLASS], header[EI_DATA], static_cast<std::uint16_t>(machine)};
}

std::string nameOf(const Architecture& architecture) {
  struct Row {
    std::uint16_t machine;
    const char* name;
  };
  constexpr Row kNames[] = {{EM_X86_64, "x86-64"}, {EM_386, "x86"},   {EM_AARCH64, "AArch64"},  {EM_ARM, "ARM"},
                            {EM_RISCV, "RISC-V"},  {EM_MIPS, "MIPS"}, {EM_PPC64, "PowerPC 64"}, {EM_S390, "S/390"}};
  const auto* const found = std::find_if(std::begin(kNames), std::end(kNames), [&architecture](const Row& row) {
    return row.machine == architecture.machine;
  });
  std::string name = found == std::end(kNames) ? "machine " + std::to_string(architecture.machine) : found->name;
  if (architecture.size == ELFCLASS32) name += ", 32 bits";
  if (architecture.order == ELFDATA2MSB) name += ", big-endian";
  return name;
}

// The architecture of this program; nothing if it cannot be read.
std::optional<Architecture> ownArchitecture() {
  std::ifstream program("/proc/self/exe", std::ios::binary);
  return architectureOf(program);
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
  unsigned char identity[SELFMAG] = {};
  if (!readAt(file, 0, identity, SELFMAG) || std::memcmp(identity, ELFMAG, SELFMAG) != 0) {
    throw InputError("is not a shared object");
  }
  const std::optional<Architecture> architecture = architectureOf(file);
  if (!architecture) throw InputError(kTruncated);
  // Of such a file the dynamic linker says that it does not exist.
  if (const std::optional<Architecture> own = ownArchitecture(); own && *architecture != *own) {
    throw InputError("is built for another architecture (" + nameOf(*architecture) + ") than quazor (" + nameOf(*own) +
                     ")");
  }
  if (architecture->size != ELFCLASS64) return;  // left to the linker
  if (!hasAllSegments(file, size)) throw InputError(kTruncated);
}

}  // namespace quazor
