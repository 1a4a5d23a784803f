#include "host/plugin/shared_object.h"

#include "base/text/input_error.h"
#include "contract/loading.h"

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
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

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

// The segments that the headers of a file list: none if their form is unknown, which is left to the linker. Nothing if
// the file is too short for them.
std::optional<std::vector<Elf64_Phdr>> segmentsOf(std::ifstream& file, std::uint64_t size) {
  Elf64_Ehdr header;
  if (!readAt(file, 0, &header, sizeof header)) return std::nullopt;
  std::vector<Elf64_Phdr> segments;
  if (header.e_phentsize != sizeof(Elf64_Phdr)) return segments;
  for (std::uint64_t i = 0; i < header.e_phnum; ++i) {
    const std::uint64_t offset = header.e_phoff + i * sizeof(Elf64_Phdr);
    Elf64_Phdr segment;
    if (!isWithin(offset, sizeof segment, size) || !readAt(file, offset, &segment, sizeof segment)) return std::nullopt;
    segments.push_back(segment);
  }
  return segments;
}

// True if the file contains every segment that its headers list.
bool hasAllSegments(std::ifstream& file, std::uint64_t size) {
  const std::optional<std::vector<Elf64_Phdr>> segments = segmentsOf(file, size);
  return segments && std::all_of(segments->begin(), segments->end(), [size](const Elf64_Phdr& one) {
           return one.p_type != PT_LOAD || isWithin(one.p_offset, one.p_filesz, size);
         });
}

constexpr std::uint64_t kMaxNotes = 65536;  // of one segment, in bytes; a linker writes some hundred

std::uint64_t aligned(std::uint64_t size) { return (size + 3) / 4 * 4; }

// True if the notes, one after the other, contain the one of QUAZOR_LOADED_ONLY_WHEN_NAMED.
bool haveNote(std::string_view notes) {
  constexpr std::string_view kOwner(kNoteOwner, sizeof kNoteOwner);  // with its zero, as in the file
  while (notes.size() >= sizeof(Elf64_Nhdr)) {
    Elf64_Nhdr header;
    std::memcpy(&header, notes.data(), sizeof header);
    notes.remove_prefix(sizeof header);
    const std::uint64_t size = aligned(header.n_namesz) + aligned(header.n_descsz);
    if (size > notes.size()) return false;
    if (header.n_type == kNoteLoadedOnlyWhenNamed && notes.substr(0, header.n_namesz) == kOwner) return true;
    notes.remove_prefix(size);
  }
  return false;
}

constexpr std::uint64_t kMaxDynamic = 65536;  // of the dynamic section, in bytes; a linker writes some hundred
constexpr std::uint64_t kMaxNames = 256ULL * 1024 * 1024;  // of dynamic symbols, in bytes

// The part of the file that is mapped at an address; nothing if none is.
std::optional<std::uint64_t> offsetOf(const std::vector<Elf64_Phdr>& segments, std::uint64_t address) {
  for (const Elf64_Phdr& one : segments) {
    if (one.p_type != PT_LOAD || address < one.p_vaddr || address - one.p_vaddr >= one.p_filesz) continue;
    return one.p_offset + (address - one.p_vaddr);
  }
  return std::nullopt;
}

// The text at a place of a string table; empty outside of it.
std::string textAt(const std::string& names, std::uint64_t at) {
  return at < names.size() ? std::string(names.c_str() + at) : std::string();
}

std::vector<std::string> separated(const std::string& text, char separator) {
  std::vector<std::string> parts(1);
  for (const char unit : text) {
    if (unit == separator) {
      parts.emplace_back();
    } else {
      parts.back() += unit;
    }
  }
  return parts;
}

// The dynamic section, and the strings that it refers to.
struct DynamicSection {
  std::vector<Elf64_Dyn> entries;
  std::string names;
};

