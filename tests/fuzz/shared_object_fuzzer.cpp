// Arbitrary bytes as a plug-in's file: it is accepted if and only if it is built for this program's architecture
// and contains every segment of its headers.
#include "host/plugin/shared_object.h"
#include "tests/fuzz/fuzzing.h"

#include <elf.h>

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <optional>
#include <random>
#include <string>

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

namespace quazor {
namespace {

__extension__ using Wide = unsigned __int128;

template <class T>
std::optional<T> readAs(const std::uint8_t* data, std::size_t size, Wide offset) {
  if (offset + sizeof(T) > size) return std::nullopt;
  T value;
  std::memcpy(&value, data + static_cast<std::size_t>(offset), sizeof value);
  return value;
}

bool hasSegments(const std::uint8_t* data, std::size_t size) {
  const auto header = readAs<Elf64_Ehdr>(data, size, 0);
  if (!header) return false;
  if (header->e_phentsize != sizeof(Elf64_Phdr)) return true;
  for (std::size_t i = 0; i < header->e_phnum; ++i) {
    const auto segment = readAs<Elf64_Phdr>(data, size, Wide{header->e_phoff} + i * sizeof(Elf64_Phdr));
    if (!segment) return false;
    if (segment->p_type == PT_LOAD && Wide{segment->p_offset} + segment->p_filesz > size) return false;
  }
  return true;
}

// The header of this program.
const std::string& ownHeader() {
  static const std::string header = [] {
    std::ifstream program("/proc/self/exe", std::ios::binary);
    std::string bytes(sizeof(Elf64_Ehdr), '\0');
    program.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    require(program.good(), "this program can be read");
    return bytes;
  }();
  return header;
}

bool isSharedObject(const std::uint8_t* data, std::size_t size) {
  if (size < offsetof(Elf64_Ehdr, e_version) || std::memcmp(data, ELFMAG, SELFMAG) != 0) return false;
  for (const std::size_t place : {std::size_t{EI_CLASS}, std::size_t{EI_DATA}, offsetof(Elf64_Ehdr, e_machine),
                                  offsetof(Elf64_Ehdr, e_machine) + 1}) {
    if (data[place] != static_cast<std::uint8_t>(ownHeader()[place])) return false;
  }
  return data[EI_CLASS] != ELFCLASS64 || hasSegments(data, size);
}

// Changes a field of the headers, often to a value near the size of the file.
class HeaderMutation {
 public:
  HeaderMutation(std::uint8_t* data, std::size_t size, unsigned seed) : data_(data), size_(size), random_(seed) {}

  // Returns false if there is no header to change.
  bool perform() {
    if (size_ < sizeof(Elf64_Ehdr)) return false;
    switch (random_() % 8) {
      case 0: set(offsetof(Elf64_Ehdr, e_phoff), number()); return true;
      case 1:
        set(offsetof(Elf64_Ehdr, e_phnum), static_cast<Elf64_Half>(random_() % 4 == 0 ? number() : random_() % 9));
        return true;
      case 2:
        set(offsetof(Elf64_Ehdr, e_phentsize), static_cast<Elf64_Half>(sizeof(Elf64_Phdr) + random_() % 8 / 7));
        return true;
      case 3: data_[EI_CLASS] = static_cast<std::uint8_t>(random_() % 3); return true;
      default: return changeSegment();
    }
  }

 private:
  bool changeSegment() {
    Elf64_Ehdr header;
    std::memcpy(&header, data_, sizeof header);
    const std::size_t segment = random_() % (header.e_phnum % 16 + 1U);
    if (header.e_phoff > size_ || size_ - header.e_phoff < (segment + 1) * sizeof(Elf64_Phdr)) return false;
    const std::size_t at = static_cast<std::size_t>(header.e_phoff) + segment * sizeof(Elf64_Phdr);
    switch (random_() % 3) {
      case 0: set(at + offsetof(Elf64_Phdr, p_type), static_cast<Elf64_Word>(random_() % 3)); break;
      case 1: set(at + offsetof(Elf64_Phdr, p_offset), number()); break;
      default: set(at + offsetof(Elf64_Phdr, p_filesz), number()); break;
    }
    return true;
  }
  std::uint64_t number() {
    const std::uint64_t bases[] = {
        0, size_, sizeof(Elf64_Ehdr), std::uint64_t{1} << 63U, ~std::uint64_t{0}, ~std::uint64_t{0} - size_};
    return bases[random_() % std::size(bases)] + random_() % 3 * (random_() % 2 == 0 ? 1 : 56) - 1;
  }
  template <class T>
  void set(std::size_t offset, T value) {
    std::memcpy(data_ + offset, &value, sizeof value);
  }

  std::uint8_t* data_;
  std::size_t size_;
  std::mt19937 random_;
};

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  static const MemoryFile file("plugin.so");
  file.write(data, size);
  const bool isAccepted = accepted([] { return validateSharedObject(file.path()), true; }).has_value();
  require(isAccepted == isSharedObject(data, size),
          "a file is accepted exactly if it is of this architecture and has all of its segments");
  if (isAccepted) accepted([] { return linkPropertiesOf(file.path()).runPath.size(); });
  return 0;
}

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size, std::size_t maxSize,
                                               unsigned seed) {
  if (seed % 4 != 0 && quazor::HeaderMutation(data, size, seed).perform()) return size;
  return LLVMFuzzerMutate(data, size, maxSize);
}
