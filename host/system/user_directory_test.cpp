#include "host/system/user_directory.h"

#include "host/testing/test_environment.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::ElementsAre;

TEST(SharedDataDirectories, AreThoseOfTheEnvironment) {
  const EnvironmentVariable variable("XDG_DATA_DIRS", "/one:relative::/two");
  EXPECT_THAT(sharedDataDirectories(), ElementsAre("/one", "/two"));
}

TEST(SharedDataDirectories, AreTheUsualOnesWithoutAny) {
  for (const char* const none : {static_cast<const char*>(nullptr), ""}) {
    const EnvironmentVariable variable("XDG_DATA_DIRS", none);
    EXPECT_THAT(sharedDataDirectories(), ElementsAre("/usr/local/share", "/usr/share"));
  }
}

}  // namespace
}  // namespace quazor