DynamicSection dynamicSectionOf(std::ifstream& file, std::uint64_t size, const std::vector<Elf64_Phdr>& segments) {
  DynamicSection section;
  const auto found =
      std::find_if(segments.begin(), segments.end(), [](const Elf64_Phdr& one) { return one.p_type == PT_DYNAMIC; });
  if (found == segments.end() || found->p_filesz > kMaxDynamic) return section;
  for (std::uint64_t at = 0; at + sizeof(Elf64_Dyn) <= found->p_filesz; at += sizeof(Elf64_Dyn)) {
    Elf64_Dyn entry;
    if (!isWithin(found->p_offset, at + sizeof entry, size) ||
        !readAt(file, found->p_offset + at, &entry, sizeof entry) || entry.d_tag == DT_NULL) {
      break;
    }
    section.entries.push_back(entry);
  }
  const auto valueOf = [&section](Elf64_Sxword tag) {
    const auto entry = std::find_if(section.entries.begin(), section.entries.end(),
                                    [tag](const Elf64_Dyn& one) { return one.d_tag == tag; });
    return entry == section.entries.end() ? std::uint64_t{0} : entry->d_un.d_val;
  };
  const std::optional<std::uint64_t> names = offsetOf(segments, valueOf(DT_STRTAB));
  const std::uint64_t length = valueOf(DT_STRSZ);
  if (!names || length > kMaxNames || !isWithin(*names, length, size)) return section;
  section.names.resize(length);
  if (!readAt(file, *names, section.names.data(), length)) section.names.clear();
  return section;
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

bool isLoadedOnlyWhenNamed(const std::filesystem::path& path) {
  try {
    validateSharedObject(path);
  } catch (const InputError&) {
    return false;
  }
  std::error_code error;
  const std::uint64_t size = std::filesystem::file_size(path, error);
  std::ifstream file(path, std::ios::binary);
  const std::optional<std::vector<Elf64_Phdr>> segments = segmentsOf(file, size);
  if (error || !segments) return false;
  return std::any_of(segments->begin(), segments->end(), [&file, size](const Elf64_Phdr& one) {
    if (one.p_type != PT_NOTE || one.p_filesz > kMaxNotes || !isWithin(one.p_offset, one.p_filesz, size)) return false;
    std::string notes(one.p_filesz, '\0');
    return readAt(file, one.p_offset, notes.data(), notes.size()) && haveNote(notes);
  });
}

LinkProperties linkPropertiesOf(const std::filesystem::path& path) {
  std::error_code error;
  const std::uint64_t size = std::filesystem::file_size(path, error);
  std::ifstream file(path, std::ios::binary);
  const std::optional<std::vector<Elf64_Phdr>> segments = segmentsOf(file, size);
  if (error || !segments) throw InputError("cannot be read");
  LinkProperties found;
  for (const Elf64_Phdr& one : *segments) {
    if (one.p_type == PT_GNU_RELRO) found.protectsRelocations = true;
    if (one.p_type == PT_GNU_STACK && (one.p_flags & PF_X) != 0) found.hasExecutableStack = true;
  }
  const DynamicSection dynamic = dynamicSectionOf(file, size, *segments);
  for (const Elf64_Dyn& one : dynamic.entries) {
    const std::uint64_t value = one.d_un.d_val;
    if (one.d_tag == DT_BIND_NOW || (one.d_tag == DT_FLAGS && (value & DF_BIND_NOW) != 0) ||
        (one.d_tag == DT_FLAGS_1 && (value & DF_1_NOW) != 0)) {
      found.bindsNow = true;
    }
    if (one.d_tag == DT_TEXTREL || (one.d_tag == DT_FLAGS && (value & DF_TEXTREL) != 0)) {
      found.hasTextRelocations = true;
    }
    if (one.d_tag == DT_RUNPATH || one.d_tag == DT_RPATH) {
      for (std::string& entry : separated(textAt(dynamic.names, value), ':')) found.runPath.push_back(std::move(entry));
    }
  }
  constexpr std::string_view kStackCheck("\0__stack_chk_fail\0", 18);  // a whole name of the table
  found.hasStackProtector = dynamic.names.find(kStackCheck) != std::string::npos;
  return found;
}

}  // namespace quazor
