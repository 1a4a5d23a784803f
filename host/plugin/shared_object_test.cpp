#include "host/plugin/shared_object.h"

#include "base/text/input_error.h"
#include "host/testing/test_directory.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

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

TEST(ValidateSharedObject, LeavesAnotherMachinesFileToTheLinker) {
  const TestDirectory directory;
  std::string content = ownProgram();
  content[4] = 1;  // ELFCLASS32
  EXPECT_EQ(problemOf(directory.write("small.so", content)), "");
}

}  // namespace
}  // namespace quazor
