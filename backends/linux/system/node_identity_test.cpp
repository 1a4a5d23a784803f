#include "backends/linux/system/node_identity.h"

#include "contract/diagnostic_error.h"

#include <filesystem>
#include <string>

#include <gtest/gtest.h>
#include <unistd.h>

namespace quazor {
namespace {

namespace fs = std::filesystem;

class NodeIdentityTest : public testing::Test {
 protected:
  NodeIdentityTest() { fs::create_directories(folder_ / "one"); }
  ~NodeIdentityTest() override { fs::remove_all(folder_); }

  const fs::path folder_ = fs::path(testing::TempDir()) / ("quazor-node-" + std::to_string(::getpid()));
};

TEST_F(NodeIdentityTest, AnEntryIsItselfAndNoOther) {
  const NodeIdentity identity = NodeIdentity::of(folder_ / "one");
  EXPECT_NE(identity.number, 0U);
  EXPECT_EQ(NodeIdentity::of(folder_ / "one"), identity);
  EXPECT_TRUE(isStillThere(identity, "it", nullptr));
  EXPECT_NE(NodeIdentity::of(folder_), identity);
  EXPECT_EQ(NodeIdentity::of(folder_ / "none").number, 0U);
}

TEST_F(NodeIdentityTest, AnotherEntryOfTheSameNameIsToldFromTheFirst) {
  const NodeIdentity identity = NodeIdentity::of(folder_ / "one");
  fs::create_directories(folder_ / "two");  // so that it has another number
  fs::rename(folder_ / "one", folder_ / "first");
  fs::rename(folder_ / "two", folder_ / "one");
  DiagnosticErrorPtr error;
  EXPECT_FALSE(isStillThere(identity, "/dev/video0 (driver fake)", &error));
  ASSERT_NE(error, nullptr);
  EXPECT_EQ(error->localizedDescription(),
            "/dev/video0 (driver fake) was replaced by another device before it was opened.");
  fs::remove(folder_ / "one");
  EXPECT_FALSE(isStillThere(identity, "it", nullptr));
}

}  // namespace
}  // namespace quazor
