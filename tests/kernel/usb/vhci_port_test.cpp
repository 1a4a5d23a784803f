#include "tests/kernel/usb/vhci_port.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

namespace quazor {
namespace {

namespace fs = std::filesystem;

constexpr const char* kHeading = "hub port sta spd dev      sockfd local_busid\n";

TEST(VhciPortTest, FindsTheFirstFreeHighSpeedPort) {
  const std::string used = "hs  0000 006 003 00010002 000003 1-1\n";
  EXPECT_EQ(freePort(kHeading + used + "hs  0001 004 000 00000000 000000 0-0\n"), 1);
  EXPECT_EQ(freePort(kHeading + used + "ss  0008 004 000 00000000 000000 0-0\n"), std::nullopt);
  EXPECT_EQ(freePort(""), std::nullopt);
}

class VhciFolderTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::string pattern = (fs::temp_directory_path() / "vhci.XXXXXX").string();
    ASSERT_NE(::mkdtemp(pattern.data()), nullptr);
    folder_ = pattern;
  }
  void TearDown() override { fs::remove_all(folder_); }

  fs::path folder_;
};

TEST_F(VhciFolderTest, HandsOneEndToTheKernel) {
  std::ofstream(folder_ / "status") << kHeading << "hs  0002 004 000 00000000 000000 0-0\n";
  std::ofstream(folder_ / "attach");
  const FileDescriptor device = attachToPort(folder_);
  ASSERT_TRUE(device);
  std::istringstream words((std::stringstream() << std::ifstream(folder_ / "attach").rdbuf()).str());
  int port = -1;
  int socket = -1;
  int identity = -1;
  int speed = -1;
  words >> port >> socket >> identity >> speed;
  EXPECT_EQ(port, 2);
  EXPECT_GE(socket, 0);
  EXPECT_EQ(identity, 3);
  EXPECT_EQ(speed, 3);
  char byte = 0;
  EXPECT_EQ(::read(device.get(), &byte, 1), 0) << "this end of the host is closed";
}

TEST_F(VhciFolderTest, TellsWhyThereIsNone) {
  EXPECT_FALSE(attachToPort(folder_));
  EXPECT_EQ(errno, ENOENT);
  std::ofstream(folder_ / "status") << kHeading;
  EXPECT_FALSE(attachToPort(folder_));
  EXPECT_EQ(errno, ENOSPC);
  std::ofstream(folder_ / "status") << "hs  0002 004 000 00000000 000000 0-0\n";
  EXPECT_FALSE(attachToPort(folder_)) << "nothing accepts it";
  EXPECT_EQ(errno, ENOENT);
}

}  // namespace
}  // namespace quazor
