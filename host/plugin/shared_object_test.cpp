#include "host/plugin/shared_object.h"

#include "base/text/input_error.h"
#include "host/testing/test_directory.h"
#include "tests/support/thrown_text.h"

#include <elf.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>

namespace quazor {
namespace {

// The test program itself is an ELF file that the dynamic linker has mapped.
std::string ownProgram() {
  std::ostringstream content;
  content << std::ifstream("/proc/self/exe", std::ios::binary).rdbuf();
  return content.str();
}

// Empty if the file is valid.
std::string problemOf(const std::filesystem::path& file) {
  return thrownText<InputError>([&] { validateSharedObject(file); }, "");
}

TEST(ValidateSharedObject, TakesAWholeFile) { EXPECT_EQ(problemOf("/proc/self/exe"), ""); }

TEST(ValidateSharedObject, TellsWhatAFileIsInstead) {
  const TestDirectory directory;
  EXPECT_EQ(problemOf(directory.path() / "nothing.so"), "does not exist");
  EXPECT_EQ(problemOf(directory.path()), "is a directory");
  EXPECT_EQ(problemOf("/dev/null"), "is not a file");
  EXPECT_EQ(problemOf(directory.write("empty.so", "")), "is not a shared object");
  EXPECT_EQ(problemOf(directory.write("short.so",
                                      "\x7F"
                                      "EL")),
            "is not a shared object");
  EXPECT_EQ(problemOf(directory.write("text.so", "hello, this is text")), "is not a shared object");
}

TEST(ValidateSharedObject, FindsEveryTruncation) {
  const TestDirectory directory;
  const std::string whole = ownProgram();
  ASSERT_GT(whole.size(), 65536U);
  for (const std::size_t size : {std::size_t{4}, std::size_t{16}, std::size_t{63}, std::size_t{64}, std::size_t{100},
                                 std::size_t{4096}, std::size_t{65536}}) {
    EXPECT_EQ(problemOf(directory.write("cut.so", whole.substr(0, size))), "is a truncated shared object") << size;
  }
}

TEST(ValidateSharedObject, DoesNotBelieveImpossibleOffsets) {
  const TestDirectory directory;
  std::string content = ownProgram();
  for (std::size_t i = 32; i < 40; ++i) content[i] = '\xFF';  // the offset of the program headers
  EXPECT_EQ(problemOf(directory.write("wild.so", content)), "is a truncated shared object");
}

TEST(ValidateSharedObject, NamesAnotherArchitecture) {
  const TestDirectory directory;
  struct Row {
    char size;
    char order;
    std::string machine;
    const char* name;
  };
  const Row rows[] = {
      {ELFCLASS64, ELFDATA2LSB, {'\x16', '\x00'}, "S/390"},
      {ELFCLASS64, ELFDATA2MSB, {'\x00', '\x16'}, "S/390, big-endian"},
      {ELFCLASS32, ELFDATA2LSB, {'\x28', '\x00'}, "ARM, 32 bits"},
      {ELFCLASS64, ELFDATA2LSB, {'\x34', '\x12'}, "machine 4660"},
#ifdef __x86_64__
      {ELFCLASS64, ELFDATA2LSB, {'\xB7', '\x00'}, "AArch64"},
      {ELFCLASS32, ELFDATA2LSB, {'\x3E', '\x00'}, "x86-64, 32 bits"},
#endif
  };
  for (const Row& row : rows) {
    std::string content = ownProgram();
    content[EI_CLASS] = row.size;
    content[EI_DATA] = row.order;
    content.replace(18, 2, row.machine);
    const std::string problem = problemOf(directory.write("foreign.so", content));
    EXPECT_TRUE(problem.starts_with("is built for another architecture (" + std::string(row.name) + ") than quazor ("))
        << problem;
  }
}

TEST(IsLoadedOnlyWhenNamed, IsTrueOfAFileWithTheNote) {
  const TestDirectory directory;
  Elf64_Ehdr header = {};
  std::memcpy(header.e_ident, ELFMAG, SELFMAG);
  const std::string own = ownProgram();
  std::memcpy(&header, own.data(), offsetof(Elf64_Ehdr, e_version));  // of this architecture
  header.e_phoff = sizeof header;
  header.e_phentsize = sizeof(Elf64_Phdr);
  header.e_phnum = 1;
  struct Note {
    std::uint32_t ownerSize;
    std::uint32_t contentSize;
    std::uint32_t type;
    char owner[8];
  };
  const auto isWith = [&](const Note& note, std::uint64_t size, std::uint32_t segmentType) {
    Elf64_Phdr segment = {};
    segment.p_type = segmentType;
    segment.p_offset = sizeof header + sizeof segment;
    segment.p_filesz = size;
    std::string content(reinterpret_cast<const char*>(&header), sizeof header);
    content.append(reinterpret_cast<const char*>(&segment), sizeof segment);
    content.append(reinterpret_cast<const char*>(&note), sizeof note);
    return isLoadedOnlyWhenNamed(directory.write("made.so", content));
  };
  const Note note = {7, 0, 1, "Quazor"};
  EXPECT_TRUE(isWith(note, sizeof note, PT_NOTE));
  EXPECT_FALSE(isWith({7, 0, 2, "Quazor"}, sizeof note, PT_NOTE)) << "another type";
  EXPECT_FALSE(isWith({7, 0, 1, "Others"}, sizeof note, PT_NOTE)) << "another owner";
  EXPECT_FALSE(isWith({8, 0, 1, "Quazor"}, sizeof note, PT_NOTE)) << "a longer name";
  EXPECT_FALSE(isWith({0xFFFFFFFF, 0, 1, "Quazor"}, sizeof note, PT_NOTE)) << "a name that is longer than the notes";
  EXPECT_FALSE(isWith({7, 0xFFFFFFFF, 1, "Quazor"}, sizeof note, PT_NOTE)) << "content that is longer than the notes";
  EXPECT_FALSE(isWith(note, sizeof note - 8, PT_NOTE)) << "a cut note";
  EXPECT_FALSE(isWith(note, sizeof note + 1, PT_NOTE)) << "notes beyond the end of the file";
  EXPECT_FALSE(isWith(note, std::uint64_t{1} << 40U, PT_NOTE)) << "notes that fit in no memory";
  EXPECT_FALSE(isWith(note, sizeof note, PT_NULL)) << "no segment of notes";
}

TEST(IsLoadedOnlyWhenNamed, IsFalseOfEveryOtherFile) {
  const TestDirectory directory;
  EXPECT_FALSE(isLoadedOnlyWhenNamed("/proc/self/exe"));
  EXPECT_FALSE(isLoadedOnlyWhenNamed(directory.path() / "nothing.so"));
  EXPECT_FALSE(isLoadedOnlyWhenNamed(directory.write("text.so", "hello, this is text")));
}

TEST(LinkPropertiesOf, TellsHowThisProgramWasLinked) {
  const LinkProperties linked = linkPropertiesOf("/proc/self/exe");
  EXPECT_TRUE(linked.bindsNow);
  EXPECT_TRUE(linked.protectsRelocations);
  EXPECT_TRUE(linked.hasStackProtector);
  EXPECT_FALSE(linked.hasExecutableStack);
  EXPECT_FALSE(linked.hasTextRelocations);
}

TEST(LinkPropertiesOf, TellsAnExecutableStack) {
  const TestDirectory directory;
  std::string content = ownProgram();
  Elf64_Ehdr header;
  std::memcpy(&header, content.data(), sizeof header);
  for (std::size_t i = 0; i < header.e_phnum; ++i) {
    char* const place = content.data() + header.e_phoff + i * sizeof(Elf64_Phdr);
    Elf64_Phdr segment;
    std::memcpy(&segment, place, sizeof segment);
    if (segment.p_type != PT_GNU_STACK) continue;
    segment.p_flags |= PF_X;
    std::memcpy(place, &segment, sizeof segment);
  }
  EXPECT_TRUE(linkPropertiesOf(directory.write("stack.so", content)).hasExecutableStack);
}

}  // namespace
}  // namespace quazor
